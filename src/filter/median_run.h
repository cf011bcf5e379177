// SPDX-License-Identifier: Apache-2.0
// Medians of rectangles over rows that exist: small masks by networks of their own, others by whatever is fastest.
#pragma once
#include "kernels/median/search.h"
#include "kernels/median/square5.h"
#include "kernels/median/windows.h"
#include "median_job.h"

namespace qori::filter {

/// Masks of 3 x 3, 5 x 5, and of one row or column of up to five, have networks of their own.
inline bool hasNetwork(QorImageSize mask) {
    const auto is = [=](int32_t width, int32_t height) { return mask.width == width && mask.height == height; };
    return is(3, 3) || is(5, 5) || is(3, 1) || is(5, 1) || is(1, 3) || is(1, 5);
}

inline QorResult oddMaskCheck(QorImageSize mask) {
    const bool odd = mask.width % 2 != 0 && mask.height % 2 != 0;
    return mask.width < 1 || mask.height < 1 || !odd ? QOR_ERR_MASK_SIZE : QOR_OK;
}

constexpr int kMostNetworkRows = 32;

/// Rows that the network of a mask makes at a time, at most. 5 x 5 puts four rows in order before the first.
inline int32_t networkRows(QorImageSize mask, int32_t mostOf5x5 = kMostNetworkRows) {
    return mask.width == 1 || mask.height == 1 ? 1 : mask.width == 3 ? 4 : mostOf5x5;
}

/// `rows` destination rows by the network of a mask. source(k): the first element of row k of the first window;
/// neighbours are `apart` elements away. Sources may not be destinations.
template <bool keepAlpha, class T, class Source>
void medianByNetwork(QorImageSize mask, Source source, T* const* dst, int32_t rows, ptrdiff_t elements,
                     ptrdiff_t apart) {
    const T* src[kMostNetworkRows + 4];
    if (mask.width == 1 || mask.height == 1) {
        const int n = mask.width * mask.height;
        for (int k = 0; k < n; ++k) src[k] = mask.width == 1 ? source(k) : source(0) + k * apart;
        const auto medianOfRows =
            n == 3 ? kernels::medianOfRows<3, keepAlpha, T> : kernels::medianOfRows<5, keepAlpha, T>;
        return medianOfRows(src, dst[0], elements);
    }
    for (int32_t k = 0; k < rows + mask.height - 1; ++k) src[k] = source(k);
    if (mask.width == 5) return kernels::medianSquare5<keepAlpha>(src, dst, rows, elements, apart);
    if (rows == 4) return kernels::medianSquare3<4, keepAlpha>(src, dst, elements, apart);
    for (int32_t k = 0; k < rows; ++k) kernels::medianSquare3<1, keepAlpha>(src + k, dst + k, elements, apart);
}

/// Any mask, with work memory from the allocator: QOR_ERR_NO_MEMORY and nothing done where there is none.
template <class T>
QorResult medianOfAny(const MedianJob<T>& job);

}  // namespace qori::filter
