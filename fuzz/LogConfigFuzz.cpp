// Logging configurations against the slow reader: the input is the file.
//
// This process reads the lines and applies the values of channels to separate channels. The replay
// program also starts logging from the file. It does so in a child, because logging starts once per
// process and opens the files that the configuration names.

#include <cstdio>
#include <functional>
#include <list>
#include <memory>
#include <string>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "StartLogging.h"
#include "support/SlowConfig.h"
#include "util/LogAppender.h"
#include "util/LogChannel.h"
#include "util/LogFormat.h"
#include "util/Pathname.h"
#include "util/internal/LogConfig.h"

namespace {

using fuzz::checkEqual;

const char* const HOME = "/home/quelta";

// The layouts of one input. The library keeps every layout that it configures, which would be
// millions in a fuzzer; see the wrapped function below.
std::list<LogFormat>& layouts() {
    static std::list<LogFormat> list;
    return list;
}

void forgetAppenders() {
    for (const auto& [name, appender] : appenders()) {
        delete appender;
    }
    appenders().clear();
    LogAppender& root = rootAppender();
    root._filename.clear();
    root._maxSize = 0;
    root._maxBackupIndex = 0;
    root._fmt = &defaultFormat();
    layouts().clear();
}

template <typename Lines>
std::vector<std::string> numbered(const Lines& lines,
                                  const std::function<unsigned(std::size_t)>& number) {
    std::vector<std::string> result;
    for (std::size_t i = 0; i < lines.size(); ++i) {
        result.push_back(std::to_string(number(i)) + ": " + lines[i].text);
    }
    return result;
}

template <typename Slow, typename Real>
void checkLines(const char* what, const Slow& slow, const Real& real) {
    checkEqual(what, numbered(slow, [&](std::size_t i) { return slow[i].number; }),
               numbered(real, [&](std::size_t i) { return real[i].lineno; }));
}

void checkAppender(const SlowConfig::Appender& expected, const LogAppender& appender) {
    checkEqual("fileName", expected.fileName, appender._filename);
    checkEqual("maxFileSize", expected.maxSize, static_cast<long long>(appender._maxSize));
    checkEqual("maxBackupIndex", expected.maxBackups, appender._maxBackupIndex);
    std::string pattern;
    if (appender._fmt != nullptr && appender._fmt != &defaultFormat()) {
        pattern = appender._fmt->_fmt;
    }
    checkEqual("pattern", expected.pattern, pattern);
}

void checkAppenders(const SlowConfig& slow) {
    std::size_t named = 0;
    for (const auto& [name, expected] : slow.appenders) {
        LogAppender* const appender = LogAppender::find(name, false);
        fuzz::check("appender exists", appender != nullptr);
        checkAppender(expected, *appender);
        named += name == "rootAppender" ? 0U : 1U;
    }
    checkEqual("number of appenders", named, appenders().size());
}

void checkChannel(const SlowConfig& slow, const std::string& value) {
    LogChannel channel;
    channel.minlevel = NOTICE;
    channel._appenders = {nullptr};  // the previous list, which contains no named appender
    const SlowChannel expected = readChannelSlowly(slow, value, NOTICE);
    checkEqual("setConfig", expected.accepted, channel.setConfig(value.c_str()));
    checkEqual("level", expected.level, static_cast<int>(channel.minlevel));
    std::vector<const void*> pointers;
    for (const std::string& name : expected.appenders) {
        pointers.push_back(LogAppender::find(name, false));
    }
    if (pointers.empty()) {
        pointers.push_back(nullptr);
    }
    checkEqual("appenders", pointers,
               std::vector<const void*>(channel._appenders.begin(), channel._appenders.end()));
}

void checkReader(const SlowConfig& slow, const ConfigReader& reader) {
    checkEqual("open comment", slow.openComment, reader._openComment);
    checkEqual("complete", slow.openComment == 0, reader.complete());
    checkLines("errors", slow.errors, reader._errors);
    checkLines("categories", slow.categories, reader._categories);
    checkLines("root", std::vector{slow.root}, std::vector{reader._root});
}

}  // namespace

// LogAppender::setAttribute(const std::string&, const char*, const Pathname&) as the linker names
// it, after the prefix of the real or the wrapped function.
// clang-format off
#define QUELTA_SET_ATTRIBUTE(prefix) \
    prefix##__ZN11LogAppender12setAttributeERKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEEPKcRK8Pathname
// clang-format on

extern "C" {
bool QUELTA_SET_ATTRIBUTE(__real)(LogAppender* appender, const std::string& name, const char* value,
                                  const Pathname& home);
bool QUELTA_SET_ATTRIBUTE(__wrap)(LogAppender* appender, const std::string& name, const char* value,
                                  const Pathname& home);
bool QUELTA_SET_ATTRIBUTE(__wrap)(LogAppender* appender, const std::string& name, const char* value,
                                  const Pathname& home) {
    if (name != "layout.ConversionPattern") {
        return QUELTA_SET_ATTRIBUTE(__real)(appender, name, value, home);
    }
    appender->_fmt = &layouts().emplace_back(value);
    return true;
}
}

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::string contents = fuzz::FuzzInput(data, size).rest();
    if (contents.empty()) {
        return 0;
    }
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
        ::fmemopen(contents.data(), contents.size(), "r"), &std::fclose);
    const Pathname home(HOME);
    const SlowConfig slow = readConfigSlowly(contents, home);
    ConfigReader reader(file.get(), home);
    reader.readLines();
    checkReader(slow, reader);
    checkAppenders(slow);
    checkChannel(slow, slow.root.text);
    for (const SlowConfig::Line& category : slow.categories) {
        checkChannel(slow, category.text);
    }
    forgetAppenders();
#ifdef QUELTA_FUZZ_REPLAY
    fuzz::startLogging(contents);
#endif
    return 0;
}
