#include "util/LoaderInfo.h"

#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <iterator>

#include "util/Logger.h"

namespace {

// The results of validate(). Each check of directories has three: the value here for the
// installation, one less for the database, two less for the configuration.
enum Problem : int {
    EMPTY = -1,
    RELATIVE = -4,
    MISSING = -7,
    NO_DIRECTORY = -10,
    COMPONENT_EMPTY = -15,
    INSTALL_EMPTY = -16
};

// Indexed by the negated code.
const char* const messages[] = {
    "",
    "The environment variable QUELTA_HOME must not be empty.",
    "The environment variable QUELTA_DB must not be empty.",
    "The common config path must be defined in the config file.",
    "The environment variable QUELTA_HOME must not be a relative path.",
    "The environment variable QUELTA_DB must not be a relative path.",
    "The common config path must not be a relative path.",
    "The environment variable QUELTA_HOME must point to an existing path.",
    "The environment variable QUELTA_DB must point to an existing path.",
    "The common config path must point at an existing path.",
    "The environment variable QUELTA_HOME must point to a directory.",
    "The environment variable QUELTA_DB must point to a directory.",
    "The common config path must point to a directory.",
    "The environment variable QUELTA_HOME must point to a directory that's writable the process.",
    "The environment variable QUELTA_DB must point to a directory that's writable the process.",
    "The component name must not be empty.",
    "The install name must not be empty.",
    "The component name was too large for spread.",
};
constexpr int messageCount = static_cast<int>(std::size(messages));

void set_path_from_envvar(Pathname& path, const char* name) {
    // There is no other thread during start-up.
    const char* const value = std::getenv(name);  // NOLINT(concurrency-mt-unsafe)
    if (value == nullptr) {
        return;
    }
    path = Pathname(value);
    path.removeDoubleSeps();
    path.removeTrailingSeps();
    if (path != value) {
        ::setenv(name, path.c_str(), 1);  // NOLINT(concurrency-mt-unsafe)
    }
}

template <typename Field>
void replaceIfGiven(Field& field, const char* given) {
    if (given != nullptr) {
        field = given;
    }
}

constexpr struct poptOption option(const char* longName, char shortName, unsigned argument,
                                   const char* description) {
    return {longName, shortName, argument, nullptr, 0, description, nullptr};
}

}  // namespace

LoaderInfo* LoaderInfo::_instance = nullptr;

// Deliberate: entry 0, hidden from help, is what sets the debug flag.
const struct poptOption LoaderInfo::_poptOptionsMaster[_poptOptionsCount] = {
    option("noseg", '\0', POPT_ARG_NONE | POPT_ARGFLAG_DOC_HIDDEN,
           "causes the system not to dump core on failure"),
    option("nodaemon", '\0', POPT_ARG_NONE, "causes the system not to daemonize"),
    option(nullptr, 'c', POPT_ARG_STRING, "override the config path"),
    option(nullptr, 'h', POPT_ARG_STRING, "override the host name"),
    option(nullptr, 'i', POPT_ARG_STRING, "the name of the configuration subdir"),
    option(nullptr, 'n', POPT_ARG_STRING, "the component name to start with"),
    option(nullptr, 'p', POPT_ARG_INT, "the management port for soap calls"),
    option("debug", '\0', POPT_ARG_NONE, "start with debug log config"),
    option("mode", '\0', POPT_ARG_STRING, "the startup mode"),
    {nullptr, '\0', POPT_ARG_INCLUDE_TABLE, poptHelpOptions, 0, "Help options:", nullptr},
    POPT_TABLEEND};

LoaderInfo::LoaderInfo(const LoaderInfo& other) : LoaderInfo() {
    *this = other;
}

LoaderInfo& LoaderInfo::operator=(const LoaderInfo& other) {
    if (this == &other) {
        return *this;
    }
    _queltaHome = other._queltaHome;
    _componentName = other._componentName;
    _commonConfigPath = other._commonConfigPath;
    _installName = other._installName;
    _rpcPort = other._rpcPort;
    _pid = other._pid;
    _startupTime = other._startupTime;
    _host = other._host;
    _commonComponentNode = other._commonComponentNode;
    _isDebug = other._isDebug;
    _isDaemon = other._isDaemon;
    _useDebugLog = other._useDebugLog;
    return *this;
}

bool LoaderInfo::operator==(const LoaderInfo& other) const {
    return _queltaHome == other._queltaHome && _queltaDb == other._queltaDb &&
           _componentName == other._componentName && _commonConfigPath == other._commonConfigPath &&
           _installName == other._installName && _rpcPort == other._rpcPort && _pid == other._pid &&
           _startupTime == other._startupTime && _host == other._host &&
           _isDebug == other._isDebug && _isDaemon == other._isDaemon &&
           _startupMode == other._startupMode && _useDebugLog == other._useDebugLog;
}

LoaderInfo* LoaderInfo::getInstance() {
    if (_instance == nullptr) {
        _instance = new LoaderInfo();
    }
    return _instance;
}

void LoaderInfo::common_main_setup(int argc, const char* const* argv, const char* const* /*envp*/) {
    getInstance()->init(argc, argv);
    getInstance()->populateFromEnvironment();

    const Pathname home = getInstance()->getQueltaHome();
    if (home.empty()) {
        std::puts("QUELTA_HOME must be set.  Stopping.");
        std::exit(-1);  // NOLINT(concurrency-mt-unsafe): no other thread exists yet
    }

    // Deliberate: always in "etc", whatever configuration directory the record names.
    const Pathname config = home / "etc" / "log-cmdline.cfg";
    std::printf("Using logging configuration at %s.\n", config.c_str());
    Logger::initialize(config, home);
}

const char* LoaderInfo::getErrorMessage(int code) {
    return code > 0 || code <= -messageCount ? "" : messages[-code];
}

void LoaderInfo::init(int argc, const char* const* argv) {
    _optionsError = false;

    _componentName = "queltad";
    _commonConfigPath = "etc";
    _installName = "myinstall";
    _rpcPort = 8089;
    _pid = ::getpid();
    _startupTime = std::time(nullptr);

    _isDebug = true;
    _isDaemon = true;
    _useDebugLog = false;

    attachOptionValues();
    _poptContext =
        ::poptGetContext("queltad", argc, const_cast<const char**>(argv), _poptOptionsTable, 0);
}

void LoaderInfo::attachOptionValues() {
    _poptIsDebug = 0;
    _poptUseDebugLog = 0;
    _poptIsNodaemon = 0;
    _poptCommonConfigPath = nullptr;
    _poptHost = nullptr;
    _poptInstallName = nullptr;
    _poptComponentName = nullptr;
    _poptRpcPort = 0;
    _poptStartupMode = nullptr;

    void* const values[] = {&_poptIsDebug, &_poptIsNodaemon,  &_poptCommonConfigPath,
                            &_poptHost,    &_poptInstallName, &_poptComponentName,
                            &_poptRpcPort, &_poptUseDebugLog, &_poptStartupMode};
    std::copy(std::begin(_poptOptionsMaster), std::end(_poptOptionsMaster), _poptOptionsTable);
    for (std::size_t i = 0; i < std::size(values); ++i) {
        _poptOptionsTable[i].arg = values[i];
    }
}

void LoaderInfo::populateFromEnvironment() {
    set_path_from_envvar(_queltaHome, "QUELTA_HOME");
    set_path_from_envvar(_queltaDb, "QUELTA_DB");
}

void LoaderInfo::populateFromCommandLine() {
    int result = 0;
    while ((result = ::poptGetNextOpt(_poptContext)) != -1) {
        if (result == POPT_ERROR_BADOPT) {
            _optionsError = true;
            std::fprintf(stderr, "Bad Option %s\n",
                         ::poptBadOption(_poptContext, POPT_BADOPTION_NOALIAS));
        }
    }

    _isDebug = _poptIsDebug != 0;
    _isDaemon = _poptIsNodaemon == 0;
    _useDebugLog = _poptUseDebugLog != 0;

    replaceIfGiven(_commonConfigPath, _poptCommonConfigPath);
    replaceIfGiven(_host, _poptHost);
    replaceIfGiven(_installName, _poptInstallName);
    replaceIfGiven(_componentName, _poptComponentName);
    replaceIfGiven(_startupMode, _poptStartupMode);
    if (_poptRpcPort != 0) {
        _rpcPort = _poptRpcPort;
    }
}

void LoaderInfo::printHelp() {
    // popt's own help would read the null context.
    if (_poptContext != nullptr) {
        ::poptPrintHelp(_poptContext, stderr, 0);
    }
}

int LoaderInfo::validate() const {
    const Pathname common = getCommonConfigPath();
    const Pathname install = getInstallConfigPath();
    const auto firstFailing = [&](auto holds, int first) {
        if (!holds(_queltaHome)) {
            return first;
        }
        if (!holds(_queltaDb)) {
            return first - 1;
        }
        return holds(common) && holds(install) ? 0 : first - 2;
    };

    int code = firstFailing([](const Pathname& path) { return !path.empty(); }, EMPTY);
    if (code == 0) {
        code = firstFailing([](const Pathname& path) { return path.isAbsolute(); }, RELATIVE);
    }
    if (code == 0) {
        code = firstFailing([](const Pathname& path) { return path.exists(); }, MISSING);
    }
    if (code == 0) {
        code = firstFailing([](const Pathname& path) { return path.isDir(); }, NO_DIRECTORY);
    }
    if (code == 0 && _componentName.empty()) {
        code = COMPONENT_EMPTY;
    }
    if (code == 0 && _installName.empty()) {
        code = INSTALL_EMPTY;
    }
    return code;
}
