// SPDX-License-Identifier: Apache-2.0
#include "stream_rows.h"

#include <algorithm>

#include "kernels/copy_rows.h"
#include "kernels/streamed_lines.h"

namespace qori::kernels {
namespace {

/// A cache line of the destination.
QORI_INLINE void streamLine(uint8_t* dst, const uint8_t* src) {
    const Bytes a = load(src), b = load(src + kVectorBytes);
    stream(dst, a);
    stream(dst + kVectorBytes, b);
}

/// A piece that begins on a cache line of the destination.
QORI_INLINE void streamPiece(uint8_t* dst, const uint8_t* src) {
    for (ptrdiff_t at = 0; at < kStreamedPiece; at += kCacheLine) streamLine(dst + at, src + at);
}

/// A row, which streams from `done` on to `end`.
struct StreamedRow {
    uint8_t* dst;
    const uint8_t* src;
    ptrdiff_t done, end;

    QORI_INLINE void begin(ptrdiff_t bytes) {
        const auto [head, lines] = StreamedLines::ofBytes(dst, bytes);
        done = lines == 0 ? bytes : head;
        end = done + lines;
        copyRow(dst, src, done);
    }
    QORI_INLINE bool streamPiece() {
        if (end - done < kStreamedPiece) return false;
        kernels::streamPiece(dst + done, src + done);
        done += kStreamedPiece;
        return true;
    }
    QORI_INLINE void finish(ptrdiff_t bytes) {
        for (; done < end; done += kCacheLine) streamLine(dst + done, src + done);
        copyRow(dst + done, src + done, bytes - done);
    }
};

}  // namespace

void copyRowsStreaming(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                       int32_t rows) {
    for (; rows > 0; rows -= kStreamedTogether) {
        const int32_t together = std::min(rows, kStreamedTogether);
        StreamedRow row[kStreamedTogether];
        for (int32_t k = 0; k < together; ++k, dst += dstStep, src += srcStep) {
            row[k] = {dst, src, 0, 0};
            row[k].begin(bytes);
        }
        for (bool isMore = true; isMore;) {
            isMore = false;
            for (int32_t k = 0; k < together; ++k) isMore |= row[k].streamPiece();
        }
        for (int32_t k = 0; k < together; ++k) row[k].finish(bytes);
    }
}

}  // namespace qori::kernels
