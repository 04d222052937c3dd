#ifndef QUELTA_FUZZ_FUZZTARGET_H_
#define QUELTA_FUZZ_FUZZTARGET_H_

// The entry point that each fuzz target defines, called by libFuzzer or by the replay program.

#include <cstddef>
#include <cstdint>

// Exercises the target with one input. Returns: 0 always.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

#endif  // QUELTA_FUZZ_FUZZTARGET_H_
