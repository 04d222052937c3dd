#ifndef QUELTA_TESTS_SUPPORT_RECORDEDWRITES_H_
#define QUELTA_TESTS_SUPPORT_RECORDEDWRITES_H_

// Replaces LogAppender::write, so that a test can check which message reaches which appender and
// run an action for each. The test program wraps the function:
//     WRAP ${APPENDER_WRITE}       (in its quelta_test)
// While no object exists, appenders write as usual.
//
//     RecordedWrites writes;
//     logger.info("text");
//     EXPECT_EQ("INFO Name text\n", writes.text());
//
// Include it in one source of a program. Not thread-safe to construct and destroy; writes may come
// from any thread, serialised by `_mutex`.

#include <functional>
#include <mutex>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "util/LogAppender.h"
#include "util/LogMsgMetadata.h"
#include "util/Logger.h"

class RecordedWrites {
public:
    struct Message {
        const LogAppender* appender;
        const Logger* category;
        LogLevel level;
        std::string text;
    };
    using Action = std::function<void(const Message&)>;

    // Calls `action` for each message after it has been recorded, without holding the lock.
    explicit RecordedWrites(Action action = {}) : _action(std::move(action)) { s_current = this; }
    ~RecordedWrites() { s_current = nullptr; }
    RecordedWrites(const RecordedWrites&) = delete;
    RecordedWrites& operator=(const RecordedWrites&) = delete;

    std::vector<Message> messages() const {
        const std::lock_guard lock(_mutex);
        return _messages;
    }
    // "LEVEL category text" and a newline for each message.
    std::string text() const {
        std::string result;
        for (const Message& message : messages()) {
            std::size_t ignored = 0;
            result += loglevel2str(&ignored, message.level);
            result += std::string(" ") + message.category->_channel_name + ' ';
            result += message.text + '\n';
        }
        return result;
    }
    // The appenders of the messages, in order.
    std::vector<const LogAppender*> appenders() const {
        std::vector<const LogAppender*> result;
        for (const Message& message : messages()) {
            result.push_back(message.appender);
        }
        return result;
    }

    void record(const Message& message) {
        {
            const std::lock_guard lock(_mutex);
            _messages.push_back(message);
        }
        if (_action) {
            _action(message);
        }
    }

    static inline RecordedWrites* s_current = nullptr;  // the only existing object; null if none

private:
    const Action _action;
    mutable std::mutex _mutex;  // guards _messages
    std::vector<Message> _messages;
};

// LogAppender::write(const LogMsgMetadata&, std::string_view) as the linker names it, after the
// prefix of the real or the wrapped function. It depends on the C++ library.
// clang-format off
#ifdef _LIBCPP_VERSION
#define QUELTA_APPENDER_WRITE(prefix) \
    prefix##__ZN11LogAppender5writeERK14LogMsgMetadataNSt3__117basic_string_viewIcNS3_11char_traitsIcEEEE
#else
#define QUELTA_APPENDER_WRITE(prefix) \
    prefix##__ZN11LogAppender5writeERK14LogMsgMetadataSt17basic_string_viewIcSt11char_traitsIcEE
#endif
// clang-format on

extern "C" {
void QUELTA_APPENDER_WRITE(__real)(LogAppender* appender, const LogMsgMetadata& mdata,
                                   std::string_view msg);
void QUELTA_APPENDER_WRITE(__wrap)(LogAppender* appender, const LogMsgMetadata& mdata,
                                   std::string_view msg) {
    if (RecordedWrites::s_current != nullptr) {
        RecordedWrites::s_current->record(
            {appender, mdata.category, mdata.level, std::string(msg)});
    } else {
        QUELTA_APPENDER_WRITE(__real)(appender, mdata, msg);
    }
}
}

#endif  // QUELTA_TESTS_SUPPORT_RECORDEDWRITES_H_
