// SPDX-License-Identifier: Apache-2.0
// Binary patterns straight from the image, some rows at a time: first the columns whose windows lie in what may be
// read, then of those rows together the `reach` columns beside each closed side, from copies of the columns that they
// see.
#pragma once
#include <algorithm>

#include "frame/border.h"
#include "kernels/lbp/tiles.h"

namespace qori::features {

/// A strip of an image at least kLeast pixels wide.
template <class T, class D, int reach>
class InPlacePatterns {
public:
    static constexpr int32_t kRows = kernels::kPatternBlock;
    static constexpr int32_t kLeast = 2 * kernels::kPatternBlock;
    /// As wide as a row of constants may be on the stack.
    static constexpr int32_t kStripPixels = 16384 / elementBytes<T>;

    InPlacePatterns(const kernels::PatternMakers<T, D>& makers, const BorderedImage& strip)
        : makers_(makers), strip_(strip) {
        const uint8_t* const constant = strip.rule.constant;
        if (constant == nullptr) return;
        __builtin_memcpy(&value_, constant, sizeof value_);
        if (!strip.rule.open.top || !strip.rule.open.bottom)
            for (int32_t x = 0; x < strip.size.width + 2 * reach; ++x) constants_[x] = value_;
    }

    void make(Image<D> dst, bool streaming) const {
        const Sides& open = strip_.rule.open;
        const int32_t width = strip_.size.width, begin = open.left ? 0 : reach,
                      end = open.right ? width : width - reach;
        for (int32_t y = 0; y < strip_.size.height; y += kRows) {
            const int32_t count = std::min(kRows, strip_.size.height - y);
            const T* rows[kRows + 2 * reach];
            for (int32_t i = 0; i < count + 2 * reach; ++i) rows[i] = seenRow(y - reach + i);
            makers_.rows(rows, dst.row(y), dst.step, count, begin, end, streaming);
            if (!open.left) makeColumns(rows, count, 0, dst, y);
            if (!open.right) makeColumns(rows, count, width - reach, dst, y);
        }
    }

private:
    using Key = kernels::PatternKey<T>;

    const T* seenRow(int32_t y) const {
        if (strip_.rule.constant != nullptr && strip_.isMissingRow(y)) return constants_ + reach;
        return reinterpret_cast<const T*>(strip_.pixel(0, strip_.seenRow(y)));
    }

    bool isMissingColumn(int32_t x) const {
        return x < 0 ? !strip_.rule.open.left : x >= strip_.size.width && !strip_.rule.open.right;
    }
    bool isConstant(int32_t x) const { return strip_.rule.constant != nullptr && isMissingColumn(x); }

    /// `reach` columns from x on, beside which the windows see as many on either side. Rows are taken one by one:
    /// column by column, the copies took half of the time of small images.
    void makeColumns(const T* const* rows, int32_t count, int32_t x, Image<D> dst, int32_t y) const {
        constexpr int32_t kColumns = 3 * reach;
        alignas(64) Key keys[kColumns][kRows + 2 * reach] = {};
        const Key* columns[kColumns];
        int32_t seen[kColumns];
        for (int32_t i = 0; i < kColumns; ++i) {
            columns[i] = keys[i] + reach;
            const int32_t at = x - reach + i;
            seen[i] = isConstant(at) ? x : isMissingColumn(at) ? strip_.seenColumn(at) : at;
        }
        for (int32_t j = 0; j < count + 2 * reach; ++j)
            for (int32_t i = 0; i < kColumns; ++i) keys[i][j] = kernels::patternKey(rows[j][seen[i]]);
        for (int32_t i = 0; i < kColumns; ++i)
            if (isConstant(x - reach + i)) std::fill_n(keys[i], count + 2 * reach, kernels::patternKey(value_));
        D codes[reach][kRows];
        makers_.columns(columns, codes);
        for (int32_t j = 0; j < count; ++j)
            for (int32_t i = 0; i < reach; ++i) dst.row(y + j)[x + i] = codes[i][j];
    }

    const kernels::PatternMakers<T, D>& makers_;
    const BorderedImage& strip_;
    T value_{};
    T constants_[kStripPixels + 2 * reach];
};

}  // namespace qori::features
