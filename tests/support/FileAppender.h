#ifndef QUELTA_TESTS_SUPPORT_FILEAPPENDER_H_
#define QUELTA_TESTS_SUPPORT_FILEAPPENDER_H_

// An appender for one file, set up through the same calls as the configuration makes, with messages
// at chosen times.
//
//     FileAppender log(dir.file("app.log"), 100, 2);
//     log.line("text", 1000);
// Safe from any thread once constructed.

#include <gtest/gtest.h>

#include <string>

#include "util/LogAppender.h"
#include "util/LogMsgMetadata.h"
#include "util/Logger.h"
#include "util/Pathname.h"

// Metadata of a message of the logger "Test" at a time in seconds since the epoch.
inline LogMsgMetadata stampedAt(long long seconds, LogLevel level = INFO) {
    static Logger logger("Test");
    LogMsgMetadata mdata(&logger, level);
    mdata.stamp.set(seconds, 0);
    return mdata;
}

class FileAppender : public LogAppender {
public:
    // `maxSize` in bytes, 0: no limit. The layout is the message and a newline.
    explicit FileAppender(const std::string& file, long long maxSize = 0, unsigned backups = 0) {
        set("fileName", file);
        set("maxFileSize", std::to_string(maxSize));
        set("maxBackupIndex", std::to_string(backups));
        set("layout.ConversionPattern", "%m%n");
        finalSetup("Test");
    }
    ~FileAppender() noexcept { closeFd(); }
    FileAppender(const FileAppender&) = delete;
    FileAppender& operator=(const FileAppender&) = delete;

    // Writes `text` and a newline at a time in seconds since the epoch.
    void line(const std::string& text, long long seconds = 1000) {
        write(stampedAt(seconds), text);
    }

private:
    void set(const std::string& key, const std::string& value) {
        EXPECT_TRUE(setAttribute(key, value.c_str(), Pathname())) << key << '=' << value;
    }
};

#endif  // QUELTA_TESTS_SUPPORT_FILEAPPENDER_H_
