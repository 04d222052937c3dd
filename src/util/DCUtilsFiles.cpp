#include <algorithm>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>

#include "util/DCUtils.h"
#include "util/Pathname.h"
#include "util/internal/FileCloser.h"

namespace {

using Text = std::unique_ptr<char[]>;

// A longer array with the first `used` bytes of `text`; null when memory is exhausted.
Text enlarged(const Text& text, std::size_t used, std::size_t capacity) {
    Text larger(new (std::nothrow) char[capacity]);
    if (larger != nullptr) {
        std::copy_n(text.get(), used, larger.get());
    }
    return larger;
}

// The file's bytes and a NUL, in an array of `capacity` bytes that grows when the file does; null
// when memory is exhausted.
Text readToEnd(FILE* f, std::size_t capacity) {
    Text text = enlarged(nullptr, 0, capacity);
    std::size_t used = 0;
    int c = text == nullptr ? EOF : std::getc(f);
    while (c != EOF) {
        if (used + 1 == capacity) {
            capacity *= 2;
            text = enlarged(text, used, capacity);
            if (text == nullptr) {
                return nullptr;
            }
        }
        text[used++] = static_cast<char>(c);
        c = std::getc(f);
    }
    if (text != nullptr) {
        text[used] = '\0';
    }
    return text;
}

}  // namespace

bool readLine(FILE* f, char* linebuf, int bufSize) {
    std::fill_n(linebuf, bufSize, '\0');
    if (bufSize < 3 || std::fgets(linebuf, bufSize - 1, f) == nullptr) {
        return false;
    }
    const char last = linebuf[bufSize - 3];
    if (last != '\0' && last != '\n') {
        int c = std::getc(f);
        while (c != EOF && c != '\n') {
            c = std::getc(f);
        }
    }
    return true;
}

bool writeText(const Pathname& filename, const char* text) {
    const OpenFile file(filename.fopen("w"));
    if (file == nullptr) {
        return false;
    }
    if (text != nullptr) {
        [[maybe_unused]] const std::size_t ignored =
            std::fwrite(text, 1, std::strlen(text), file.get());
    }
    return true;
}

char* readText(const Pathname& filename) {
    const OpenFile file(filename.fopen("r"));
    long long size = 0;
    if (file == nullptr || !filename.getSize(&size)) {
        return nullptr;
    }
    Text text = readToEnd(file.get(), static_cast<std::size_t>(size) + 1);
    if (text == nullptr) {
        std::printf("Unable to alloc %lld for reading file %s\n", size, filename.c_str());
    }
    return text.release();
}
