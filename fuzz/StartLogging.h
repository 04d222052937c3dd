#ifndef QUELTA_FUZZ_STARTLOGGING_H_
#define QUELTA_FUZZ_STARTLOGGING_H_

#include <string>

namespace fuzz {

// Starts logging from a configuration, in a child whose installation is a temporary directory, and
// checks result, channels and reports against the slow reader. A configuration that names a file
// outside this directory is skipped.
void startLogging(const std::string& contents);

}  // namespace fuzz

#endif  // QUELTA_FUZZ_STARTLOGGING_H_
