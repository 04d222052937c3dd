#ifndef QUELTA_UTIL_LOADERINFO_H_
#define QUELTA_UTIL_LOADERINFO_H_

#include <popt.h>
#include <sys/types.h>

#include <xmlwrapp/node.h>
#include <ctime>
#include <string>

#include "util/Pathname.h"

// How this process was started: the directories of the installation and the database, names, port,
// flags, and the values given on the command line. Every program begins with common_main_setup();
// one that takes options then calls, on getInstance(),
//     populateFromCommandLine()   once; isError() tells whether an option was unknown
//     validate()                  getErrorMessage() has the text of a negative result
// (init and populateFromEnvironment, which come before, are part of the common start-up.)
//
// Options are parsed by popt: init() copies the master table into the record and points each entry
// at the field that takes its value, so a record that was initialized must stay where it is until
// it has been parsed. popt's context and value strings are never freed. Options are not copied: a
// copy's context and value pointers are null.
//
// Configured before other threads start; safe to read from any thread afterwards.
class LoaderInfo {
public:
    // An empty record: every text empty, every number 0, every flag false, no options.
    LoaderInfo() = default;

    // An empty record that is then assigned to.
    // Deliberate: the copy of a record with a database directory compares unequal to it.
    LoaderInfo(const LoaderInfo& other);

    // Deliberate: the database directory, the start-up mode and everything about the options stay
    // as they were in the target.
    LoaderInfo& operator=(const LoaderInfo& other);

    // Compares all that tells how the process was started, the XML node and the options' own state
    // apart.
    bool operator==(const LoaderInfo& other) const;

    // The record of this process, made on the first call and never deleted.
    static LoaderInfo* getInstance();

    // What every program does first: fills the record from defaults and the environment, announces
    // the logging configuration and starts logging from it. Parses no options; `envp` is not used.
    // Errors: ends the process with exit(-1) and a line on standard output when no installation
    // directory is known.
    static void common_main_setup(int argc, const char* const* argv, const char* const* envp);

    // Returns: the text of a negative result of validate(), "" for any other number; never null.
    static const char* getErrorMessage(int code);

    // Sets the defaults and makes a popt context over the arguments, which are kept, not copied.
    // The directories, the host and the start-up mode stay as they are.
    // Requires: `argc` is at least 1; popt skips argv[0] without a check.
    void init(int argc, const char* const* argv);

    // Takes QUELTA_HOME and QUELTA_DB; a variable that is not set changes nothing. Values are
    // cleaned of doubled and trailing separators, and written back to the environment where that
    // made a difference, so that child processes see the cleaned form.
    void populateFromEnvironment();

    // Parses the command line. A bad option is named on standard error, and parsing goes on.
    // Deliberate: the flags are taken from the options alone; the debug flag, true after init(), is
    // false afterwards unless the hidden option "noseg" was given. "-p 0" keeps the port.
    // Before init() there is nothing to parse, and no option counts as given.
    void populateFromCommandLine();

    // Prints popt's help for the option table on standard error; nothing before init().
    void printHelp();

    // Returns: 0, or the code of the first check that failed (see getErrorMessage).
    // Deliberate: no check of writability (-13, -14) or of the length of a name (-17).
    int validate() const;

    // Whether an unknown option was met while parsing.
    bool isError() const { return _optionsError; }

    Pathname getQueltaHome() const { return _queltaHome; }
    Pathname getQueltaDb() const { return _queltaDb; }
    std::string getComponentName() const { return _componentName; }
    std::string getInstallName() const { return _installName; }
    std::string getHost() const { return _host; }
    std::string getStartupMode() const { return _startupMode; }

    // The configuration directory below the installation, and this install's directory in it.
    Pathname getCommonConfigPath() const { return _queltaHome / _commonConfigPath; }
    Pathname getInstallConfigPath() const { return getCommonConfigPath() / _installName; }

    int getPort() const { return _rpcPort; }
    pid_t getPid() const { return _pid; }
    time_t getStartupTime() const { return _startupTime; }

    bool getDebug() const { return _isDebug; }
    bool getUseDebugLog() const { return _useDebugLog; }
    bool getDaemon() const { return _isDaemon; }

    const xml::node& getCommonComponentNode() const { return _commonComponentNode; }
    // Keeps a deep copy of the node.
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
