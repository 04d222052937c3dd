#include "util/LogChannel.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <new>
#include <string>
#include <type_traits>
#include <vector>

#include "support/InChild.h"
#include "support/RecordedWrites.h"
#include "util/LogAppender.h"
#include "util/Logger.h"
#include "util/internal/LogConfig.h"
#include "util/internal/LogGlobals.h"

namespace {

using Appenders = std::vector<LogAppender*>;

// The state of the root channel, restored at the end of a case.
class RootChannel {
public:
    RootChannel() : _saved(rootChannel()) {}
    ~RootChannel() { rootChannel() = _saved; }

private:
    const LogChannel _saved;
};

class LogChannelTest : public testing::Test {
protected:
    const RootChannel _root;
    LogAppender& _a1 = *LogAppender::find("A1", true);
    LogAppender& _a2 = *LogAppender::find("A2", true);
    LogAppender& _a3 = *LogAppender::find("A3", true);
    const Logger _logger{"Category"};
    const LogMsgMetadata _mdata{&_logger, WARN};
};

TEST_F(LogChannelTest, TheRootChannelStartsAtInfoWithoutAppenders) {
    EXPECT_EQ(INFO, rootChannel().minlevel);
    EXPECT_EQ(Appenders(), rootChannel()._appenders);
}

TEST_F(LogChannelTest, KeepsTheOrderOfItsFields) {
    static_assert(std::is_same_v<LogLevel, decltype(LogChannel::minlevel)>);
    const LogChannel channel;
    EXPECT_LT(static_cast<const void*>(&channel.minlevel),
              static_cast<const void*>(&channel._appenders));
}

TEST_F(LogChannelTest, AnUnknownNameIsTheRootChannelAndIsNotRecorded) {
    EXPECT_EQ(&rootChannel(), LogChannel::find("unknown", false));
    EXPECT_NE(&rootChannel(), LogChannel::find("unknown", true));
}

TEST_F(LogChannelTest, FindsAChannelByItsWholeName) {
    LogChannel* const channel = LogChannel::find("name", true);
    EXPECT_EQ(channel, LogChannel::find("name", true));
    EXPECT_EQ(channel, LogChannel::find("name", false));
    EXPECT_EQ(&rootChannel(), LogChannel::find("Name", false));
    EXPECT_EQ(&rootChannel(), LogChannel::find("name ", false));
    EXPECT_EQ(&rootChannel(), LogChannel::find("nam", false));
    EXPECT_NE(channel, LogChannel::find("", true));
}

TEST_F(LogChannelTest, ANewChannelCopiesTheRootChannelOfThatMoment) {
    rootChannel().minlevel = ERROR;
    rootChannel()._appenders = {&_a1};
    LogChannel* const channel = LogChannel::find("copy", true);
    EXPECT_EQ(ERROR, channel->minlevel);
    EXPECT_EQ(Appenders{&_a1}, channel->_appenders);

    rootChannel().minlevel = DEBUG;
    rootChannel()._appenders = {&_a2};
    EXPECT_EQ(channel, LogChannel::find("copy", true));
    EXPECT_EQ(ERROR, channel->minlevel);
    EXPECT_EQ(Appenders{&_a1}, channel->_appenders);
}

TEST_F(LogChannelTest, ChangesItsLevelByName) {
    const struct {
        const char* word;
        LogLevel level;
    } rows[] = {
        {"DEBUG", DEBUG}, {"INFO", INFO},   {"NOTICE", NOTICE}, {"WARN", WARN},   {"ERROR", ERROR},
        {"CRIT", CRIT},   {"ALERT", ALERT}, {"FATAL", FATAL},   {"EMERG", EMERG},
    };
    for (const auto& row : rows) {
        LogChannel channel;
        channel.minlevel = row.level == WARN ? INFO : WARN;
        EXPECT_TRUE(channel.changeLevel(row.word)) << row.word;
        EXPECT_EQ(row.level, channel.minlevel) << row.word;
    }
}

TEST_F(LogChannelTest, KeepsItsLevelForAWordThatIsNotALevel) {
    for (const char* const word :
         {"debug", "Debug", "", " DEBUG", "DEBUG ", "DEBU", "DEBUGS", "WARNING", "1", "???"}) {
        LogChannel channel;
        channel.minlevel = ALERT;
        EXPECT_FALSE(channel.changeLevel(word)) << word;
        EXPECT_EQ(ALERT, channel.minlevel) << word;
    }
}

TEST_F(LogChannelTest, AWordIsALevelOrAnExistingAppender) {
    LogChannel channel;
    channel._appenders = {&_a1};
    bool gotAppender = false;

    EXPECT_TRUE(channel.applyConfWord("CRIT", &gotAppender));
    EXPECT_EQ(CRIT, channel.minlevel);
    EXPECT_FALSE(gotAppender);
    EXPECT_FALSE(channel.applyConfWord("A9", &gotAppender));
    EXPECT_FALSE(gotAppender);
    EXPECT_EQ(Appenders{&_a1}, channel._appenders);
    EXPECT_EQ(nullptr, LogAppender::find("A9", false));

    EXPECT_TRUE(channel.applyConfWord("A2", &gotAppender));
    EXPECT_TRUE(gotAppender);
    EXPECT_EQ(Appenders{&_a2}, channel._appenders);
    EXPECT_TRUE(channel.applyConfWord("A3", &gotAppender));
    EXPECT_EQ((Appenders{&_a2, &_a3}), channel._appenders);
    EXPECT_TRUE(channel.applyConfWord("A2", &gotAppender));
    EXPECT_EQ((Appenders{&_a2, &_a3, &_a2}), channel._appenders);
    EXPECT_EQ(CRIT, channel.minlevel);
}

TEST_F(LogChannelTest, AnAppenderWordAddsToAListThatItDidNotBegin) {
    LogChannel channel;
    channel._appenders = {&_a1};
    bool gotAppender = true;
    EXPECT_TRUE(channel.applyConfWord("A2", &gotAppender));
    EXPECT_EQ((Appenders{&_a1, &_a2}), channel._appenders);
}

TEST_F(LogChannelTest, AppliesEveryWordOfAValue) {
    LogAppender* const root = &rootAppender();
    const struct {
        const char* value;
        bool accepted;
        LogLevel level;
        Appenders appenders;
    } rows[] = {
        {"", true, NOTICE, {&_a3}},
        {" ,\t, ", true, NOTICE, {&_a3}},
        {"WARN, A1, A2", true, WARN, {&_a1, &_a2}},
        {"WARN,A1,A2", true, WARN, {&_a1, &_a2}},
        {"\tWARN A1\t,,A2 , ", true, WARN, {&_a1, &_a2}},
        {"A1", true, NOTICE, {&_a1}},
        {"DEBUG", true, DEBUG, {&_a3}},
        {"A1 WARN A2 ERROR", true, ERROR, {&_a1, &_a2}},
        {"A1,A1", true, NOTICE, {&_a1, &_a1}},
        {"rootAppender", true, NOTICE, {root}},
        {"WARN, B, A1", false, WARN, {&_a1}},
        {"B", false, NOTICE, {&_a3}},
        {"A1, B", false, NOTICE, {&_a1}},
        {"debug", false, NOTICE, {&_a3}},
        {"WARN;A1", false, NOTICE, {&_a3}},
        {"WARN\n", false, NOTICE, {&_a3}},
        {"A1\r", false, NOTICE, {&_a3}},
    };
    for (const auto& row : rows) {
        LogChannel channel;
        channel.minlevel = NOTICE;
        channel._appenders = {&_a3};
        EXPECT_EQ(row.accepted, channel.setConfig(row.value)) << row.value;
        EXPECT_EQ(row.level, channel.minlevel) << row.value;
        EXPECT_EQ(row.appenders, channel._appenders) << row.value;
    }
}

TEST_F(LogChannelTest, ACategoryKeepsFromTheRootWhatItDoesNotName) {
    rootChannel().minlevel = ERROR;
    rootChannel()._appenders = {&_a2};
    EXPECT_TRUE(setup_log_channel("X=A1"));
    EXPECT_EQ(ERROR, LogChannel::find("X", false)->minlevel);
    EXPECT_EQ(Appenders{&_a1}, LogChannel::find("X", false)->_appenders);
    EXPECT_TRUE(setup_log_channel("Y=DEBUG"));
    EXPECT_EQ(DEBUG, LogChannel::find("Y", false)->minlevel);
    EXPECT_EQ(Appenders{&_a2}, LogChannel::find("Y", false)->_appenders);
}

TEST_F(LogChannelTest, ASettingHasAName) {
    const struct {
        const char *line, *name;
        bool accepted;
        LogLevel level;
    } rows[] = {
        {"s1=WARN", "s1", true, WARN},
        {"s2 \t = WARN", "s2", true, WARN},
        {" s3=WARN", " s3", true, WARN},
        {"s4.t u=WARN", "s4.t u", true, WARN},
        {"s5==WARN", "s5", false, INFO},
        {"s6=WARN=CRIT", "s6", false, INFO},
        {"s7=", "s7", true, INFO},
        {"s8=nothing", "s8", false, INFO},
        {"s9=nothing, CRIT", "s9", false, CRIT},
        {"=ALERT", "", true, ALERT},
        {" \t=FATAL", "", true, FATAL},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.accepted, setup_log_channel(row.line)) << row.line;
        const LogChannel* const channel = LogChannel::find(row.name, false);
        EXPECT_NE(&rootChannel(), channel) << row.line;
        EXPECT_EQ(row.level, channel->minlevel) << row.line;
    }
}

TEST_F(LogChannelTest, ALineWithoutAnEqualsSignIsNotASetting) {
    for (const char* const line : {"no equals", "no equals WARN"}) {
        EXPECT_FALSE(setup_log_channel(line)) << line;
        EXPECT_EQ(&rootChannel(), LogChannel::find(line, false)) << line;
    }
    EXPECT_FALSE(setup_log_channel(""));
}

TEST_F(LogChannelTest, WritesToEveryAppenderInTheOrderOfTheList) {
    LogChannel channel;
    channel._appenders = {&_a2, &_a1, &_a2};
    const RecordedWrites writes;
    channel.write(_mdata, "text");
    EXPECT_EQ((std::vector<const LogAppender*>{&_a2, &_a1, &_a2}), writes.appenders());
    EXPECT_EQ("WARN Category text\nWARN Category text\nWARN Category text\n", writes.text());
}

TEST_F(LogChannelTest, WritesToTheRootAppenderWhenItHasNone) {
    LogChannel channel;
    const RecordedWrites writes;
    channel.write(_mdata, "text");
    EXPECT_EQ(std::vector<const LogAppender*>{&rootAppender()}, writes.appenders());
}

TEST_F(LogChannelTest, WritesMessagesBelowItsLevelToo) {
    LogChannel channel;
    channel.minlevel = EMERG;
    const RecordedWrites writes;
    channel.write(_mdata, "text");
    EXPECT_TRUE(channel.write(_mdata, "more", nullptr));
    EXPECT_EQ("WARN Category text\nWARN Category more\n", writes.text());
}

TEST_F(LogChannelTest, LeavesOneAppenderAlone) {
    LogAppender* const root = &rootAppender();
    const struct {
        const char* name;
        Appenders appenders;
        const LogAppender* dontTouch;
        std::vector<const LogAppender*> expected;
    } rows[] = {
        {"none", {&_a1, &_a2}, nullptr, {&_a1, &_a2}},
        {"first", {&_a1, &_a2}, &_a1, {&_a2}},
        {"twice", {&_a1, &_a2, &_a1}, &_a1, {&_a2}},
        {"another", {&_a1, &_a2}, &_a3, {&_a1, &_a2}},
        {"only", {&_a1}, &_a1, {}},
        {"empty list", {}, nullptr, {root}},
        {"empty list and another", {}, &_a1, {root}},
        {"empty list and root", {}, root, {}},
        {"root in the list", {root, &_a1}, root, {&_a1}},
    };
    for (const auto& row : rows) {
        LogChannel channel;
        channel._appenders = row.appenders;
        const RecordedWrites writes;
        EXPECT_EQ(!row.expected.empty(), channel.write(_mdata, "text", row.dontTouch)) << row.name;
        EXPECT_EQ(row.expected, writes.appenders()) << row.name;
    }
}

// Made before any channel, and so destroyed after the map of channels has been emptied.
struct LateLookup {
    ~LateLookup() {
        if (channel == nullptr) {
            return;
        }
        const bool forgotten = LogChannel::find("late", false) == &rootChannel();
        LogChannel* const again = LogChannel::find("late", true);
        const bool made = again != channel && again == LogChannel::find("late", false);
        const bool usable = channel->minlevel == ALERT;  // still there for bound loggers
        const Logger logger("late");
        ::_exit(forgotten && made && usable && logger._channel == again ? 7 : 8);
    }
    LogChannel* channel = nullptr;
};
LateLookup lateLookup;

TEST_F(LogChannelTest, NamesAreForgottenAtExitAndChannelsAreNot) {
    const ChildRun run = inChild([] {
        lateLookup.channel = LogChannel::find("late", true);
        lateLookup.channel->minlevel = ALERT;
        Logger::initialize();
    });
    EXPECT_EQ(7, run.status);
}

TEST_F(LogChannelTest, ChannelsAreNotLeakedAtExit) {
    const ChildRun run = inChild([] {
        rootChannel()._appenders = {LogAppender::find("A1", true)};
        for (int i = 0; i < 100; ++i) {
            LogChannel::find("channel " + std::to_string(i), true);
        }
    });
    EXPECT_EQ(0, run.status);  // a leak checker ends the child with another status
}

}  // namespace
