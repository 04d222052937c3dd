#include "util/HugePages.h"

#include <sys/mman.h>

#include <cerrno>
#include <cstdint>
#include <vector>

#include <gtest/gtest.h>

extern "C" int __wrap_madvise(void* memory, std::size_t size, int advice);

namespace {

constexpr std::uintptr_t MIB = std::uintptr_t{1} << 20;

struct Advice {
    std::uintptr_t memory;
    std::size_t size;
    int advice;
};
std::vector<Advice> given;

void* at(std::uintptr_t address) {
    return reinterpret_cast<void*>(address);
}

}  // namespace

extern "C" int __wrap_madvise(void* memory, std::size_t size, int advice) {
    given.push_back({reinterpret_cast<std::uintptr_t>(memory), size, advice});
    errno = EINVAL;
    return -1;
}

namespace {

TEST(HugePagesTest, AdvisesTheWholeLargePagesWithinTheBlock) {
    const struct {
        std::uintptr_t memory;
        std::size_t size;
        std::uintptr_t begin;
        std::uintptr_t end;  // as begin: no advice
    } cases[] = {
        {4 * MIB, 2 * MIB, 4 * MIB, 6 * MIB},
        {4 * MIB, 2 * MIB - 1, 0, 0},
        {4 * MIB + 16, 2 * MIB, 0, 0},
        {4 * MIB + 16, 4 * MIB, 6 * MIB, 8 * MIB},
        {4 * MIB + 1, 4 * MIB, 6 * MIB, 8 * MIB},
        {4 * MIB - 1, 2 * MIB + 1, 4 * MIB, 6 * MIB},
        {3 * MIB, 100 * MIB, 4 * MIB, 102 * MIB},
        {4 * MIB, 0, 0, 0},
        {0, 0, 0, 0},
    };
    for (const auto& c : cases) {
        given.clear();
        errno = ENOENT;
        adviseHugePages(at(c.memory), c.size);
        EXPECT_EQ(ENOENT, errno);
        if (c.begin == c.end) {
            EXPECT_TRUE(given.empty()) << c.memory << ' ' << c.size;
            continue;
        }
        ASSERT_EQ(1u, given.size());
        EXPECT_EQ(c.begin, given[0].memory);
        EXPECT_EQ(c.end, given[0].memory + given[0].size);
        EXPECT_EQ(MADV_HUGEPAGE, given[0].advice);
    }
}

}  // namespace
