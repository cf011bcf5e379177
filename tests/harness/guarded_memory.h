// SPDX-License-Identifier: Apache-2.0
// Pages between two no-access pages, so that a stray access faults.
#pragma once
#include <cstddef>
#include <cstdint>
#ifdef _WIN32
#ifndef NOMINMAX
#define NOMINMAX
#endif
#define WIN32_LEAN_AND_MEAN
#include <windows.h>
#else
#include <sys/mman.h>
#endif

namespace qori::test {

constexpr size_t kPage = 4096;

struct GuardedPages {
    uint8_t* begin = nullptr;
    size_t size = 0;
};

inline GuardedPages mapGuarded(size_t bytes) {
    const size_t size = (bytes + kPage - 1) / kPage * kPage;
#ifdef _WIN32
    auto* base =
        static_cast<uint8_t*>(VirtualAlloc(nullptr, size + 2 * kPage, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE));
    if (base == nullptr) return {};
    DWORD old;
    VirtualProtect(base, kPage, PAGE_NOACCESS, &old);
    VirtualProtect(base + kPage + size, kPage, PAGE_NOACCESS, &old);
#else
    void* map = mmap(nullptr, size + 2 * kPage, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (map == MAP_FAILED) return {};
    auto* base = static_cast<uint8_t*>(map);
    mprotect(base, kPage, PROT_NONE);
    mprotect(base + kPage + size, kPage, PROT_NONE);
#endif
    return {base + kPage, size};
}

inline void unmapGuarded(GuardedPages pages) {
    if (pages.begin == nullptr) return;
#ifdef _WIN32
    VirtualFree(pages.begin - kPage, 0, MEM_RELEASE);
#else
    munmap(pages.begin - kPage, pages.size + 2 * kPage);
#endif
}

}  // namespace qori::test
