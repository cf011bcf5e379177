// SPDX-License-Identifier: Apache-2.0
#include "stream_rows.h"

#include <algorithm>

#include "kernels/copy_rows.h"

namespace qori::kernels {
namespace {

constexpr uintptr_t kLine = 64;

/// A piece that begins on a cache line of the destination.
QORI_INLINE void streamPiece(uint8_t* dst, const uint8_t* src) {
    constexpr ptrdiff_t step = 2 * kVectorBytes;
    for (ptrdiff_t at = 0; at < kStreamedPiece; at += step) {
        const Bytes a = load(src + at), b = load(src + at + kVectorBytes);
        stream(dst + at, a);
        stream(dst + at + kVectorBytes, b);
    }
}

}  // namespace

void copyRowsStreaming(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                       int32_t rows) {
    for (; rows > 0; rows -= kStreamedTogether) {
        const int32_t together = std::min(rows, kStreamedTogether);
        ptrdiff_t done[kStreamedTogether];
        for (int32_t k = 0; k < together; ++k) {
            uint8_t* const to = dst + k * dstStep;
            done[k] = std::min(bytes, static_cast<ptrdiff_t>(-reinterpret_cast<uintptr_t>(to) & (kLine - 1)));
            copyRow(to, src + k * srcStep, done[k]);
        }
        for (bool isMore = true; isMore;) {
            isMore = false;
            for (int32_t k = 0; k < together; ++k) {
                if (bytes - done[k] < kStreamedPiece) continue;
                streamPiece(dst + k * dstStep + done[k], src + k * srcStep + done[k]);
                done[k] += kStreamedPiece;
                isMore = true;
            }
        }
        for (int32_t k = 0; k < together; ++k)
            copyRow(dst + k * dstStep + done[k], src + k * srcStep + done[k], bytes - done[k]);
        dst += kStreamedTogether * dstStep;
        src += kStreamedTogether * srcStep;
    }
}

}  // namespace qori::kernels
