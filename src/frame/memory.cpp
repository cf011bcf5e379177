// SPDX-License-Identifier: Apache-2.0
#include "qorcore.h"
#include "qori.h"

namespace qori::frame {
namespace {

template <class T, int channels>
T* allocateImage(int32_t width, int32_t height, int32_t* pStepBytes) {
    if (pStepBytes == nullptr) return nullptr;
    *pStepBytes = 0;
    if (width <= 0 || height <= 0) return nullptr;
    // Modulo 2^32 throughout: a product that wraps to nonsense is for the allocator to refuse.
    constexpr uint32_t pixelBytes = sizeof(T) * channels;
    const uint32_t step = (static_cast<uint32_t>(width) * pixelBytes + 63u) & ~63u;
    *pStepBytes = static_cast<int32_t>(step);
    return static_cast<T*>(qorMalloc(static_cast<int32_t>(static_cast<uint32_t>(height) * step)));
}

void freeImage(void* image) { qorFree(image); }

}  // namespace
}  // namespace qori::frame

#include "entries/memory.inc"
