// Usage: own_log CONFIG DIRECTORY
// Logs through a configuration file of its own, in which "${QUELTA_HOME}" is replaced by DIRECTORY.

#include <cstdio>
#include <exception>
#include <stdexcept>
#include <string>

#include "util/Logger.h"
#include "util/Pathname.h"

namespace {

// One logger for each part of the program, with the name of its category in the configuration.
Logger logger("OwnLog");
Logger workLogger("OwnLog.Work");

void work(int item) {
    workLogger.debug("item %d", item);
    if (item % 10 == 0) {
        throw std::runtime_error("item " + std::to_string(item) + " is round");
    }
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fputs("Usage: own_log CONFIG DIRECTORY\n", stderr);
        return 2;
    }
    // True even if lines of the file are wrong: each of them is reported in the log.
    const bool read = Logger::initialize(Pathname(argv[1]), Pathname(argv[2]));
    if (read) {
        logger.info("the logging configuration is %s", argv[1]);
    }

    for (int item = 1; item <= 30; ++item) {
        try {
            work(item);
        } catch (const std::exception& e) {
            workLogger.warn(e);
        }
    }

    const Pathname missing = Pathname(argv[2]) / "missing";
    if (!missing.exists()) {
        logger.error("cannot find %s: %m", missing.c_str());
    }
    if (workLogger.isDebugEnabled()) {
        logger.info("items are logged");
    }
    return read ? 0 : 1;
}
