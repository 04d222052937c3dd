#ifndef QUELTA_UTIL_LOGFORMAT_H_
#define QUELTA_UTIL_LOGFORMAT_H_

// Layouts: a conversion pattern such as "%d %-5p %c - %m%n" turns one message into one line.
//
//     #include "util/Logger.h"
//     const LogFormat layout("%-8p: %m%n");  // once
//     static const Logger logger("Queue");
//     std::string line;
//     layout.apply(line, LogMsgMetadata(&logger, WARN), "full");  // for each message
//     std::fputs(line.c_str(), stdout);                           // "WARN    : full"
//
// A pattern is parsed once, into an array of atoms; formatting a line walks the atoms and parses
// nothing. A conversion is "%", an optional flag ("-" pads on the right, "0" pads with zeros), an
// optional minimum width, an optional "." and maximum width, the conversion character and an
// optional "{argument}", which only "d" uses. Malformed input is not an error: an unknown
// conversion is dropped, an incomplete one ends the pattern.
//
// LogFormattedDate splits a date argument once more, into strftime pieces and milliseconds. The
// pieces of one line share their local time, which a CachedTm holds. Both are defined in
// LogFormattedDate.cpp.
//
// LogFormat and LogFormattedDate: immutable after construction; safe to share.
// CachedTm: not thread-safe; one thread at a time per object.

#include <cstdarg>
#include <cstddef>
#include <cstdint>
#include <ctime>
#include <string>
#include <string_view>

#include "util/LogLevel.h"
#include "util/LogMsgMetadata.h"

class LogAppender;
class LogFormattedDate;
class Logger;

// The local time of one message, converted when the first date of the line asks for it.
class CachedTm {
public:
    // Formats the message's stamp by strftime.
    // Requires: the same stamp in every call on one object; `buf` has room for `size` bytes.
    // Returns: the length of the text; 0 if it does not fit or is empty.
    std::size_t ftime(char* buf, std::size_t size, const char* fmt, const LogMsgMetadata& mdata);

private:
    struct tm _stamp = {};   // valid once _stampSet
    bool _stampSet = false;  // whether _stamp is filled
};

// A compiled conversion pattern. The class also has the routing functions that every entry point of
// Logger calls; they are defined in internal/LogRouting.cpp. They are members because, like a
// layout, they need the private fields of loggers.
class LogFormat {
public:
    // One conversion of a pattern, or the literal text between two.
    struct Atom {
        // What an atom prints. The letter is that of the conversion.
        enum Kind : std::uint32_t {
            MSG,         // m  the message
            STR,         // n  a newline; also literal text
            CATEGORY,    // c  the logger's channel name
            LEVEL,       // p  the name of the level
            THREADNAME,  // t  the name of the current thread
            EPOCH_MSEC,  // r  milliseconds since logging was initialized
            EPOCH_SEC,   // R  the same in whole seconds
            TIME_PROC,   // u  processor time of the process, in ticks of clock()
            TIME_FMT     // d  the local time of the message
        };

        Kind what = MSG;  // selects the member of `arg`
        // The text or the date format of the atom.
        union {
            const char* str = nullptr;  // STR: into LogFormat::_fmt, or a constant
            LogFormattedDate* fdate;    // TIME_FMT: owned by the LogFormat
        } arg;
        std::size_t slen = 0;             // length of arg.str
        std::uint32_t minw = 0;           // shorter texts are padded to this width
        std::uint32_t maxw = UINT32_MAX;  // longer texts lose their end; UINT32_MAX: no limit
        char justify = ' ';  // ' ' or '0': padding put before the text; 0: spaces put after it
    };

    // Compiles a pattern.
    // Requires: `pattern` is not null.
    // Errors: std::bad_alloc; a malformed pattern is not an error.
    explicit LogFormat(const char* pattern);
    // Frees the atoms and their date formats.
    ~LogFormat();
    LogFormat(const LogFormat&) = delete;
    LogFormat& operator=(const LogFormat&) = delete;

    // Appends the line for one message to `out`; a final newline comes only from "%n".
    // Requires: `msg` does not point into `out`; only "%c" needs `mdata.category`.
    // Errors: std::bad_alloc.
    // Threads: safe from any thread.
    // Cost: at most one conversion to local time, none without a date.
    void apply(std::string& out, const LogMsgMetadata& mdata, std::string_view msg) const;

    // Tests the level, formats and writes to the channel: the common path of Logger's entry points.
    // Never throws; errno is kept.
    static void do_log(Logger* logger, LogLevel level, std::string_view msg);
    static void do_log(Logger* logger, LogLevel level, const char* fmt, va_list ap)
        __attribute__((format(printf, 3, 0)));

    // Returns: true for a logger that cannot reach a channel yet, so that its messages go straight
    // to standard error.
    static bool check_for_unitialized_logger(const Logger* logger);

    // Reports a failure of the logging subsystem itself, to every appender of the channel "Logger"
    // except `failing` (null allowed), and to standard error if none takes it. "%m" prints errno,
    // which is preserved.
    static void internal(const LogAppender* failing, LogLevel level, const char* fmt, ...)
        __attribute__((format(printf, 3, 4)));

private:
    void compile();
    const char* compileConversion(const char* p, const char* end);
    static bool setKind(Atom& atom, char conversion, const char* arg, std::size_t arglen);
    void addLiteral(const char* begin, const char* end);
    Atom* new_atom();

    std::string _fmt;              // the pattern; literal atoms point into it
    Atom* _atoms = nullptr;        // array of _max_atoms, owned
    Atom* _atom_end = nullptr;     // one past the last used atom
    std::uint32_t _max_atoms = 0;  // capacity of the array
};

// A compiled date format: strftime syntax, in which "%l" is replaced by three digits of
// milliseconds.
class LogFormattedDate {
public:
    // A piece of a date format.
    struct Atom {
        // What an atom prints.
        enum Kind : std::uint32_t {
            STRFTIME,  // a piece for strftime
            MSEC       // the milliseconds of the stamp
        };

        Kind what = STRFTIME;       // selects what is printed
        const char* str = nullptr;  // STRFTIME: the NUL-terminated piece, in _sstor
    };

    // Compiles a date format of `fmtlen` characters. Null or empty selects ISO8601; the names
    // "DATE", "ISO8601" and "ABSOLUTE" select their patterns.
    // Errors: std::bad_alloc.
    LogFormattedDate(const char* fmtstr, std::size_t fmtlen);
    // Frees the atoms and the copies of their texts.
    ~LogFormattedDate();
    LogFormattedDate(const LogFormattedDate&) = delete;
    LogFormattedDate& operator=(const LogFormattedDate&) = delete;

    // Appends the local time of the message's stamp to `out`.
    // Errors: std::bad_alloc.
    // Threads: safe from any thread; `tm` belongs to the calling one.
    // Cost: allocates only for a piece of 64 characters or more.
    void fmt(std::string& out, CachedTm& tm, const LogMsgMetadata& mdata) const;

private:
    // One owned copy of a piece, in a singly linked list with the newest at the head.
    struct StringStorage {
        char* str = nullptr;
        StringStorage* next = nullptr;
    };

    void compile(const char* fmtstr, const char* fmtend);
    void addPiece(const char* begin, const char* end);
    Atom* new_atom();
    const char* store_string(const char* str, std::size_t len);

    Atom* _atoms = nullptr;           // array of _max_atoms, owned
    Atom* _atom_end = nullptr;        // one past the last used atom
    std::uint32_t _max_atoms = 0;     // capacity of the array
    StringStorage* _sstor = nullptr;  // owned copies of the pieces
};

#endif  // QUELTA_UTIL_LOGFORMAT_H_
