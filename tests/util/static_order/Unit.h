#ifndef QUELTA_TESTS_UTIL_STATIC_ORDER_UNIT_H_
#define QUELTA_TESTS_UTIL_STATIC_ORDER_UNIT_H_

// The two units of a program whose static objects log while they are made and destroyed. Linked in
// either order, so that each runs while the other's logger is not constructed yet, or already
// destroyed.

#include <cstdlib>

#include "util/Logger.h"

// Each logs a message at INFO and one at DEBUG through the static logger of its unit.
void logThroughAlpha(const char* when);
void logThroughBeta(const char* when);

// Logs through the unit's own logger and, with QT_TALK_ACROSS in the environment, through the other
// unit's; with QT_TALK_LATE only when it is destroyed.
class TalkingObject {
public:
    TalkingObject(void (*own)(const char*), void (*other)(const char*)) : _own(own), _other(other) {
        if (std::getenv("QT_TALK_LATE") == nullptr) {
            talk("made");
        }
    }
    ~TalkingObject() { talk("destroyed"); }
    TalkingObject(const TalkingObject&) = delete;
    TalkingObject& operator=(const TalkingObject&) = delete;

private:
    void talk(const char* when) const {
        _own(when);
        if (std::getenv("QT_TALK_ACROSS") != nullptr) {
            _other(when);
        }
        Logger local("local");
        local.info("local %s", when);
    }

    void (*const _own)(const char*);
    void (*const _other)(const char*);
};

#endif  // QUELTA_TESTS_UTIL_STATIC_ORDER_UNIT_H_
