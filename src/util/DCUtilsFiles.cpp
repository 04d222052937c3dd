#include <algorithm>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>
#include <span>
#include <utility>

#include "util/DCUtils.h"
#include "util/Pathname.h"
#include "util/internal/FileCloser.h"

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
    std::size_t capacity = static_cast<std::size_t>(size) + 1;  // bytes, with the NUL
    std::unique_ptr<char[]> text(new (std::nothrow) char[capacity]);
    if (text == nullptr) {
        std::printf("Unable to alloc %lld for reading file %s\n", size, filename.c_str());
        return nullptr;
    }
    std::size_t used = 0;
    for (int c = std::getc(file.get()); c != EOF; c = std::getc(file.get())) {
        if (used + 1 == capacity) {
            // Files in /proc, pipes and growing files are longer than their size.
            capacity *= 2;
            std::unique_ptr<char[]> larger(new char[capacity]);
            std::copy_n(text.get(), used, larger.get());
            text = std::move(larger);
        }
        std::span(text.get(), capacity)[used++] = static_cast<char>(c);
    }
    text[used] = '\0';
    return text.release();
}
