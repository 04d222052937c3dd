#include "util/SmallObjectHeap.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <random>
#include <set>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

namespace {

constexpr std::size_t BLOCK = std::size_t{64} << 10;

std::unique_ptr<SmallObjectHeap> makeHeap(std::size_t range = std::size_t{64} << 20) {
    return std::make_unique<SmallObjectHeap>(range);
}

// An object whose bytes all hold one value.
struct Filled {
    unsigned char* memory;
    std::size_t size;
    unsigned char value;

    bool intact() const {
        for (std::size_t i = 0; i < size; ++i) {
            if (memory[i] != value) {
                return false;
            }
        }
        return true;
    }
};

Filled fill(SmallObjectHeap& heap, std::size_t size, unsigned char value) {
    auto* const memory = static_cast<unsigned char*>(heap.allocate(size));
    std::memset(memory, value, size);
    return {memory, size, value};
}

TEST(SmallObjectHeapTest, ObjectsAreAlignedAndDoNotOverlap) {
    const auto heap = makeHeap();
    std::vector<Filled> objects;
    for (int round = 0; round < 3; ++round) {
        for (std::size_t size = 0; size <= SmallObjectHeap::LARGEST + 40; ++size) {
            objects.push_back(fill(*heap, size, static_cast<unsigned char>(objects.size())));
            ASSERT_NE(nullptr, objects.back().memory);
            ASSERT_EQ(0u, reinterpret_cast<std::uintptr_t>(objects.back().memory) % 16) << size;
        }
    }
    std::set<unsigned char*> places;
    for (const Filled& object : objects) {
        ASSERT_TRUE(object.intact()) << object.size;
        ASSERT_TRUE(places.insert(object.memory).second) << object.size;
    }
    for (const Filled& object : objects) {
        heap->release(object.memory, object.size);
    }
}

TEST(SmallObjectHeapTest, SmallObjectsLieSideBySide) {
    const auto heap = makeHeap();
    auto* const first = static_cast<char*>(heap->allocate(40));
    EXPECT_EQ(first + 48, heap->allocate(48));
    EXPECT_EQ(first + 96, heap->allocate(33));
    auto* const smallest = static_cast<char*>(heap->allocate(1));
    EXPECT_EQ(smallest + 16, heap->allocate(0));
    EXPECT_EQ(smallest + 32, heap->allocate(16));
    EXPECT_TRUE(heap->owns(first));
}

TEST(SmallObjectHeapTest, GivesTheLatestReleasedObjectOfTheClassFirst) {
    const auto heap = makeHeap();
    void* const first = heap->allocate(40);
    void* const second = heap->allocate(40);
    void* const other = heap->allocate(20);
    heap->release(first, 40);
    heap->release(other);
    heap->release(second);
    EXPECT_EQ(second, heap->allocate(48));
    EXPECT_EQ(first, heap->allocate(33));
    EXPECT_EQ(other, heap->allocate(32));
}

TEST(SmallObjectHeapTest, LargeObjectsAreMallocs) {
    const auto heap = makeHeap();
    void* const small = heap->allocate(SmallObjectHeap::LARGEST);
    void* const large = heap->allocate(SmallObjectHeap::LARGEST + 1);
    EXPECT_TRUE(heap->owns(small));
    EXPECT_FALSE(heap->owns(large));
    heap->release(small);
    heap->release(large);
    heap->release(heap->allocate(1000), 1000);
}

TEST(SmallObjectHeapTest, ReleasesWhatMallocGaveAndNull) {
    const auto heap = makeHeap();
    heap->release(nullptr);
    heap->release(nullptr, 8);
    heap->release(std::malloc(40));
    heap->release(heap->allocate(40));
    heap->release(std::malloc(40), 40);
    heap->release(nullptr);
}

// A block that the objects do not fill exactly must not let one reach into the next block.
TEST(SmallObjectHeapTest, GoesOnInANewBlock) {
    const auto heap = makeHeap();
    std::vector<Filled> objects;
    for (std::size_t i = 0; i < 3 * BLOCK / 48; ++i) {
        objects.push_back(fill(*heap, 48, static_cast<unsigned char>(i)));
        objects.push_back(fill(*heap, 112, static_cast<unsigned char>(i + 1)));
    }
    for (const Filled& object : objects) {
        ASSERT_TRUE(object.intact());
        ASSERT_TRUE(heap->owns(object.memory));
        heap->release(object.memory);
    }
    const void* const reused = heap->allocate(112);
    EXPECT_EQ(objects.back().memory, reused);
}

TEST(SmallObjectHeapTest, WithoutRoomItTakesMalloc) {
    const auto heap = makeHeap(BLOCK);
    std::vector<void*> objects;
    int owned = 0;
    for (int i = 0; i < 300; ++i) {
        objects.push_back(heap->allocate(SmallObjectHeap::LARGEST));
        ASSERT_NE(nullptr, objects.back());
        owned += heap->owns(objects.back());
    }
    EXPECT_EQ(256, owned);
    objects.push_back(heap->allocate(16));
    EXPECT_FALSE(heap->owns(objects.back()));
    for (void* const object : objects) {
        heap->release(object);
    }
}

TEST(SmallObjectHeapTest, WithoutAddressSpaceItTakesMalloc) {
    const auto heap = makeHeap(std::size_t{1} << 62);
    for (int i = 0; i < 3; ++i) {
        void* const object = heap->allocate(40);
        ASSERT_NE(nullptr, object);
        EXPECT_FALSE(heap->owns(object));
        heap->release(object, 40);
    }
}

void workAtRandom(SmallObjectHeap& heap, unsigned seed) {
    std::mt19937 draw(seed);
    std::vector<Filled> objects;
    for (int step = 0; step < 20000; ++step) {
        if (objects.empty() || draw() % 5 < 3) {
            objects.push_back(fill(heap, draw() % 300, static_cast<unsigned char>(draw())));
            continue;
        }
        std::swap(objects[draw() % objects.size()], objects.back());
        ASSERT_TRUE(objects.back().intact()) << "seed " << seed << ", step " << step;
        if (draw() % 2 == 0) {
            heap.release(objects.back().memory);
        } else {
            heap.release(objects.back().memory, objects.back().size);
        }
        objects.pop_back();
    }
    for (const Filled& object : objects) {
        ASSERT_TRUE(object.intact());
        heap.release(object.memory);
    }
}

TEST(SmallObjectHeapTest, KeepsContentsThroughRandomUse) {
    const auto heap = makeHeap();
    for (unsigned seed = 1; seed <= 10; ++seed) {
        workAtRandom(*heap, seed);
    }
}

TEST(SmallObjectHeapTest, ServesThreadsAtOnce) {
    const auto heap = makeHeap();
    std::vector<void*> handedOver;
    for (int i = 0; i < 1000; ++i) {
        handedOver.push_back(heap->allocate(40));
    }
    std::vector<std::thread> threads;
    for (unsigned seed = 1; seed <= 4; ++seed) {
        threads.emplace_back([&heap, seed] { workAtRandom(*heap, seed); });
    }
    threads.emplace_back([&] {
        for (void* const object : handedOver) {
            heap->release(object);
        }
    });
    for (std::thread& thread : threads) {
        thread.join();
    }
}

}  // namespace
