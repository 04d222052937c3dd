// Usage: log_watch [OPTION...] -- [-w LINES] [-f FIELDS] [-s SECONDS] RULES [FILE...]
// Reads lines from standard input, or from files that it follows as they grow and are rotated.
// Each line is a term of a rule network. Prints and logs which rules fire and which stop firing.
// log_watch(1) describes it.

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <cstdio>
#include <ctime>
#include <deque>
#include <exception>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "Rules.h"
#include "Tail.h"
#include "services/pipeline/indexprocessor/Rete.h"
#include "util/DCUtils.h"
#include "util/LoaderInfo.h"
#include "util/Logger.h"
#include "util/Pathname.h"
#include "util/Thread.h"

namespace {

constexpr int POLL_MSEC = 100;  // how often files are examined

struct Options {
    unsigned window = 0;    // lines that stay set; 0: all
    unsigned fields = 0;    // at the start of a line, left out of its term
    unsigned seconds = 10;  // between two lines of figures
    Pathname rules;
    PathList files;  // an empty path: standard input
};

struct Figures {
    unsigned long long lines = 0;
    unsigned long long matches = 0;  // lines that match a condition
    std::clock_t ticks = 0;          // processor time of all lines
};

// The thread that logs the figures.
class Reporter : public Thread {
public:
    Reporter(Logger& logger, unsigned seconds)
        : Thread("Reporter"), _logger(logger), _seconds(seconds) {}

    // Ends and joins the thread.
    // Requires: go() was called.
    ~Reporter() override {
        {
            const std::lock_guard<Mutex> lock(_mutex);
            _ending = true;
            _ended.wake_all();
        }
        join();
    }

    void publish(const Figures& figures) {
        const std::lock_guard<Mutex> lock(_mutex);
        _figures = figures;
    }

private:
    void main() override {
        const std::lock_guard<Mutex> lock(_mutex);
        for (unsigned long long logged = 0; !_ending;) {
            if (!_ended.wait(_mutex, _seconds) && logged != _figures.lines) {
                log("");
                logged = _figures.lines;
            }
        }
        log("in total ");
    }

    void log(const char* prefix) {
        const double seconds = static_cast<double>(_figures.ticks) / CLOCKS_PER_SEC;
        const double lines = static_cast<double>(std::max(_figures.lines, 1ULL));
        _logger.info("%s%llu lines, %llu matches, %.0f ns a line", prefix, _figures.lines,
                     _figures.matches, seconds * 1e9 / lines);
    }

    Logger& _logger;
    const unsigned _seconds;
    Mutex _mutex;             // guards the fields below
    ConditionWakeAll _ended;  // wakes main() when _ending is set
    bool _ending = false;
    Figures _figures;
};

// A rule that adds itself to a list when it starts or stops firing.
class Alert : public AndOperator {
public:
    Alert(std::string& name, std::vector<Alert*>& changed)
        : AndOperator(nullptr, name), _changed(changed) {}

    const std::string& name() const { return *_implications.begin(); }

    // Returns: whether the rule has started or stopped firing since the last call.
    bool differs() { return std::exchange(_before, _fired) != _fired; }

    bool shouldFire() override {
        const bool fires = AndOperator::shouldFire();
        if (fires != _fired) {
            _changed.push_back(this);
        }
        return fires;
    }

private:
    std::vector<Alert*>& _changed;
    bool _before = false;
};

// The network, and the lines that are set.
class Watch {
public:
    Watch(const Options& options, Logger& logger) : _options(options), _logger(logger) {
        readRules(options.rules, [this](Rule& rule) {
            addRule(_rules, std::make_unique<Alert>(rule.implication, _changed), rule);
        });
        _rules.resetAll(_implications);
        show(META_ALL);
    }

    // Takes lines, each with its newline.
    void take(const std::string& lines) {
        const std::clock_t start = std::clock();
        std::size_t begin = 0;
        for (std::size_t end; (end = lines.find('\n', begin)) != std::string::npos;) {
            _line.assign(lines, begin, end - begin);
            takeLine();
            begin = end + 1;
        }
        _figures.ticks += std::clock() - start;
    }

    const Figures& figures() const { return _figures; }

private:
    struct Held {
        unsigned long long number;
        std::string term;
    };

    void takeLine() {
        const unsigned long long number = ++_figures.lines;
        if (!_held.empty() && _held.front().number + _options.window <= number) {
            takeBack();
        }
        std::size_t start = 0;
        for (unsigned field = 0; field < _options.fields; ++field) {
            start = _line.find_first_not_of(' ', _line.find(' ', start));
        }
        _term.assign(_line, std::min(start, _line.size()));
        if (!_rules.setCondition(_term, _candidates, _implications)) {
            return;
        }
        ++_figures.matches;
        if (_options.window != 0) {
            _held.push_back({number, _term});
        }
        show(_line);
    }

    // Takes back the line that leaves the window. That turns off each condition that it matches, so
    // the other lines are set again.
    void takeBack() {
        _rules.resetCondition(_held.front().term, _candidates, _implications);
        _held.pop_front();
        for (const Held& held : _held) {
            _rules.setCondition(held.term, _candidates, _implications);
        }
        show("");
    }

    // Prints and logs what has changed, in the order of the names.
    void show(const std::string& line) {
        std::sort(_changed.begin(), _changed.end(),
                  [](const Alert* a, const Alert* b) { return a->name() < b->name(); });
        for (Alert* const alert : _changed) {
            if (alert->differs()) {
                _text =
                    alert->hasFired() ? "+ " + alert->name() + ": " + line : "- " + alert->name();
                _logger.warn(_text);
                std::puts(_text.c_str());
            }
        }
        _changed.clear();
    }

    const Options& _options;
    Logger& _logger;
    Figures _figures;
    RuleSystem _rules;
    StringSet _implications;
    RuleSystem::Candidates _candidates;
    std::vector<Alert*> _changed;     // since the last show(); some twice
    std::deque<Held> _held;           // the lines of the window that match a condition
    std::string _line, _term, _text;  // kept for their memory
};

std::atomic<bool> stopping = false;

void stop(int) {
    stopping = true;
}

void flush() {
    if (std::fflush(stdout) != 0 || std::ferror(stdout) != 0) {
        throw std::runtime_error("cannot write standard output");
    }
}

// Takes lines until a signal, or the end of standard input.
void follow(const Options& options, Logger& logger, Watch& watch, Reporter& reporter) {
    std::deque<Tail> tails;
    for (const Pathname& file : options.files) {
        tails.emplace_back(file, logger);
    }
    // A negative descriptor is ignored.
    struct pollfd input = {options.files[0].empty() ? STDIN_FILENO : -1, POLLIN, 0};
    std::string lines;
    while (!stopping && !tails[0].ended()) {
        bool more = false;
        for (Tail& tail : tails) {
            more = tail.read(lines) || more;
            if (!lines.empty()) {
                watch.take(lines);
            }
        }
        reporter.publish(watch.figures());
        if (!more) {
            flush();
            ::poll(&input, 1, POLL_MSEC);
        }
    }
    flush();
}

// Sets up the channel LogWatch, unless the logging configuration has the appender log_watch.
void setUpLog(const Pathname& home) {
    if (LogAppender::find("log_watch", false) != nullptr) {
        return;
    }
    LogAppender* const file = LogAppender::find("log_watch", true);
    if (!file->setAttribute("fileName", "${QUELTA_HOME}/var/log/log_watch.log", home) ||
        !file->setAttribute("maxFileSize", "10000000", home) ||
        !file->setAttribute("maxBackupIndex", "5", home) ||
        !file->setAttribute("layout.ConversionPattern", "%d %-5p %m%n", home) ||
        !LogChannel::find("LogWatch", true)->setConfig("INFO, log_watch")) {
        throw std::logic_error("a logging attribute was not accepted");
    }
    file->finalSetup("log_watch");
}

void run(const Options& options) {
    Logger logger("LogWatch");
    Watch watch(options, logger);
    Thread mainThread;
    Reporter reporter(logger, options.seconds);
    reporter.go();
    std::signal(SIGTERM, stop);
    std::signal(SIGINT, stop);
    follow(options, logger, watch, reporter);
}

// Reads the arguments after "--"; LoaderInfo reads those before it.
bool parse(int argc, char** argv, Options& options) {
    char** const end = argv + argc;
    char** const own = std::find(argv, end, std::string_view("--"));
    const auto count = static_cast<int>(end - own);
    ::opterr = 0;
    for (int letter; (letter = ::getopt(count, own, "+w:f:s:")) != -1;) {
        bool isNumber = false;
        const long value = ::optarg == nullptr ? -1 : getLong(::optarg, isNumber);
        if (!isNumber || value < 0 || value > 1000000000) {
            return false;
        }
        (letter == 'w'   ? options.window
         : letter == 'f' ? options.fields
                         : options.seconds) = static_cast<unsigned>(value);
    }
    if (::optind >= count || options.seconds == 0) {
        return false;
    }
    options.rules = own[::optind];
    options.files.assign(own + ::optind + 1, end);
    if (options.files.empty()) {
        options.files.emplace_back();
    }
    return true;
}

}  // namespace

int main(int argc, char** argv, char** envp) {
    LoaderInfo::common_main_setup(argc, argv, envp);
    LoaderInfo& info = *LoaderInfo::getInstance();
    info.populateFromCommandLine();
    Options options;
    if (info.isError() || !parse(argc, argv, options)) {
        info.printHelp();
        std::fputs(
            "Usage: log_watch [OPTION...] -- [-w LINES] [-f FIELDS] [-s SECONDS] RULES "
            "[FILE...]\n",
            stderr);
        return 2;
    }
    const int problem = info.validate();
    if (problem != 0) {
        std::fprintf(stderr, "log_watch: %s\n", LoaderInfo::getErrorMessage(problem));
        return 2;
    }
    try {
        setUpLog(info.getQueltaHome());
        run(options);
    } catch (const std::exception& e) {
        std::fprintf(stderr, "log_watch: %s\n", e.what());
        return 1;
    }
    return 0;
}
