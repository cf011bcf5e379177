// SPDX-License-Identifier: Apache-2.0
#include "stream_rows.h"

#include <algorithm>

#include "kernels/copy_rows.h"

namespace qori::kernels {
namespace {

constexpr ptrdiff_t kLine = 2 * kVectorBytes;

/// A cache line of the destination.
QORI_INLINE void streamLine(uint8_t* dst, const uint8_t* src) {
    const Bytes a = load(src), b = load(src + kVectorBytes);
    stream(dst, a);
    stream(dst + kVectorBytes, b);
}

/// A piece that begins on a cache line of the destination.
QORI_INLINE void streamPiece(uint8_t* dst, const uint8_t* src) {
    for (ptrdiff_t at = 0; at < kStreamedPiece; at += kLine) streamLine(dst + at, src + at);
}

}  // namespace

void copyRowsStreaming(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                       int32_t rows) {
    for (; rows > 0; rows -= kStreamedTogether) {
        const int32_t together = std::min(rows, kStreamedTogether);
        ptrdiff_t done[kStreamedTogether];
        for (int32_t k = 0; k < together; ++k) {
            uint8_t* const to = dst + k * dstStep;
            done[k] = std::min(bytes, static_cast<ptrdiff_t>(-reinterpret_cast<uintptr_t>(to) & uintptr_t{kLine - 1}));
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
        for (int32_t k = 0; k < together; ++k) {
            uint8_t* const to = dst + k * dstStep;
            const uint8_t* const from = src + k * srcStep;
            for (; bytes - done[k] >= kLine; done[k] += kLine) streamLine(to + done[k], from + done[k]);
            copyRow(to + done[k], from + done[k], bytes - done[k]);
        }
        dst += kStreamedTogether * dstStep;
        src += kStreamedTogether * srcStep;
    }
}

}  // namespace qori::kernels
