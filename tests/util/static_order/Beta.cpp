#include "util/static_order/Unit.h"

namespace {

Logger logger("Beta");
const TalkingObject object(logThroughBeta, logThroughAlpha);

}  // namespace

void logThroughBeta(const char* when) {
    logger.info("Beta %s", when);
    logger.debug("Beta %s", when);
}
