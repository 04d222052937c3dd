#ifndef QUELTA_TESTS_SUPPORT_ROOTLAYOUT_H_
#define QUELTA_TESTS_SUPPORT_ROOTLAYOUT_H_

// Gives the root appender another layout while the object exists, so that standard error shows more
// than the text of a message.
//
//     const RootLayout layout("%p %c %m%n");  // WARN Logger text
// Appenders that are set up in the meantime use the same layout and must not outlive it.
// Configured before other threads start; safe from any thread afterwards.

#include "util/LogAppender.h"
#include "util/LogFormat.h"

class RootLayout {
public:
    explicit RootLayout(const char* pattern) : _layout(pattern), _before(rootAppender()._fmt) {
        rootAppender()._fmt = &_layout;
    }
    ~RootLayout() { rootAppender()._fmt = _before; }
    RootLayout(const RootLayout&) = delete;
    RootLayout& operator=(const RootLayout&) = delete;

private:
    const LogFormat _layout;
    const LogFormat* const _before;  // not owned
};

#endif  // QUELTA_TESTS_SUPPORT_ROOTLAYOUT_H_
