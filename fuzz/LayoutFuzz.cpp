// Layouts against the slow renderer. Lines: the pattern, level, seconds and microseconds of the
// stamp; the rest is the message.

#include <string>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "Stamped.h"
#include "util/LogFormat.h"

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    const std::string pattern = fuzz::withSmallNumbers(input.lineOfText()).substr(0, 256);
    const fuzz::Stamped stamped(input);
    const std::string message = input.rest();

    const LogFormat layout(pattern.c_str());
    std::string line = "kept";
    layout.apply(line, stamped.metadata(), message);
    if (const auto expected = stamped.rendered(pattern, message)) {
        fuzz::checkEqual("line", "kept" + *expected, line);
    }
    return 0;
}
