#ifndef QUELTA_UTIL_INTERNAL_LOGGLOBALS_H_
#define QUELTA_UTIL_INTERNAL_LOGGLOBALS_H_

// The state of the logging subsystem that belongs to no single class. The root appender and the map
// of appenders are declared in LogAppender.h.
// Configured before other threads start; safe from any thread afterwards.

class LogChannel;
class Logger;
class Timeval;

// False until Logger::initialize().
extern bool logger_initialized;

// The loggers that wait to be bound, newest first, linked through Logger::_next.
extern Logger* uninitialized_loggers;

// The channel of every logger that has none of its own: INFO and no appenders until configured.
// It can be used at any time, before main and after every destructor at exit.
LogChannel& rootChannel();

// The instant from which the layouts count: that of the first call, never changed afterwards.
Timeval& epoch_timeval();

#endif  // QUELTA_UTIL_INTERNAL_LOGGLOBALS_H_
