// SPDX-License-Identifier: Apache-2.0
#include "qorcore.h"

#include <cpuid.h>

#include <cstdlib>
#ifdef _WIN32
#include <malloc.h>
#endif

namespace {

constexpr int32_t kNullPointer = -8;
constexpr int32_t kUnknown = -9999;

// cpuid traps to the hypervisor on virtual machines and costs tens of microseconds there, so it is asked once, at load.
struct Processor {
    uint64_t features;
    int32_t maxCacheBytes;
};
Processor processor;

uint64_t enabledFeatures() {
    unsigned eax = 0, ebx = 0, ecx = 0, edx = 0;
    if (!__get_cpuid(1, &eax, &ebx, &ecx, &edx)) return 0;
    const auto bit = [](unsigned word, int index, uint64_t flag) { return (word >> index & 1u) ? flag : 0u; };
    uint64_t features = bit(edx, 23, 0x1) | bit(edx, 25, 0x2) | bit(edx, 26, 0x4) | bit(ecx, 0, 0x8) |
                        bit(ecx, 9, 0x40) | bit(ecx, 19, 0x80) | bit(ecx, 20, 0x100);
    const bool osSavesState = ecx >> 27 & 1u;
    unsigned stateLow = 0, stateHigh = 0;
    if (osSavesState) __asm__("xgetbv" : "=a"(stateLow), "=d"(stateHigh) : "c"(0));
    if ((stateLow & 6u) != 6u) return features;
    features |= bit(ecx, 12, 0x10) | bit(ecx, 28, 0x200);
    if (__get_cpuid_count(7, 0, &eax, &ebx, &ecx, &edx)) features |= bit(ebx, 5, 0x20);
    return features;
}

// Deterministic cache parameters: leaf 4, or 0x8000001D where leaf 4 is empty; both have one layout.
int32_t largestCache(unsigned leaf) {
    uint64_t largest = 0;
    for (unsigned index = 0; index < 16; ++index) {
        unsigned eax = 0, ebx = 0, ecx = 0, edx = 0;
        if (!__get_cpuid_count(leaf, index, &eax, &ebx, &ecx, &edx)) break;
        const unsigned type = eax & 31u;  // 0 none, 1 data, 2 instruction, 3 unified
        if (type == 0) break;
        if (type == 2) continue;
        const uint64_t ways = (ebx >> 22) + 1u, partitions = (ebx >> 12 & 1023u) + 1u, line = (ebx & 4095u) + 1u;
        const uint64_t bytes = ways * partitions * line * (uint64_t{ecx} + 1u);
        if (bytes > largest) largest = bytes;
    }
    return static_cast<int32_t>(largest > INT32_MAX ? INT32_MAX : largest);
}

__attribute__((constructor)) void askProcessor() {
    processor.features = enabledFeatures();
    processor.maxCacheBytes = largestCache(4);
    if (processor.maxCacheBytes == 0) processor.maxCacheBytes = largestCache(0x8000001Du);
}

}  // namespace

extern "C" {

void* QORCORE_CALL qorMalloc(int32_t length) {
    if (length < 1) return nullptr;
    const size_t rounded = (static_cast<size_t>(length) + 63) & ~size_t{63};
#ifdef _WIN32
    return _aligned_malloc(rounded, 64);
#else
    return std::aligned_alloc(64, rounded);
#endif
}

void QORCORE_CALL qorFree(void* block) {
#ifdef _WIN32
    _aligned_free(block);
#else
    std::free(block);
#endif
}

uint64_t QORCORE_CALL qorGetEnabledCpuFeatures(void) { return processor.features; }

int32_t QORCORE_CALL qorGetMaxCacheSizeB(int32_t* pSize) {
    if (pSize == nullptr) return kNullPointer;
    *pSize = processor.maxCacheBytes;
    return processor.maxCacheBytes > 0 ? 0 : kUnknown;
}
}
