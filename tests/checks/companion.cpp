// SPDX-License-Identifier: Apache-2.0
// The real companion, which the other tests replace by an instrumented one.
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <initializer_list>

#include "qorcore.h"

namespace {

int failures;

void expect(bool holds, const char* what) {
    if (holds) return;
    std::printf("not so: %s\n", what);
    ++failures;
}

#ifdef __linux__
/// From the kernel's description of processor 0, in bytes; 0 where it has none.
long largestCacheOfTheSystem() {
    long largest = 0;
    for (int index = 0; index < 8; ++index) {
        char path[80];
        std::snprintf(path, sizeof path, "/sys/devices/system/cpu/cpu0/cache/index%d/size", index);
        std::FILE* file = std::fopen(path, "r");
        if (file == nullptr) break;
        long kib = 0;
        if (std::fscanf(file, "%ldK", &kib) == 1 && kib * 1024 > largest) largest = kib * 1024;
        std::fclose(file);
    }
    return largest;
}
#endif

}  // namespace

int main() {
    void* blocks[8];
    for (int i = 0; i < 8; ++i) {
        const int32_t length = 1 + 37 * i;
        blocks[i] = qorMalloc(length);
        expect(blocks[i] != nullptr && reinterpret_cast<uintptr_t>(blocks[i]) % 64 == 0,
               "blocks start on 64-byte boundaries");
        if (blocks[i] != nullptr) std::memset(blocks[i], 0xA5, static_cast<size_t>(length));
    }
    for (void* block : blocks) qorFree(block);
    qorFree(nullptr);
    for (int32_t length : {0, -1, INT32_MIN}) expect(qorMalloc(length) == nullptr, "nonsense lengths give null");
    qorFree(qorMalloc(INT32_MAX));  // null or a block, but no crash

    constexpr uint64_t fma = 0x10, avx2 = 0x20;
    expect((qorGetEnabledCpuFeatures() & (fma | avx2)) == (fma | avx2), "this processor has AVX2 and FMA");

    int32_t cache = -1;
    expect(qorGetMaxCacheSizeB(&cache) == 0 && cache >= 1 << 18, "the largest cache has a plausible size");
    expect(qorGetMaxCacheSizeB(nullptr) == -8, "a null pointer is refused");
#ifdef __linux__
    const long system = largestCacheOfTheSystem();
    if (system > 0) expect(cache == system, "the kernel sees the same cache");
    std::printf("largest cache: %d, by the kernel %ld\n", cache, system);
#endif
    return failures;
}
