// SPDX-License-Identifier: Apache-2.0
// Each block ends flush against a no-access page, up to the bytes that keep its start on a 64-byte boundary; those hold
// a pattern that is checked when the block is freed. Calls come from one thread.
#include "qorcore_instrumented.h"

#include "../guarded_memory.h"

namespace {

using qori::test::GuardedPages;

constexpr int kMaxBlocks = 256;
constexpr uint8_t kCanary = 0xC5;
constexpr int32_t kDefaultCache = 32 << 20;

struct Block {
    GuardedPages pages;
    uint8_t* begin = nullptr;
    size_t length = 0;
};

Block blocks[kMaxBlocks];
int failCountdown;
int32_t cacheSize = kDefaultCache;
int cacheQueries, featureQueries, liveBlocks, damagedBlocks;

}  // namespace

extern "C" {

void* QORCORE_CALL qorMalloc(int32_t length) {
    if (failCountdown > 0 && --failCountdown == 0) return nullptr;
    if (length < 1) return nullptr;
    for (Block& block : blocks) {
        if (block.begin != nullptr) continue;
        const size_t rounded = (static_cast<size_t>(length) + 63) & ~size_t{63};
        block.pages = qori::test::mapGuarded(rounded);
        if (block.pages.begin == nullptr) return nullptr;
        block.begin = block.pages.begin + block.pages.size - rounded;
        block.length = static_cast<size_t>(length);
        for (size_t i = block.length; i < rounded; ++i) block.begin[i] = kCanary;
        ++liveBlocks;
        return block.begin;
    }
    return nullptr;
}

void QORCORE_CALL qorFree(void* pointer) {
    if (pointer == nullptr) return;
    for (Block& block : blocks) {
        if (block.begin != pointer) continue;
        bool damaged = false;
        for (uint8_t* p = block.begin + block.length; p < block.pages.begin + block.pages.size; ++p)
            damaged |= *p != kCanary;
        damagedBlocks += damaged;
        unmapGuarded(block.pages);
        block = {};
        --liveBlocks;
        return;
    }
    ++damagedBlocks;  // not a block of ours
}

uint64_t QORCORE_CALL qorGetEnabledCpuFeatures(void) {
    ++featureQueries;
    return 0x3FF;
}

int32_t QORCORE_CALL qorGetMaxCacheSizeB(int32_t* pSize) {
    ++cacheQueries;
    if (cacheSize < 0) return -9999;
    *pSize = cacheSize;
    return 0;
}

void qorTestFailAllocation(int n) { failCountdown = n; }
void qorTestSetCacheSize(int32_t bytes) { cacheSize = bytes == 0 ? kDefaultCache : bytes; }
int qorTestCacheQueries(void) { return cacheQueries; }
int qorTestFeatureQueries(void) { return featureQueries; }
int qorTestLiveBlocks(void) { return liveBlocks; }
void qorTestForgetBlocks(void) {
    for (Block& block : blocks) {
        unmapGuarded(block.pages);
        block = {};
    }
    liveBlocks = 0;
}
int qorTestDamagedBlocks(void) { return damagedBlocks; }
}
