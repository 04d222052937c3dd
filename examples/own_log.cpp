// Usage: own_log CONFIG FOLDER
// Logs through a configuration file of its own. FOLDER is what "${QUELTA_HOME}" stands for in it.

#include <cstdio>
#include <exception>
#include <stdexcept>
#include <string>

#include "util/Logger.h"
#include "util/Pathname.h"

namespace {

// One logger for each part of a program, under the name that the configuration knows it by.
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
        std::fputs("Usage: own_log CONFIG FOLDER\n", stderr);
        return 2;
    }
    const bool complete = Logger::initialize(Pathname(argv[1]), Pathname(argv[2]));
    if (complete) {
        logger.info("logging is configured from %s", argv[1]);
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
    return complete ? 0 : 1;
}
