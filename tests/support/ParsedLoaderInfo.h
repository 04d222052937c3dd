#ifndef QUELTA_TESTS_SUPPORT_PARSEDLOADERINFO_H_
#define QUELTA_TESTS_SUPPORT_PARSEDLOADERINFO_H_

#include <gtest/gtest.h>

#include <initializer_list>
#include <string>

#include "support/Arguments.h"
#include "util/LoaderInfo.h"

// A record that was started with these arguments and has parsed them; what went to standard error.
struct Parsed {
    explicit Parsed(std::initializer_list<std::string> words) : arguments(words) {
        info.init(arguments.argc(), arguments.argv());
        testing::internal::CaptureStderr();
        info.populateFromCommandLine();
        err = testing::internal::GetCapturedStderr();
    }
    Arguments arguments;
    LoaderInfo info;
    std::string err;
};

#endif  // QUELTA_TESTS_SUPPORT_PARSEDLOADERINFO_H_
