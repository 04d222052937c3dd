#include "services/pipeline/indexprocessor/Rete.h"

#include <cstdio>
#include <ctime>
#include <string>

#include "services/pipeline/indexprocessor/RandomPatterns.h"
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

// Prints the implications on one line, each followed by a comma and a space; "[]" for none.
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

// Replaces `text` by one to four random words, each followed by a space. A query may have an
// operator between two words; "AND NOT" only before the last one.
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

// Fills `rs` with up to `testcount` random patterns. Each feeds an operator of its own that implies
// the pattern and a newline. Then sets one term, and prints the counts and the seconds that
// resetting and matching took.
void testWildCards(RuleSystem* rs, int testcount) {
    StringSet implications;
    StringSet wildcards = randomPatterns(testcount);
    const std::size_t conditions = wildcards.size();
    // Patterns are removed from the set one by one, so that the network can reuse their memory.
    while (!wildcards.empty()) {
        const StringSet::node_type wild = wildcards.extract(wildcards.begin());
        std::string imp = wild.value() + '\n';
        rs->addCondition(wild.value(), *new AndOperator(nullptr, imp));
    }
    std::printf("%lu conditions\n", static_cast<unsigned long>(conditions));

    RuleSystem::Candidates candidates;
    const std::time_t start = std::time(nullptr);
    rs->resetAll(implications);
    printImplications(implications);
    // The alphabet with its n replaced: only patterns with a star over that position match.
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
