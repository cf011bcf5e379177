// SPDX-License-Identifier: Apache-2.0
// Local binary patterns: of eight neighbours and of floats straight from the image. For others, and for narrow images,
// strips of columns go from top to bottom over a ring of rows of keys, which have whatever the windows see beyond the
// region, so that kernels know no borders.
#include "frame/border.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/plan.h"
#include "frame/streaming.h"
#include "lbp_in_place.h"

namespace qori::features {
namespace {

/// Bytes of a strip's row of keys: five of them and a row of constants stay in the first-level cache, and on the stack.
constexpr int32_t kStripBytes = 4096;

/// The rows of keys that windows of one strip see. A row enters while codes are made of those before it: what has just
/// been stored cannot be loaded at other alignments until it has reached the cache.
template <class T, int reach>
class KeyRows {
public:
    using Key = kernels::PatternKey<T>;
    static constexpr int32_t kRows = 2 * reach + 1;

    explicit KeyRows(const BorderedImage& strip)
        : strip_(strip), next_(strip.rule.open.top ? -reach : 0), end_(strip.size.height) {
        if (strip.rule.open.bottom) end_ += reach;
        if (strip.rule.constant != nullptr) {
            constantKey_ = keyAt(strip.rule.constant);
            if (!strip.rule.open.top || !strip.rule.open.bottom)
                for (int32_t x = -reach; x < strip.size.width + reach; ++x) constant_[kAhead + x] = constantKey_;
        }
        while (next_ <= reach && next_ < end_) {
            kernels::patternKeys(pixels(next_), slot(next_), ptrdiff_t{strip_.size.width});
            endRow();
        }
    }

    /// Points at the first pixel of the rows that windows of row y see. Rows are asked for from the top, each once.
    void rowsAround(int32_t y, const Key** rows) {
        if (y >= reach && y + reach < strip_.size.height) {
            for (int32_t i = 0; i < kRows; ++i) rows[i] = slot(y - reach + i);
            return;
        }
        for (int32_t i = 0; i < kRows; ++i) {
            const int32_t row = y - reach + i;
            const bool isConstant = strip_.rule.constant != nullptr && strip_.isMissingRow(row);
            rows[i] = isConstant ? constant_ + kAhead : slot(strip_.seenRow(row));
        }
    }

    /// The row whose whole blocks enter while codes of a row are made; when there is none, the last one enters a free
    /// slot.
    kernels::PatternRowAhead<T> ahead() {
        const bool isMore = next_ + 1 < end_;
        return {pixels(std::min(next_, end_ - 1)), slot(next_), isMore ? strip_.step : 0};
    }

    /// The rest of that row enters.
    void enterRest() {
        if (next_ >= end_) return;
        const int32_t whole = strip_.size.width / kernels::kPatternBlock * kernels::kPatternBlock;
        kernels::patternKeys(pixels(next_) + whole, slot(next_) + whole, ptrdiff_t{strip_.size.width} - whole);
        endRow();
    }

private:
    /// Keys in front of a row's first pixel, which so begins on a vector, and behind its last block.
    static constexpr int32_t kAhead = 32;
    static constexpr int32_t kRowKeys = kStripBytes / elementBytes<Key> + 3 * kAhead;
    static constexpr uint32_t kSlots = reach == 1 ? 4 : 8;
    static_assert(kSlots > kRows);

    static Key keyAt(const uint8_t* pixel) {
        T value;
        __builtin_memcpy(&value, pixel, sizeof value);
        return kernels::patternKey(value);
    }

    const T* pixels(int32_t y) const { return reinterpret_cast<const T*>(strip_.pixel(0, y)); }
    Key* slot(int32_t y) { return ring_[static_cast<uint32_t>(y) % kSlots] + kAhead; }

    /// What windows see to both sides of the row that has entered. Open sides come first: narrow images mirror them.
    void endRow() {
        const Sides& open = strip_.rule.open;
        const int32_t width = strip_.size.width;
        Key* const keys = slot(next_);
        const auto synthesised = [&](int32_t x) {
            return strip_.rule.constant != nullptr ? constantKey_ : keys[strip_.seenColumn(x)];
        };
        for (int32_t i = 0; i < reach; ++i) {
            if (open.left) keys[-1 - i] = keyAt(strip_.pixel(-1 - i, next_));
            if (open.right) keys[width + i] = keyAt(strip_.pixel(width + i, next_));
        }
        for (int32_t i = 0; i < reach; ++i) {
            if (!open.left) keys[-1 - i] = synthesised(-1 - i);
            if (!open.right) keys[width + i] = synthesised(width + i);
        }
        ++next_;
    }

    const BorderedImage& strip_;
    int32_t next_, end_;  ///< The row that enters next, and that behind the last.
    Key constantKey_{};
    alignas(64) Key ring_[kSlots][kRowKeys];
    alignas(64) Key constant_[kRowKeys];
};

/// Strips of equal widths, whole vectors but for the last: makeStrip(strip, its destination).
template <class D, class MakeStrip>
void makeStrips(const BorderedImage& image, Image<D> dst, int32_t most, MakeStrip makeStrip) {
    const int32_t strips = (image.size.width - 1) / most + 1;
    const auto width = static_cast<int32_t>(
        roundUp((int64_t{image.size.width} + strips - 1) / strips, int32_t{kernels::kPatternBlock}));
    for (int64_t x = 0; x < image.size.width; x += width) {
        BorderedImage strip = image;
        strip.origin = image.pixel(static_cast<int32_t>(x), 0);
        strip.size.width = static_cast<int32_t>(std::min(int64_t{width}, image.size.width - x));
        strip.rule.open.left |= x > 0;
        strip.rule.open.right |= x + strip.size.width < image.size.width;
        makeStrip(strip, Image<D>{advance(dst.data, static_cast<ptrdiff_t>(x) * elementBytes<D>), dst.step});
    }
}

/// A kernel that makes a row from the rows of keys around it.
template <class T, class D>
using RowMaker = void (*)(const kernels::PatternKey<T>* const* rows, D* row, ptrdiff_t width,
                          const kernels::PatternRowAhead<T>& ahead);

template <class T, int reach, class D>
void makeFromKeys(const BorderedImage& image, Image<D> dst, RowMaker<T, D> makeRow) {
    makeStrips(image, dst, kStripBytes / elementBytes<T>, [&](const BorderedImage& strip, Image<D> to) {
        KeyRows<T, reach> keys(strip);
        for (int32_t y = 0; y < strip.size.height; ++y) {
            const kernels::PatternKey<T>* rows[2 * reach + 1];
            keys.rowsAround(y, rows);
            makeRow(rows, to.row(y), ptrdiff_t{strip.size.width}, keys.ahead());
            keys.enterRest();
        }
    });
}

/// make(image, destination, streaming). What streams lies on multiples of so many bytes.
template <uintptr_t alignment, class T, class D, class Make>
QorResult lbp(Image<const T> src, Image<D> dst, QorImageSize roi, int32_t borderType, T value, Make make) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const BorderedImage image{asBytes(src.data), src.step, roi, elementBytes<T>,
                              BorderRule::withMirror(Border::of(borderType), &value)};
    const uintptr_t first = reinterpret_cast<uintptr_t>(dst.data), step = static_cast<uintptr_t>(dst.step);
    const bool mayStream = step % kVectorBytes == 0 && first % alignment == 0;
    return underControlOf<T>([&] {
        const bool streaming =
            mayStream && streams(streamRules::patterns, wholeTraffic(roi, elementBytes<T> + elementBytes<D>));
        make(image, dst, streaming);
        if (streaming) streamFence();
        return QOR_OK;
    });
}

template <class T, class D, int reach>
void makeImage(const kernels::PatternMakers<T, D>& makers, RowMaker<T, D> makeNarrowRow, const BorderedImage& image,
               Image<D> dst, bool streaming) {
    using InPlace = InPlacePatterns<T, D, reach>;
    if (image.size.width < InPlace::kLeast) return makeFromKeys<T, reach, D>(image, dst, makeNarrowRow);
    makeStrips(image, dst, InPlace::kStripPixels,
               [&](const BorderedImage& strip, Image<D> part) { InPlace(makers, strip).make(part, streaming); });
}

/// Images too narrow to be made in place do not stream either.
template <int mode, int reach, class T, class D>
QorResult lbpOfMode(Image<const T> src, Image<D> dst, QorImageSize roi, int32_t borderType, T value) {
    constexpr auto makeRow = kernels::patternRow<D, reach, mode, false, T>;
    if constexpr (std::is_floating_point_v<T> || sizeof(D) == 1) {
        // Measured: floats that lie otherwise gain nothing.
        constexpr uintptr_t alignment = std::is_floating_point_v<T> ? kVectorBytes : 1;
        return lbp<alignment>(
            src, dst, roi, borderType, value, [](const BorderedImage& image, Image<D> to, bool streaming) {
                makeImage<T, D, reach>(kernels::patternMakers<reach, mode, T, D>, makeRow, image, to, streaming);
            });
    } else {
        return lbp<kVectorBytes>(src, dst, roi, borderType, value,
                                 [](const BorderedImage& image, Image<D> to, bool streaming) {
                                     makeFromKeys<T, reach, D>(
                                         image, to, streaming ? kernels::patternRow<D, reach, mode, true, T> : makeRow);
                                 });
    }
}

template <int reach, class T, class D>
QorResult lbpImage(Image<const T> src, Image<D> dst, QorImageSize roi, uint8_t mode, int32_t borderType, T value) {
    switch (mode % 4) {
        case 0: return lbpOfMode<0, reach>(src, dst, roi, borderType, value);
        case 1: return lbpOfMode<1, reach>(src, dst, roi, borderType, value);
        case 2: return lbpOfMode<2, reach>(src, dst, roi, borderType, value);
        default: return lbpOfMode<3, reach>(src, dst, roi, borderType, value);
    }
}

template <bool streaming, class T>
void makeCorrectedRow(const kernels::PatternKey<T>* const* rows, uint8_t* row, ptrdiff_t width,
                      const kernels::PatternRowAhead<T>& ahead) {
    using Key = kernels::PatternKey<T>;
    constexpr ptrdiff_t kAhead = 16;
    alignas(64) Wider<Key> sums[kStripBytes / elementBytes<Key> + 4 * kAhead];
    kernels::patternColumnSums(rows, sums + kAhead, width);
    kernels::correctedPatternRow<streaming>(rows, sums + kAhead, row, width, ahead);
}

template <class T>
QorResult lbpImageHorizCorr(Image<const T> src, Image<uint8_t> dst, QorImageSize roi, int32_t borderType, T value) {
    return lbp<kVectorBytes>(
        src, dst, roi, borderType, value, [](const BorderedImage& image, Image<uint8_t> to, bool streaming) {
            const auto makeRow = streaming ? makeCorrectedRow<true, T> : makeCorrectedRow<false, T>;
            makeFromKeys<T, 1, uint8_t>(image, to, makeRow);
        });
}

}  // namespace
}  // namespace qori::features

#include "entries/lbp.inc"
