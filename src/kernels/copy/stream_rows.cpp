// SPDX-License-Identifier: Apache-2.0
#include "stream_rows.h"

#include "kernels/copy_rows.h"
#include "kernels/streamed_lines.h"

namespace qori::kernels {
namespace {

constexpr ptrdiff_t kPiece = 8 * kCacheLine;

/// A piece that begins on a cache line of the destination.
QORI_INLINE void streamPiece(uint8_t* dst, const uint8_t* src, ptrdiff_t ahead) {
    for (ptrdiff_t at = 0; at < kPiece; at += kCacheLine) {
        fetchLines<kCacheLine>(src + at, ahead);
        const Bytes a = load(src + at), b = load(src + at + kVectorBytes);
        stream(dst + at, a);
        stream(dst + at + kVectorBytes, b);
    }
}

void copyRowsApart(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                   int32_t rows) {
    const RowStores stores = storesOfRows(rows, srcStep, bytes);
    forStreamedPieces(
        rows, stores == RowStores::fetching ? streamedApart(dstStep) : 1, bytes,
        [=](int32_t y, ptrdiff_t begin) {
            const ptrdiff_t left = bytes - begin,
                            count = StreamedLines::ofBytes(dst + y * dstStep + begin, left).head + kPiece;
            return left - count < StreamedLines::fewestBytes ? left : count;
        },
        [=](int32_t y, ptrdiff_t begin, ptrdiff_t count) {
            uint8_t* const to = dst + y * dstStep + begin;
            const uint8_t* const from = src + y * srcStep + begin;
            if (count == kPiece && reinterpret_cast<uintptr_t>(to) % kCacheLine == 0)
                streamPiece(to, from, fetchedAhead(stores));
            else
                copyRowStreaming(to, from, count, stores);
        });
}

}  // namespace

void copyRowsStreaming(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                       int32_t rows) {
    if (rows == 1 || (dstStep == bytes && srcStep == bytes)) {
        constexpr ptrdiff_t row = kStreamedApart;
        const ptrdiff_t all = bytes * rows, done = all / row * row;
        copyRowsApart(dst, row, src, row, row, static_cast<int32_t>(all / row));
        copyRowStreaming(dst + done, src + done, all - done);
    } else if (dstStep >= bytes || dstStep <= -bytes) {
        copyRowsApart(dst, dstStep, src, srcStep, bytes, rows);
    } else {
        for (; rows > 0; --rows, dst += dstStep, src += srcStep) copyRowStreaming(dst, src, bytes);
    }
}

}  // namespace qori::kernels
