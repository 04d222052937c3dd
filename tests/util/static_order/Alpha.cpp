#include "util/static_order/Unit.h"

namespace {

Logger logger("Alpha");
const TalkingObject object(logThroughAlpha, logThroughBeta);

}  // namespace

void logThroughAlpha(const char* when) {
    logger.info("Alpha %s", when);
    logger.debug("Alpha %s", when);
}
