#ifndef QUELTA_UTIL_PATHNAME_H_
#define QUELTA_UTIL_PATHNAME_H_

// A file-system path: a string of bytes with '/' between its elements, ordered and compared as the
// string it is.
//
//     const Pathname log = Pathname("/var") / "log" / "app.log";
//     if (!log.toParent().isDir() && !log.toParent().mkdir(Pathname::MKDIR_WORLD_READ)) {
//         std::perror(log.toParent().c_str());
//     }
//
// Three groups of operations: editing, which works on the text and never on a file system; thin
// wrappers around one system call each, which pass the text unchanged; and quoting for the shell.
// Wrappers neither throw nor log: they return true if the call returned 0, and leave errno as the
// call set it.
// Not thread-safe; one thread at a time per object. The static paths are safe to share.

#include <sys/stat.h>
#include <sys/types.h>

#include <cstdio>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "util/Requirements.h"

class FileDescriptor;

// A path. Every operation of std::string works on its text.
class Pathname : public std::string {
public:
    static constexpr char sep = '/';  // the separator of elements
    static const Pathname root;       // "/"
    static const Pathname cur;        // "."
    static const Pathname parent;     // ".."

    // Permission bits of a new file, before the umask.
    enum CreateMode : int {
        CREATE_NORMAL = 0,             // 0644
        CREATE_PRIVATE = 1,            // 0600
        CREATE_READABLE_NONPUBLIC = 2  // 0440
    };
    // Permission bits of a new directory, before the umask.
    enum MkdirMode : int {
        MKDIR_PRIVATE = 0,    // 0700
        MKDIR_GROUP_RW = 1,   // 0770
        MKDIR_PUBLIC = 2,     // 0777
        MKDIR_WORLD_READ = 3  // 0755
    };

    // The empty path.
    Pathname() = default;
    // Takes the text as it is. Implicit, because a path is a string; `path` must not be null.
    Pathname(const char* path) : std::string(path) {}
    Pathname(std::string path) noexcept : std::string(std::move(path)) {}
    Pathname(const char* path, unsigned long length) : std::string(path, length) {}

    // --- Editing ---------------------------------------------------------------------------------

    // Returns: whether the first character is '/'.
    [[nodiscard]] bool isAbsolute() const noexcept { return !empty() && front() == sep; }
    // Returns: whether there is a '/' anywhere.
    [[nodiscard]] bool containsSep() const noexcept { return find(sep) != npos; }

    // Appends one element with one '/' before it; an empty element changes nothing. `elem` may be
    // this path itself.
    // Deliberate: an element joined to the empty path makes an absolute path ("" / "a" is "/a");
    // callers start from a base that is not empty.
    Pathname& operator/=(const std::string& elem);
    Pathname& operator/=(const char* elem);
    // Returns: a copy to which the element is appended, as by /=.
    [[nodiscard]] Pathname operator/(const std::string& elem) const;
    [[nodiscard]] Pathname operator/(const char* elem) const;

    // Ensures that the path ends in '/'; the empty path becomes "/".
    void addTrailingSep();
    // Removes every trailing '/' except the path's first character.
    void removeTrailingSeps();
    // Removes the last element with the '/' around it: "/a/b/" becomes "/a", "/a" becomes "/", "/"
    // stays.
    // Deliberate: "a" becomes the empty path, not ".".
    void stripElement();
    // Returns: what stripElement leaves.
    [[nodiscard]] Pathname toParent() const;
    // Returns: the last element without '/': "b" of "/a/b//".
    // Deliberate: "/" both for the empty path and for a path of separators only, so a leaf is never
    // empty.
    [[nodiscard]] Pathname toLeaf() const;

    // Returns: the text after the last dot of the last element; empty without a dot, or if the
    // path ends in a dot or '/'.
    // Deliberate: a name's first dot counts (".bashrc" has the extension "bashrc"), though
    // basenameWithoutExt does not cut there.
    [[nodiscard]] std::string ext() const;
    // Returns: the last element without its last dot and what follows; empty if the path ends in
    // '/'.
    // Deliberate: a dot that is the element's first character stays (".bashrc"), and a dot at the
    // end is removed ("file." gives "file"), unlike in ext.
    [[nodiscard]] std::string basenameWithoutExt() const;

    // Deletes every ".." element, so that the path cannot climb out of a directory.
    // Deliberate: the element before stays ("a/../b" becomes "a/b"); nothing is resolved.
    // Cost: linear.
    void removeDotDotSlash();
    // Collapses each run of '/' into one, also at the start.
    // Cost: linear.
    void removeDoubleSeps();
    [[nodiscard]] static Pathname removeDoubleSeps(const Pathname& path);
    [[nodiscard]] static Pathname removeDoubleSeps(const char* path);

    // --- The shell -------------------------------------------------------------------------------

    // Returns: the path as a word of a shell command line, quoted for blanks, quotes, '$', '\\' and
    // `#&*;=?[]|`.
    // Deliberate: parentheses, redirections, backquotes, '~', '!' and braces are not quoted. Use
    // this for trusted names only; it does not make untrusted names safe.
    [[nodiscard]] std::string shellQuoted() const;

    // Splits the first word off `input`, undoing shellQuoted. `firstArg` is replaced by the word,
    // `rest` by what follows it, starting at the blank; `rest` may be the same object as `input`.
    // Returns: true if there is a word. Otherwise, or if a quote or backslash is not completed,
    // false, and `rest` is unchanged.
    // Deliberate: an empty quoted word does not count as a word; a backslash within double quotes
    // escapes any character.
    static bool splitArgShellQuoted(const std::string& input, Pathname& firstArg,
                                    std::string& rest);

    // --- One system call each --------------------------------------------------------------------

    // Fills *result by stat, which follows links.
    bool stat(struct stat* result) const;
    // Returns: whether the path exists and is a directory.
    [[nodiscard]] bool isDir() const;
    // Returns: whether the path exists and is a regular file.
    [[nodiscard]] bool isReg() const;
    // Replaces *mtime by the time of the last change, in seconds since the epoch. A long of 32 bits
    // holds times until January 2038; later ones wrap.
    // Errors: false, and *mtime is unchanged.
    bool getMtime(long* mtime) const;
    // Replaces *size by the size in bytes.
    // Errors: false, and *size is unchanged.
    bool getSize(long long* size) const;
    // Returns: whether the path exists.
    [[nodiscard]] bool exists() const;
    // Returns: whether the real user may read it.
    [[nodiscard]] bool r_ok() const;
    // Returns: whether the real user may write it.
    [[nodiscard]] bool w_ok() const;
    // Returns: whether the real user may read and write it.
    [[nodiscard]] bool rw_ok() const;

    // Opens a stream, in a mode of std::fopen.
    // Returns: the stream, or null.
    // Owns: the caller closes it with std::fclose.
    [[nodiscard]] std::FILE* fopen(const char* mode) const;
    // Creates the directory; its parent must exist.
    // Requires: one of the four modes; asserted.
    bool mkdir(MkdirMode mode) const;
    // Removes the directory, which must be empty.
    bool rmdir() const;
    // Removes the file, but no directory.
    bool unlink() const;
    // Removes the file or the empty directory.
    bool remove() const;
    // Cuts or extends the file to a length in bytes.
    bool truncate(long long length) const;
    // Fills `buf` with up to `size` bytes of the link's text, without a NUL.
    // Deliberate: true only if the call returned 0, like all other wrappers, so false whenever
    // there was text. Look at the buffer.
    bool readlink(char* buf, unsigned long size) const;
    // Creates `link`, whose text is this path.
    bool symlinkTo(const Pathname& link) const;
    // Renames the file or directory; an existing file `dest` is replaced.
    bool renameTo(const Pathname& dest) const;

    // Opens the file for reading.
    // Returns: the descriptor, -1 with errno on failure, as do the other open operations.
    // Owns: the caller closes it.
    [[nodiscard]] FileDescriptor openReadOnly() const;
    // Opens the file for reading. Does not block, neither now (on a FIFO or device) nor in later
    // reads.
    [[nodiscard]] FileDescriptor openReadOnlySafer() const;
    // Creates the file for writing; fails if it exists.
    [[nodiscard]] FileDescriptor openCreateOnly(CreateMode mode) const;
    // Opens the file for writing; creates it, or empties an existing one.
    [[nodiscard]] FileDescriptor openCreateOrReplace(CreateMode mode) const;
    // Opens in the same way, but creates with the permission bits of the file `model`; fails if
    // fstat does.
    [[nodiscard]] FileDescriptor openCreateOrReplace(FileDescriptor model) const;
    // Opens the file for writing, or creates it; each write goes to the end.
    [[nodiscard]] FileDescriptor openCreateOrAppend(CreateMode mode) const;
    // Opens the file for reading and writing, or creates it.
    // Deliberate: empties an existing file, despite the name.
    [[nodiscard]] FileDescriptor openReadWriteOrCreate(CreateMode mode) const;

    // Copies the contents and permission bits to another file, replacing it.
    // Errors: false, with errno of the step that failed; see FileDescriptor::copyTo.
    bool copyTo(const Pathname& dest) const;
};

// Returns: the permission bits of a mode; 0644 for any other value.
[[nodiscard]] mode_t createmode_to_perm(Pathname::CreateMode mode) noexcept;

// Paths in the order of insertion; duplicates allowed.
class PathList : public std::vector<Pathname> {
public:
    static constexpr char listSep = ':';  // the default separator

    // No paths.
    PathList() = default;
    // The elements of a separated list; see push_back_separated.
    PathList(const char* list, char separator);
    PathList(const std::string& list, char separator);
    explicit PathList(const char* list) : PathList(list, listSep) {}
    explicit PathList(const std::string& list) : PathList(list, listSep) {}
    // The elements of an ordered set, in its order.
    PathList(std::set<Pathname>::const_iterator first, std::set<Pathname>::const_iterator last);

    // Appends each piece between separators that is not empty, untouched, in order. `list` must not
    // be null.
    void push_back_separated(const char* list, char separator = listSep);
};

#endif  // QUELTA_UTIL_PATHNAME_H_
