#include "util/internal/LogGlobals.h"

#include "util/LogChannel.h"
#include "util/Timeval.h"
#include "util/internal/NeverDestroyed.h"

constinit bool logger_initialized = false;
constinit Logger* uninitialized_loggers = nullptr;

LogChannel& rootChannel() {
    static constinit NeverDestroyed<LogChannel> channel;
    return channel.value;
}

Timeval& epoch_timeval() {
    static Timeval epoch = Timeval::now();
    return epoch;
}
