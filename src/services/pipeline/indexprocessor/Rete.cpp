#include "services/pipeline/indexprocessor/Rete.h"

#include <algorithm>
#include <compare>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <functional>
#include <span>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "util/Assert.h"
#include "util/LoaderInfo.h"
#include "util/WildcardMatcher.h"

// The vocabulary of generateRandomText.
extern const char* const WORDS[183];
// clang-format off
const char* const WORDS[183] = {
    "100", "202", "206", "abstractconfi", "accessexecute", "accessnoremotescript", "accesssource",
    "accesssslnegotiatecert", "acl", "added", "admininitiali", "aggregatorminingprocessor",
    "algorithm", "allowpathinfoforscriptmappings", "answered", "appallowdebugging", "apppackageid",
    "appwamclsid", "aspcodepage", "aspenableparentpaths", "aspkeepsessionidsecure",
    "aspqueueconnectiontesttime", "aspscripterrormessage", "aspscripttimeout",
    "aspthreadgateloadhigh", "aspthreadgatetimeslice", "auth", "authenticated",
    "authorizationmanager", "authpersistence", "auto", "begin", "block", "buffer", "bytes",
    "cacheisapi", "cancel", "caused", "cgitimeout", "child", "client", "command",
    "commonprogramfiles", "componentid", "configuration", "connection", "contentindexed", "couldn",
    "cpuappenabled", "cpuenableallproclogging", "cpuenablekerneltime", "cpuenabletotalprocs",
    "cpulimitpriority", "cpulogginginterval", "create", "creating", "current", "db", "debug",
    "defaultdocfooter", "deferring", "denied", "deploying", "dhcpinform", "dial",
    "dirbrowseshowdate", "dirbrowseshowtime", "disablesocketpooling", "discovereventpoller",
    "discoverworker", "division", "dontlog", "enabled", "enablereversedns", "entry", "errors",
    "exceptions", "ext", "fail", "favicon", "file", "flushed", "getting", "halt", "head", "host",
    "httpexpires", "https", "iis", "informational", "inner", "inst", "internationalization",
    "issuer", "jdbc", "jni", "jvm", "keyusage", "least", "licensemanager", "loaded", "locknflags",
    "logextfileclientip", "logextfileflags", "logextfilereferer", "logextfiletime",
    "logextfileuseragent", "logfilelocaltimerollover", "logger", "logodbcdatasource", "logon",
    "logs", "mainmenu", "maxconnections", "mbrstatexchg", "metadata", "min", "module",
    "monitorenginestarter", "name", "non", "null", "observer", "operating", "oracle",
    "orderdetailma", "passwordcachettl", "peer", "pid", "pool", "ppid", "process", "processing",
    "pstn", "pwd", "queuelogresponse", "reads", "recoverydirec", "register", "removing", "reply",
    "results", "roleviewleade", "schedulerserv", "securitydm", "sendmail", "serverbindings",
    "servername", "services", "setting", "sighup", "sip", "soap", "sourceid", "sql", "ssl", "stage",
    "starting", "stock", "storing", "suexec", "syslogd", "systemout", "tcp", "text", "threadname",
    "timedservletpoolelement", "top", "total", "trackingadapt", "trying", "unitofwork", "uri",
    "userexception", "validity", "verbose", "virtual", "vsync", "warning", "webgroup",
    "windowsservices", "write", "wsserverimpl"};
// clang-format on

// Draws once from the system's generator, which nobody seeds: every run draws the same numbers.
// Requires: min <= max; an empty range, max = min - 1, is asserted.
// Returns: a number from min to max, both included.
int randint(int min, int max) {
    const long range = static_cast<long>(max) - min + 1;
    QUELTA_ASSERT(range != 0);
    return static_cast<int>(min + random() % range);
}

// Prints the implications on one line, each followed by a comma and a blank; "[]" for none.
void printImplications(StringSet& implications) {
    if (implications.empty()) {
        std::puts("[]");
        return;
    }
    std::printf("Implications: ");
    for (const std::string& implication : implications) {
        std::printf("%s, ", implication.c_str());
    }
    std::putchar('\n');
}

// Replaces `text` by one to four random words, a blank behind each; a query has operators in some
// of the gaps, "AND NOT" only in the last.
void generateRandomText(std::string& text, bool isQuery) {
    text.clear();
    const int kLen = randint(1, 4);
    for (int i = 0; i < kLen; ++i) {
        text += WORDS[randint(0, 182)];
        text += ' ';
        if (!isQuery || i >= kLen - 1) {
            continue;
        }
        const int op = randint(1, 20);
        if (op < 5) {
            text += "AND ";
        } else if (op < 9) {
            text += "OR ";
        } else if (op < 12 && i == kLen - 2) {
            text += "AND NOT ";
        }
    }
}

namespace {

const char* const ALPHABET = "abcdefghijklmnopqrstuvwxyz";
constexpr std::size_t ALPHABET_LENGTH = 26;
constexpr int MOST_STARS = 20;

// A drawn pattern, zero behind its last character: each star adds at most one to the alphabet.
struct Pattern {
    static constexpr std::size_t SIZE = 48;
    static constexpr std::size_t WORD_COUNT = SIZE / sizeof(std::uint64_t);

    bool operator==(const Pattern& other) const {
        return std::memcmp(characters, other.characters, SIZE) == 0;
    }

    // The same order as that of the strings.
    std::strong_ordering operator<=>(const Pattern& other) const {
        return std::memcmp(characters, other.characters, SIZE) <=> 0;
    }

    // Eight characters as a number that is ordered like them.
    std::uint64_t ordered(std::size_t from) const {
        std::uint64_t number = 0;
        for (std::size_t i = from; i < from + sizeof(number); ++i) {
            number = number << 8 | static_cast<unsigned char>(characters[i]);
        }
        return number;
    }

    std::uint64_t hash() const {
        std::uint64_t words[WORD_COUNT];
        std::memcpy(words, characters, SIZE);
        std::uint64_t mixed = 0;
        for (const std::uint64_t word : words) {
            mixed = (mixed ^ word) * 0xff51afd7ed558ccdU;
            mixed ^= mixed >> 32;
        }
        return mixed;
    }

    char characters[SIZE];
};
static_assert(ALPHABET_LENGTH + MOST_STARS < Pattern::SIZE);
static_assert(Pattern::WORD_COUNT * sizeof(std::uint64_t) == Pattern::SIZE);

// A pattern in the making, and behind it the zeros that move up when it shrinks.
struct Draft {
    char characters[2 * Pattern::SIZE];

    Pattern pattern() const {
        Pattern finished;
        std::memcpy(finished.characters, characters, sizeof(finished.characters));
        return finished;
    }
};

// Draws a pattern: the alphabet, in which one to twenty times a run of characters, possibly none
// and never the last, becomes a `*`. What stands behind the run moves as a piece of fixed size.
void drawPattern(Draft& draft) {
    draft = Draft();
    char* const wild = draft.characters;
    std::memcpy(wild, ALPHABET, ALPHABET_LENGTH);
    int last = static_cast<int>(ALPHABET_LENGTH) - 1;
    for (int stars = randint(1, MOST_STARS); stars > 0; --stars) {
        const int start = randint(0, last);
        const int end = randint(start, last);
        char behind[Pattern::SIZE];
        std::memcpy(behind, wild + end, sizeof(behind));
        wild[start] = '*';
        std::memcpy(wild + start + 1, behind, sizeof(behind));
        last -= end - start - 1;
    }
}

// The distinct ones among millions of patterns: an open-addressing table of hashes and places in a
// list. Patterns are drawn in batches, because the table is far larger than the nearer caches: the
// slots that a batch needs are all on their way before the first is read.
class PatternSet {
public:
    PatternSet() : _table(1024) {}

    // Adds `count` drawn patterns.
    void draw(int count) {
        Draft batch[BATCH_SIZE];
        while (count > 0) {
            const int size = std::min(count, BATCH_SIZE);
            for (int i = 0; i < size; ++i) {
                drawPattern(batch[i]);
            }
            add({batch, static_cast<std::size_t>(size)});
            count -= size;
        }
    }

    // Returns: the patterns in ascending order.
    StringSet sorted() const {
        const std::vector<Key> order = sortedKeys();
        StringSet strings;
        for (std::size_t i = 0; i < order.size(); ++i) {
            const std::size_t ahead = std::min(i + 16, order.size() - 1);
            __builtin_prefetch(&_patterns[order[ahead].place]);
            strings.emplace_hint(strings.end(), _patterns[order[i].place].characters);
        }
        return strings;
    }

private:
    static constexpr int BATCH_SIZE = 64;

    struct Slot {
        std::uint32_t tag = 0;    // the upper half of the hash
        std::uint32_t place = 0;  // in _patterns, counted from 1; 0: the slot is free
    };

    // The first characters, which mostly decide the order, and the place in _patterns.
    struct Key {
        std::uint64_t first;
        std::uint64_t second;
        std::uint32_t place;
    };

    std::vector<Key> sortedKeys() const {
        std::vector<Key> order;
        order.reserve(_patterns.size());
        for (const Pattern& pattern : _patterns) {
            order.push_back({pattern.ordered(0), pattern.ordered(sizeof(Key::first)),
                             static_cast<std::uint32_t>(order.size())});
        }
        std::ranges::sort(order, std::less<>(), [this](const Key& key) {
            return std::tie(key.first, key.second, _patterns[key.place]);
        });
        return order;
    }

    void add(std::span<const Draft> batch) {
        std::uint64_t hashes[BATCH_SIZE];
        std::ranges::transform(batch, hashes, [this](const Draft& draft) {
            const std::uint64_t hash = draft.pattern().hash();
            __builtin_prefetch(&_table[hash & (_table.size() - 1)]);
            return hash;
        });
        for (std::size_t i = 0; i < batch.size(); ++i) {
            addOne(hashes[i], batch[i].pattern());
        }
    }

    void addOne(std::uint64_t hash, const Pattern& pattern) {
        Slot& slot = find(hash, pattern);
        if (slot.place != 0) {
            return;
        }
        _patterns.push_back(pattern);
        slot = {static_cast<std::uint32_t>(hash >> 32),
                static_cast<std::uint32_t>(_patterns.size())};
        if (_patterns.size() > _table.size() / 2) {
            grow();
        }
    }

    // Returns: the slot of the pattern, or the free one where it belongs.
    Slot& find(std::uint64_t hash, const Pattern& pattern) {
        const std::uint32_t tag = static_cast<std::uint32_t>(hash >> 32);
        for (std::size_t i = hash;; ++i) {
            Slot& slot = _table[i & (_table.size() - 1)];
            if (slot.place == 0 || (slot.tag == tag && _patterns[slot.place - 1] == pattern)) {
                return slot;
            }
        }
    }

    void grow() {
        std::vector<Slot> old(4 * _table.size());
        old.swap(_table);
        for (const Slot& slot : old) {
            if (slot.place != 0) {
                const Pattern& pattern = _patterns[slot.place - 1];
                find(pattern.hash(), pattern) = slot;
            }
        }
    }

    std::vector<Pattern> _patterns;  // distinct, in the order of drawing
    std::vector<Slot> _table;        // a power of two, at most half full
};

// Returns: the distinct ones among `count` patterns drawn.
StringSet generatePatterns(int count) {
    PatternSet patterns;
    patterns.draw(count);
    return patterns.sorted();
}

// Gives each pattern an operator of its own that implies the pattern as a line. The patterns leave
// the set one by one, so that the network grows into the memory that they give back.
void addPatterns(RuleSystem& rs, StringSet& wildcards) {
    std::string imp;
    while (!wildcards.empty()) {
        const StringSet::node_type wild = wildcards.extract(wildcards.begin());
        imp.assign(wild.value()).push_back('\n');
        rs.addCondition(wild.value(), *new AndOperator(nullptr, imp));
    }
}

}  // namespace

// Fills `rs` with up to `testcount` random patterns, each behind an operator of its own that
// implies the pattern, sets one term, and prints the counts and the seconds that resetting and
// matching took.
void testWildCards(RuleSystem* rs, int testcount) {
    StringSet implications;
    StringSet wildcards = generatePatterns(testcount);
    const std::size_t conditions = wildcards.size();
    addPatterns(*rs, wildcards);
    std::printf("%lu conditions\n", static_cast<unsigned long>(conditions));

    RuleSystem::Candidates candidates;
    const std::time_t start = std::time(nullptr);
    rs->resetAll(implications);
    printImplications(implications);
    // The letter n is gone: only patterns whose star covers its place match.
    const std::string text = "abcdefghijklmxopqrstuvwxyz";
    rs->setCondition(text, candidates, implications);
    std::printf("%lu implications\n", static_cast<unsigned long>(implications.size()));
    const std::time_t end = std::time(nullptr);
    std::printf("TIME = %ld\n", static_cast<long>(end - start));
    rs->resetAll(implications);
}

// Checks the matcher on one known case, then runs the stress test.
int main(int argc, char** argv, char** envp) {
    LoaderInfo::common_main_setup(argc, argv, envp);

    const WildcardMatcher matcher("*ar");
    if (matcher.isMatch("fark")) {
        std::puts("BUG IN WILDCARDMATCHER");
    }
    RuleSystem rs;
    testWildCards(&rs, 5000000);
    return 0;
}
