#ifndef QUELTA_UTIL_LOADERINFO_H_
#define QUELTA_UTIL_LOADERINFO_H_

// How this process was started: the installation and database directories, names, port, flags, and
// the values given on the command line. Every program begins with common_main_setup(), and a
// program that takes options goes on like this:
//
//     LoaderInfo::common_main_setup(argc, argv, envp);  // the arguments of main
//     LoaderInfo* const info = LoaderInfo::getInstance();
//     info->populateFromCommandLine();
//     const int code = info->validate();
//     if (info->isError() || code != 0) {
//         std::fprintf(stderr, "%s\n", LoaderInfo::getErrorMessage(code));
//         std::exit(1);
//     }
//
// Options are parsed by popt. init() copies the master table into the record and points each entry
// at the field that takes its value, so the record must keep its address between init() and
// populateFromCommandLine(). popt's context and value strings are never freed. Options are not
// copied: a copy's context and value pointers are null.
//
// Configured before other threads start; safe to read from any thread afterwards.

#include <popt.h>
#include <sys/types.h>

#include <xmlwrapp/node.h>
#include <ctime>
#include <string>

#include "util/Pathname.h"

// The record of how a process was started.
class LoaderInfo {
public:
    // An empty record: empty texts, numbers 0, flags false, no options.
    LoaderInfo() = default;

    // An empty record that is then assigned to.
    // Deliberate: the copy of a record with a database directory compares unequal to it.
    LoaderInfo(const LoaderInfo& other);

    // Copies the fields of another record.
    // Deliberate: the database directory, the start-up mode and the option-parsing state of the
    // target stay as they were.
    LoaderInfo& operator=(const LoaderInfo& other);

    // Compares everything except the XML node and the option-parsing state.
    bool operator==(const LoaderInfo& other) const;

    // The record of this process, constructed on the first call and never deleted.
    static LoaderInfo* getInstance();

    // Starts the program: init() and populateFromEnvironment() of the record of this process, then
    // prints the path of the logging configuration and initializes logging from it. Parses no
    // options; `envp` is not used.
    // Errors: prints a line on standard output and calls exit(-1) if there is no installation
    // directory.
    static void common_main_setup(int argc, const char* const* argv, const char* const* envp);

    // Returns: the text of a negative result of validate(), "" for any other number; never null.
    static const char* getErrorMessage(int code);

    // Sets the defaults and creates a popt context for the arguments, which must outlive it. The
    // directories, the host and the start-up mode stay as they are.
    // Requires: `argc` is at least 1; popt skips argv[0] without a check.
    void init(int argc, const char* const* argv);

    // Takes the directories from QUELTA_HOME and QUELTA_DB. A variable that is not set changes
    // nothing. Doubled and trailing separators are removed; if that changes the value, it is
    // written back to the environment, so that child processes see the cleaned form.
    void populateFromEnvironment();

    // Parses the command line. A bad option is reported on standard error and parsing continues.
    // Before init() there is nothing to parse, and no option counts as given.
    // Deliberate: the flags depend on the options alone. The debug flag is true after init(), and
    // false after parsing unless the hidden option "noseg" was given. "-p 0" keeps the port.
    void populateFromCommandLine();

    // Prints popt's help for the option table on standard error; nothing before init().
    void printHelp();

    // Returns: 0, or the code of the first check that failed (see getErrorMessage).
    // Deliberate: no check of writability (-13, -14) or of the length of a name (-17).
    int validate() const;

    // Returns: whether parsing met an unknown option.
    bool isError() const { return _optionsError; }

    // Returns: the installation directory, from QUELTA_HOME.
    Pathname getQueltaHome() const { return _queltaHome; }
    // Returns: the database directory, from QUELTA_DB.
    Pathname getQueltaDb() const { return _queltaDb; }
    // Returns: the name of the component; "queltad" unless option -n is given.
    std::string getComponentName() const { return _componentName; }
    // Returns: the name of the configuration subdirectory; "myinstall" unless -i is given.
    std::string getInstallName() const { return _installName; }
    // Returns: the host name of option -h; empty if it is not given.
    std::string getHost() const { return _host; }
    // Returns: the mode of option --mode; empty if it is not given.
    std::string getStartupMode() const { return _startupMode; }

    // Returns: the configuration directory of the installation.
    Pathname getCommonConfigPath() const { return _queltaHome / _commonConfigPath; }
    // Returns: the subdirectory of the configuration directory for this install name.
    Pathname getInstallConfigPath() const { return getCommonConfigPath() / _installName; }

    // Returns: the port of option -p; 8089 if it is not given.
    int getPort() const { return _rpcPort; }
    // Returns: the process number, as of init().
    pid_t getPid() const { return _pid; }
    // Returns: the time of init(), in seconds since the epoch.
    time_t getStartupTime() const { return _startupTime; }

    // Returns: the debug flag; see populateFromCommandLine.
    bool getDebug() const { return _isDebug; }
    // Returns: whether option --debug is given.
    bool getUseDebugLog() const { return _useDebugLog; }
    // Returns: true unless option --nodaemon is given.
    bool getDaemon() const { return _isDaemon; }

    // Returns: the XML element of the component, empty until it is set; valid as long as the
    // record.
    const xml::node& getCommonComponentNode() const { return _commonComponentNode; }
    // Stores a deep copy of the node.
    void setCommonComponentNode(xml::node& n) { _commonComponentNode = n; }

private:
    static constexpr int _poptOptionsCount = 11;
    static const struct poptOption _poptOptionsMaster[_poptOptionsCount];
    static LoaderInfo* _instance;

    void attachOptionValues();

    Pathname _queltaHome;
    Pathname _queltaDb;
    std::string _componentName;
    Pathname _commonConfigPath;  // relative to _queltaHome
    std::string _installName;
    int _rpcPort = 0;
    pid_t _pid = 0;
    time_t _startupTime = 0;  // seconds since the epoch
    std::string _host;
    xml::node _commonComponentNode;
    bool _isDebug = false;
    bool _useDebugLog = false;
    bool _isDaemon = false;
    std::string _startupMode;

    struct poptOption _poptOptionsTable[_poptOptionsCount] = {};  // points into this record
    poptContext _poptContext = nullptr;                           // null until init()
    // Written by popt while it parses; a null string was not given.
    int _poptIsDebug = 0;
    int _poptUseDebugLog = 0;
    int _poptIsNodaemon = 0;
    char* _poptCommonConfigPath = nullptr;
    char* _poptHost = nullptr;
    char* _poptInstallName = nullptr;
    char* _poptComponentName = nullptr;
    int _poptRpcPort = 0;
    bool _optionsError = false;
    char* _poptStartupMode = nullptr;
};

#endif  // QUELTA_UTIL_LOADERINFO_H_
