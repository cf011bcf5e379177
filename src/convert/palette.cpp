// SPDX-License-Identifier: Apache-2.0
// Palettes: tables indexed by the low bits of an element.
#include "byte_tables.h"
#include "frame/checks.h"
#include "kernels/lut/table_rows.h"

namespace qori::convert {
namespace {

QorResult bitsCheck(int32_t nBitSize, int elementBits) {
    return nBitSize < 1 || nBitSize > elementBits ? QOR_ERR_OUT_OF_RANGE : QOR_OK;
}

template <class T>
QorResult rowStepCheck(Image<T> image, QorImageSize roi, int pixelBytes) {
    return image.step < int64_t{roi.width} * pixelBytes ? QOR_ERR_STEP : QOR_OK;
}

/// Pixels of so many bytes; `count` table pointers, 0 for a table by itself.
template <class S, class D, class Table>
QorResult check(Image<const S> src, int srcBytes, Image<D> dst, int dstBytes, QorImageSize roi, const Table* table,
                int count, int32_t nBitSize) {
    if (QorResult r = firstOf(nullCheck(src, dst, table), sizeCheck(roi))) return r;
    if constexpr (std::is_pointer_v<Table>)
        for (int c = 0; c < count; ++c)
            if (QorResult r = nullCheck(table[c])) return r;
    return firstOf(bitsCheck(nBitSize, 8 * elementBytes<S>), rowStepCheck(src, roi, srcBytes),
                   rowStepCheck(dst, roi, dstBytes));
}

constexpr int32_t maskOf(int32_t nBitSize) { return (1 << nBitSize) - 1; }

/// The first 2^bits entries, repeated.
void repeatEntries(uint8_t* to, int entries, const uint8_t* table, int32_t nBitSize) {
    kernels::copyRow(to, table, 1 << nBitSize);
    for (int i = 1 << nBitSize; i < entries; i *= 2) kernels::copyRow(to + i, to, i);
}

template <int rows>
void mapBytes(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, const uint8_t* table, int32_t nBitSize) {
    uint8_t entries[16 * rows];
    repeatEntries(entries, 16 * rows, table, nBitSize);
    kernels::mapImage(roi, 1, kernels::ByteLookup<rows>(entries), false, dst, src);
}

/// One channel, of any two sizes.
template <class S, class D>
QorResult palette(Image<const S> src, Image<D> dst, QorImageSize roi, const D* table, int32_t nBitSize) {
    if (QorResult r = check(src, elementBytes<S>, dst, elementBytes<D>, roi, table, 0, nBitSize)) return r;
    if constexpr (sizeof(S) + sizeof(D) == 2) {
        (nBitSize <= 4 ? mapBytes<1> : nBitSize <= 7 ? mapBytes<8> : mapBytes<16>)(src, dst, roi, table, nBitSize);
    } else {
        forEachRow(
            roi, [=](ptrdiff_t pixels, D* d, const S* s) { kernels::lookUpRow(d, s, pixels, table, maskOf(nBitSize)); },
            walk(dst, 1), walk(src, 1));
    }
    return QOR_OK;
}

/// Entries of three bytes.
template <class S>
QorResult paletteTriples(Image<const S> src, Image<uint8_t> dst, QorImageSize roi, const uint8_t* table,
                         int32_t nBitSize) {
    if (QorResult r = check(src, elementBytes<S>, dst, 3, roi, table, 0, nBitSize)) return r;
    forEachRow(
        roi,
        [=](ptrdiff_t pixels, uint8_t* d, const S* s) {
            kernels::lookUpTriples(d, s, pixels, table, maskOf(nBitSize));
        },
        walk(dst, 3), walk(src, 1));
    return QOR_OK;
}

/// A table per processed channel.
template <class T, Layout layout>
QorResult palettes(Image<const T> src, Image<T> dst, QorImageSize roi, const T* const* tables, int32_t nBitSize) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    constexpr int pixelBytes = n * elementBytes<T>;
    if (QorResult r = check(src, pixelBytes, dst, pixelBytes, roi, tables, processed, nBitSize)) return r;
    if constexpr (sizeof(T) == 1) {
        uint8_t entries[processed][256];
        for (int c = 0; c < processed; ++c) repeatEntries(entries[c], 256, tables[c], nBitSize);
        applyByteTables<layout>(roi, src, dst, entries);
    } else {
        forEachRow(
            roi,
            [=](ptrdiff_t pixels, T* d, const T* s) {
                kernels::lookUpRow<n, processed, T, T>(d, s, pixels, tables, maskOf(nBitSize));
            },
            walk(dst, n), walk(src, n));
    }
    return QOR_OK;
}

/// Three channels to four. reversed: the last channel first and alpha last; else alpha first.
template <class T, bool reversed>
QorResult paletteWithAlpha(Image<const T> src, int32_t alphaValue, Image<T> dst, QorImageSize roi,
                           const T* const* tables, int32_t nBitSize) {
    if (QorResult r = check(src, 3 * elementBytes<T>, dst, 4 * elementBytes<T>, roi, tables, 3, nBitSize)) return r;
    const bool writesAlpha = alphaValue >= 0 && alphaValue <= static_cast<T>(~T{0});
    const auto alpha = static_cast<T>(alphaValue);
    constexpr int alphaAt = reversed ? 3 : 0;
    if constexpr (sizeof(T) == 1) {
        kernels::ByteLookup<16> lookups[3];
        for (int c = 0; c < 3; ++c) {
            uint8_t entries[256];
            repeatEntries(entries, 256, tables[c], nBitSize);
            lookups[c] = kernels::ByteLookup<16>(entries);
        }
        constexpr int none = kernels::kAlphaPlane;
        const kernels::PixelOrder order{{reversed ? 2 : none, reversed ? 1 : 0, reversed ? 0 : 1, reversed ? none : 2},
                                        writesAlpha ? -1 : alphaAt};
        kernels::mapByPlanes<3, 4, T>(roi, 3, src, dst, order, alpha, [&](int c, uint8_t* plane, int pixels) {
            kernels::lookUpBlock(plane, pixels, lookups[c]);
        });
    } else {
        constexpr int channelAt[3] = {reversed ? 2 : 1, reversed ? 1 : 2, reversed ? 0 : 3};
        forEachRow(
            roi,
            [&](ptrdiff_t pixels, T* d, const T* s) {
                kernels::lookUpWithAlpha(d, s, pixels, tables, maskOf(nBitSize), channelAt, alphaAt,
                                         writesAlpha ? &alpha : nullptr);
            },
            walk(dst, 4), walk(src, 3));
    }
    return QOR_OK;
}

}  // namespace
}  // namespace qori::convert

#include "entries/palette.inc"
