// SPDX-License-Identifier: Apache-2.0
// Tables with an entry for every value of an element: filling them, and looking up elements one by one. A load a pixel
// each for element and entry and a store bind these loops; vector gathers load the same.
#pragma once
#include "kernels/vector_math.h"

namespace qori::kernels {

/// The values of an integer element.
template <class T>
inline constexpr int32_t kLowestOf = std::is_signed_v<T> ? -(1 << (8 * sizeof(T) - 1)) : 0;
template <class T>
inline constexpr int32_t kHighestOf = kLowestOf<T> + (1 << 8 * sizeof(T)) - 1;

/// table[first .. end - 1] = value.
template <class T>
void fillEntries(T* table, int32_t first, int32_t end, T value) {
    const Vec<T> all = splat(value);
    int32_t i = first;
    for (; i <= end - Vec<T>::lanes; i += Vec<T>::lanes) store(table + i, all);
    if (i < end) storePartial(table + i, all, end - i);
}

/// table[i] = i for first <= i < end.
template <class T>
void fillIdentity(T* table, int32_t first, int32_t end) {
    constexpr int lanes = Vec<T>::lanes;
    T begin[lanes];
    for (int i = 0; i < lanes; ++i) begin[i] = static_cast<T>(first + i);
    Vec<T> entries = load(begin);
    int32_t i = first;
    for (; i <= end - lanes; i += lanes, entries = entries + splat(T{lanes})) store(table + i, entries);
    if (i < end) storePartial(table + i, entries, end - i);
}

/// dst[i] = table[src[i] & mask], of each channel by a table of its own. dst may be src.
template <int channels, int processed, class D, class S>
QORI_NOINLINE void lookUpRow(D* dst, const S* src, ptrdiff_t pixels, const D* const* tables, int32_t mask) {
    const D* table[processed];
    for (int c = 0; c < processed; ++c) table[c] = tables[c];
    for (; pixels > 0; --pixels, dst += channels, src += channels)
        for (int c = 0; c < processed; ++c) dst[c] = table[c][src[c] & mask];
}

/// Four at a time of one channel.
template <class D, class S>
QORI_NOINLINE void lookUpRow(D* dst, const S* src, ptrdiff_t pixels, const D* table, int32_t mask) {
    for (; pixels >= 4; pixels -= 4, dst += 4, src += 4)
        for (int i = 0; i < 4; ++i) dst[i] = table[src[i] & mask];
    for (; pixels > 0; --pixels) *dst++ = table[*src++ & mask];
}

/// Entries of three bytes. Each pixel but the last is written with the first byte of the next one, which follows.
template <class S>
QORI_NOINLINE void lookUpTriples(uint8_t* dst, const S* src, ptrdiff_t pixels, const uint8_t* table, int32_t mask) {
    const auto entry = [=](S v) { return table + 3 * ptrdiff_t{v & mask}; };
    for (; pixels > 1; --pixels, dst += 3) {
        const uint8_t* const from = entry(*src++);
        const uint32_t low = qori::detail::loadWord<uint16_t>(from), high = from[2];
        qori::detail::storeWord(dst, low | high << 16);
    }
    const uint8_t* const from = entry(*src);
    for (int i = 0; i < 3; ++i) dst[i] = from[i];
}

/// Three channels to four, of which `alphaAt` gets alpha or, where that is null, stays. Channel c goes to first[c].
template <class T>
QORI_NOINLINE void lookUpWithAlpha(T* dst, const T* src, ptrdiff_t pixels, const T* const* tables, int32_t mask,
                                   const int* channelAt, int alphaAt, const T* alpha) {
    const T *const first = tables[0], *const second = tables[1], *const third = tables[2];
    T* const to[3] = {dst + channelAt[0], dst + channelAt[1], dst + channelAt[2]};
    for (ptrdiff_t x = 0; x < pixels; ++x, src += 3) {
        to[0][4 * x] = first[src[0] & mask];
        to[1][4 * x] = second[src[1] & mask];
        to[2][4 * x] = third[src[2] & mask];
        if (alpha != nullptr) dst[4 * x + alphaAt] = *alpha;
    }
}

}  // namespace qori::kernels
