// Calls of the printf-like members, compiled but never run. The compiler must accept all, except
// with WRONG_ARGUMENTS, where the compiler must complain about each of them.

#include <string>

#include "util/LogFormat.h"
#include "util/Logger.h"

#ifdef WRONG_ARGUMENTS
#define TEXT 1
#else
#define TEXT "text"
#endif

void calls(Logger& logger, std::string& out);

void calls(Logger& logger, std::string& out) {
    logger.fatal("%s %m", TEXT);
    logger.crit("%s %m", TEXT);
    logger.error("%s %m", TEXT);
    logger.warn("%s %m", TEXT);
    logger.info("%s %m", TEXT);
    logger.debug("%s %m", TEXT);
    Logger::format(out, "%s %m", TEXT);
    Logger::format(out, 5, "%s %m", TEXT);
    LogFormat::internal(nullptr, INFO, "%s %m", TEXT);
}
