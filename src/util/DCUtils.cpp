#include "util/DCUtils.h"

#include <cstring>
#include <new>

char* copystr(const char* input) {
    if (input == nullptr) {
        return nullptr;
    }
    const std::size_t size = std::strlen(input) + 1;
    char* const copy = new (std::nothrow) char[size];
    if (copy == nullptr) {
        throw std::bad_alloc();
    }
    std::memcpy(copy, input, size);
    return copy;
}
