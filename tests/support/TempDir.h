#ifndef QUELTA_TESTS_SUPPORT_TEMPDIR_H_
#define QUELTA_TESTS_SUPPORT_TEMPDIR_H_

// A new directory that is removed with its contents at the end of the scope, and functions that
// read and write whole files. A failure throws.
//
//     TempDir dir;
//     writeFile(dir.file("a.cfg"), "x=1\n");
// Not thread-safe; one thread at a time per object.

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <system_error>

class TempDir {
public:
    TempDir() : _path((std::filesystem::temp_directory_path() / "quelta-XXXXXX").string()) {
        if (::mkdtemp(_path.data()) == nullptr) {
            throw std::system_error(errno, std::generic_category(), _path);
        }
    }
    ~TempDir() {
        std::error_code ignored;
        std::filesystem::remove_all(_path, ignored);
    }
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    // The absolute path of the directory, without a '/' at the end.
    const std::string& path() const { return _path; }
    // The path of an entry in it, which need not exist.
    std::string file(const std::string& name) const { return _path + '/' + name; }

private:
    std::string _path;
};

// Returns: the bytes of a file.
inline std::string readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        throw std::system_error(errno, std::generic_category(), path);
    }
    return std::string(std::istreambuf_iterator<char>(in), {});
}

// Creates or replaces a file.
inline void writeFile(const std::string& path, const std::string& contents) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << contents;
    out.close();
    if (!out) {
        throw std::system_error(errno, std::generic_category(), path);
    }
}

#endif  // QUELTA_TESTS_SUPPORT_TEMPDIR_H_
