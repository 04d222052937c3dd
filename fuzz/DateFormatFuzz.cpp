// Date formats against the slow renderer. Lines: level, seconds and microseconds of the stamp; the
// rest is the format.

#include <algorithm>
#include <string>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "Stamped.h"
#include "util/LogFormat.h"

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    const fuzz::Stamped stamped(input);
    std::string format = fuzz::withSmallNumbers(input.restOfText()).substr(0, 256);
    // A brace would end the date format in the layout for the slow renderer.
    std::replace(format.begin(), format.end(), '}', ')');

    // An exact-size copy, so that reading past the end is detected.
    const std::vector<char> exact(format.begin(), format.end());
    const LogFormattedDate date(exact.empty() ? nullptr : exact.data(), exact.size());
    CachedTm tm;
    std::string text = "kept";
    date.fmt(text, tm, stamped.metadata());
    if (const auto expected = stamped.rendered("%d{" + format + "}", "")) {
        fuzz::checkEqual("date", "kept" + *expected, text);
    }
    return 0;
}
