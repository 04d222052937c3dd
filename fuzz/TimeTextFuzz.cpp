// Times written as text against the slow version.

#include <string>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "support/SlowMilliseconds.h"
#include "util/Timeval.h"

namespace {

using fuzz::checkEqual;

// The result of a conversion in the form that convertSlowly returns.
std::string convert(const std::string& text) {
    unsigned long long msecs = 77;
    unsigned long charCount = 77;
    if (convert_string_to_milliseconds(text.c_str(), &msecs, &charCount)) {
        return std::to_string(msecs) + ' ' + std::to_string(charCount);
    }
    fuzz::check("nothing stored without a number", msecs == 0 && charCount == 0);
    return "none";
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = fuzz::FuzzInput(data, size).restOfText();
    const std::string converted = convert(text);
    checkEqual("conversion", convertSlowly(text), converted);

    unsigned long long msecs = 77;
    const bool found = convert_string_to_milliseconds(text.c_str(), &msecs, nullptr);
    checkEqual("found without a count", converted != "none", found);
    checkEqual("milliseconds without a count", converted.substr(0, converted.find(' ')),
               found ? std::to_string(msecs) : "none");
    return 0;
}
