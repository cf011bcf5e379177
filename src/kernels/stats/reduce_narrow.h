// SPDX-License-Identifier: Apache-2.0
// Rows for reductions. To begin and to end a row costs as much as hundreds of its bytes, so that narrow rows are
// brought together first: their pixels follow each other in a buffer as they would in an image without padding, which
// leaves channels in their lanes and the order of the elements as it was.
#pragma once
#include <algorithm>
#include <utility>

#include "image/driver.h"
#include "kernels/simd.h"

namespace qori::kernels {

namespace detail {

/// Bytes up to which a row is worth a copy, and of rows brought together.
constexpr ptrdiff_t kNarrow = 160, kTogether = 4'096;
/// Fewer rows cost less than the wait until the buffer can be read.
constexpr int32_t kFewRows = 8;

struct Sixteen {
    uint64_t halves[2];
};

/// Copies rows that are as long as a chunk, or up to twice as long: two chunks each, which may overlap.
template <class Chunk>
QORI_INLINE void packByTwo(uint8_t* out, const uint8_t* src, ptrdiff_t step, int32_t rows, ptrdiff_t bytes) {
    const ptrdiff_t second = bytes - static_cast<ptrdiff_t>(sizeof(Chunk));
    for (int32_t y = 0; y < rows; ++y, src += step, out += bytes) {
        Chunk first, last;
        __builtin_memcpy(&first, src, sizeof first);
        __builtin_memcpy(&last, src + second, sizeof last);
        __builtin_memcpy(out, &first, sizeof first);
        __builtin_memcpy(out + second, &last, sizeof last);
    }
}

/// Copies rows, one behind the other.
QORI_NOINLINE inline void packRows(uint8_t* out, const uint8_t* src, ptrdiff_t step, int32_t rows, ptrdiff_t bytes) {
    if (bytes >= kVectorBytes) {
        for (int32_t y = 0; y < rows; ++y, src += step, out += bytes) {
            for (ptrdiff_t i = 0; i < bytes - kVectorBytes; i += kVectorBytes) store(out + i, load(src + i));
            store(out + bytes - kVectorBytes, load(src + bytes - kVectorBytes));
        }
    } else if (bytes >= 16) {
        packByTwo<Sixteen>(out, src, step, rows, bytes);
    } else if (bytes >= 8) {
        packByTwo<uint64_t>(out, src, step, rows, bytes);
    } else if (bytes >= 4) {
        packByTwo<uint32_t>(out, src, step, rows, bytes);
    } else if (bytes >= 2) {
        packByTwo<uint16_t>(out, src, step, rows, bytes);
    } else {
        packByTwo<uint8_t>(out, src, step, rows, bytes);
    }
}

/// What is done with rows brought together, one of each image; pieces are long enough for a call that is not direct.
using RowsTogether = void (*)(void* context, ptrdiff_t pixels, const uint8_t* const* rows);

/// Out of line, so that the buffers are on the stack only where they are used.
template <size_t images>
QORI_NOINLINE void forEachRowsTogether(QorImageSize roi, int pixelBytes, RowsTogether use, void* context,
                                       const Image<const uint8_t> (&image)[images]) {
    alignas(kVectorBytes) uint8_t together[images][kTogether];
    const uint8_t* rowsOf[images];
    for (size_t i = 0; i < images; ++i) rowsOf[i] = together[i];
    const ptrdiff_t bytes = ptrdiff_t{roi.width} * pixelBytes;
    const auto most = static_cast<int32_t>(kTogether / bytes);
    for (int32_t y = 0; y < roi.height;) {
        const int32_t rows = std::min(most, roi.height - y);
        for (size_t i = 0; i < images; ++i) packRows(together[i], image[i].row(y), image[i].step, rows, bytes);
        use(context, ptrdiff_t{rows} * roi.width, rowsOf);
        y += rows;
    }
}

template <class T>
Image<const uint8_t> bytesOf(Image<const T> image) {
    return {asBytes(image.data), image.step};
}

template <class Row, class T, size_t... i>
QORI_INLINE void reduceRowsTogether(QorImageSize roi, int pixelBytes, Row& row,
                                    const Image<const uint8_t> (&images)[sizeof...(i)], std::index_sequence<i...>) {
    const auto use = [](void* context, ptrdiff_t pixels, const uint8_t* const* rows) {
        (*static_cast<Row*>(context))(pixels, reinterpret_cast<const T*>(rows[i])...);
    };
    forEachRowsTogether(roi, pixelBytes, use, &row, images);
}

}  // namespace detail

/// As forEachRow, for rows that are only read: row(pixels, rows...) may be handed several rows as one.
template <class Row, class T, class... More>
QORI_INLINE void forEachRowToReduce(QorImageSize roi, int channels, Row row, Image<const T> first, More... more) {
    const int pixelBytes = channels * static_cast<int>(sizeof(T));
    if (roi.height >= detail::kFewRows && int64_t{roi.width} * pixelBytes <= detail::kNarrow &&
        !isOneRun(roi, walk(first, channels), walk(more, channels)...)) {
        const Image<const uint8_t> images[] = {detail::bytesOf(first), detail::bytesOf(more)...};
        return detail::reduceRowsTogether<Row, T>(roi, pixelBytes, row, images,
                                                  std::make_index_sequence<1 + sizeof...(More)>());
    }
    forEachRow(roi, row, walk(first, channels), walk(more, channels)...);
}

}  // namespace qori::kernels
