// Usage: program [CONFIGURATION HOME]: initializes logging without or with a configuration.

#include "util/LogChannel.h"
#include "util/Logger.h"
#include "util/Pathname.h"
#include "util/static_order/Unit.h"

int main(int argc, char* argv[]) {
    if (argc == 3) {
        if (!Logger::initialize(Pathname(argv[1]), Pathname(argv[2]))) {
            return 1;
        }
    } else {
        Logger::initialize();
    }
    logThroughAlpha("main");
    logThroughBeta("main");
    return 0;
}
