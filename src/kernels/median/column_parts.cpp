// SPDX-License-Identifier: Apache-2.0
#include "column_parts.h"

namespace qori::kernels {
namespace {

struct Steps {
    alignas(kVectorBytes) uint8_t from[32][32];  ///< from[k]: -1 (as a byte) in bins k and beyond, 0 before.
};
constexpr Steps stepsTable() {
    Steps steps{};
    for (int k = 0; k < 32; ++k)
        for (int i = k; i < 32; ++i) steps.from[k][i] = 255;
    return steps;
}
alignas(64) constexpr Steps kSteps = stepsTable();

/// ones + kVectorBytes - n: a vector whose first n bytes are set.
struct Firsts {
    uint8_t ones[2 * kVectorBytes];
};
constexpr Firsts firstsTable() {
    Firsts firsts{};
    for (int i = 0; i < kVectorBytes; ++i) firsts.ones[i] = 255;
    return firsts;
}
constexpr Firsts kFirsts = firstsTable();

QORI_INLINE __m256i block(const uint8_t* p) { return _mm256_load_si256(reinterpret_cast<const __m256i*>(p)); }
QORI_INLINE void storeBlock(uint8_t* p, __m256i v) { _mm256_store_si256(reinterpret_cast<__m256i*>(p), v); }
QORI_INLINE __m256i stepsFrom(unsigned low) { return block(kSteps.from[0] + low); }

/// Bytes whose order as signed ones is that of the unsigned ones.
QORI_INLINE __m256i ordered(__m256i bytes) { return _mm256_xor_si256(bytes, _mm256_set1_epi8(-128)); }
QORI_INLINE __m256i firstOf(int part) { return _mm256_set1_epi8(static_cast<char>((16 * part) ^ 128)); }

/// Bytes as words, times a power of two.
QORI_INLINE void storeWords(uint16_t* p, Bytes bytes, int shift) {
    const __m256i low = _mm256_cvtepu8_epi16(_mm256_castsi256_si128(bytes.v)),
                  high = _mm256_cvtepu8_epi16(_mm256_extracti128_si256(bytes.v, 1));
    store(p, Vec<uint16_t>{_mm256_slli_epi16(low, shift)});
    store(p + 16, Vec<uint16_t>{_mm256_slli_epi16(high, shift)});
}

}  // namespace

/// What stands behind the last column becomes counts that are in no window.
void ColumnParts::split(const uint8_t* row, ptrdiff_t apart, Entries to) const {
    const Bytes half{_mm256_set1_epi8(kBins / 2)}, halfLess{_mm256_set1_epi8(kBins / 2 - 1)};
    const Bytes highBits{_mm256_set1_epi8(static_cast<char>(0xF0))}, lowBits{_mm256_set1_epi8(kBins - 1)};
    const auto put = [&](ptrdiff_t x, Bytes v) __attribute__((always_inline)) {
        const Bytes part = Bytes{_mm256_avg_epu8(v.v, halfLess.v)} & highBits;
        store(to.part + x, part);
        storeWords(to.counts + x, part, 1);
        storeWords(to.steps + x, Bytes{_mm256_add_epi8(v.v, half.v)} & lowBits, 5);
    };
    if (apart == 1) {
        ptrdiff_t x = 0;
        for (; x <= columns_ - kVectorBytes; x += kVectorBytes) put(x, load(row + x));
        if (x < columns_) put(x, loadPartial(row + x, columns_ - x));
    } else {
        for (int32_t x = 0; x < columns_; ++x) to.part[x] = row[x * apart];
        for (ptrdiff_t x = 0; x < columns_; x += kVectorBytes) put(x, load(to.part + x));
    }
}

void ColumnParts::begin(const ByteRows& rows, int32_t y, int32_t columns, QorImageSize window) {
    columns_ = columns;
    padded_ = static_cast<ptrdiff_t>(paddedOf(columns));
    width_ = window.width;
    height_ = window.height;
    step_ = rows.step;
    within_ = memory_;
    beneath_ = within_ + padded_ * kApart;
    uint8_t* const entries = beneath_ + padded_ * kParts;
    const auto entriesAt = [&](uint8_t* p) {
        return Entries{p, reinterpret_cast<uint16_t*>(p + padded_), reinterpret_cast<uint16_t*>(p + 3 * padded_)};
    };
    in_ = entriesAt(entries);
    out_ = entriesAt(entries + kEntryBytes * padded_);
    __builtin_memset(memory_, 0, static_cast<size_t>(bytes(columns)));
    for (int32_t k = 0; k < window.height; ++k) enter(rows.row(ptrdiff_t{y} + k), rows.apart);
}

void ColumnParts::enter(const uint8_t* row, ptrdiff_t apart) {
    split(row, apart, in_);
    for (ptrdiff_t x = 0; x < columns_; x += kVectorBytes) {
        const __m256i in = ordered(load(in_.part + x).v);
        for (int part = 1; part < kParts; ++part) {
            uint8_t* const p = beneath(part) + x;
            store(p, Bytes{_mm256_sub_epi8(load(p).v, _mm256_cmpgt_epi8(firstOf(part), in))});
        }
    }
    for (ptrdiff_t x = 0; x < columns_; ++x) {
        uint8_t* const p = within_ + x * kApart + in_.counts[x];
        storeBlock(p, _mm256_sub_epi8(block(p), stepsFrom(in_.steps[x])));
    }
}

void ColumnParts::advance(const uint8_t* entering, const uint8_t* leaving, ptrdiff_t apart) {
    // The next row is far from this one, where no prefetcher looks for it.
    for (ptrdiff_t x = 0; x < columns_ * apart; x += 64) __builtin_prefetch(entering + (step_ + x));
    split(entering, apart, in_);
    split(leaving, apart, out_);
    for (ptrdiff_t x = 0; x < columns_; x += kVectorBytes) {
        const __m256i in = ordered(load(in_.part + x).v), out = ordered(load(out_.part + x).v);
        uint8_t* p = beneath_ + x;
#pragma GCC unroll 8
        for (int part = 1; part < kParts; ++part) {
            p += padded_;
            const __m256i first = firstOf(part);
            const __m256i change = _mm256_sub_epi8(_mm256_cmpgt_epi8(first, out), _mm256_cmpgt_epi8(first, in));
            store(p, Bytes{_mm256_add_epi8(load(p).v, change)});
        }
    }
    // What is stored are bytes, which may be anything.
    const Entries in = in_, out = out_;
    uint8_t* column = within_;
    const ptrdiff_t columns = columns_;
#pragma GCC unroll 4
    for (ptrdiff_t x = 0; x < columns; ++x, column += kApart) {
        uint8_t *const p = column + in.counts[x], *const q = column + out.counts[x];
        storeBlock(p, _mm256_sub_epi8(block(p), stepsFrom(in.steps[x])));
        storeBlock(q, _mm256_add_epi8(block(q), stepsFrom(out.steps[x])));
    }
}

/// How many elements of the window at x are below a part.
int32_t ColumnParts::before(int part, int32_t x) const {
    const uint8_t* p = beneath(part) + x;
    const __m256i zeros = _mm256_setzero_si256();
    __m256i sums = zeros;
    int32_t left = width_;
    for (; left > kVectorBytes; left -= kVectorBytes, p += kVectorBytes)
        sums = _mm256_add_epi64(sums, _mm256_sad_epu8(load(p).v, zeros));
    const Bytes rest = load(p) & load(kFirsts.ones + kVectorBytes - left);
    sums = _mm256_add_epi64(sums, _mm256_sad_epu8(rest.v, zeros));
    const __m128i two = _mm_add_epi32(_mm256_castsi256_si128(sums), _mm256_extracti128_si256(sums, 1));
    return _mm_cvtsi128_si32(_mm_add_epi32(two, _mm_unpackhi_epi64(two, two)));
}

/// The part of the median of the window at x.
int ColumnParts::partOf(int32_t x, int32_t below) const {
    int part = 0;
    for (int half = 8; half > 0; half /= 2)
        if (part + half < kParts && before(part + half, x) <= below) part += half;
    return part;
}

/// Columns are tall where differences of their counts do not fit signed bytes. Sums of theirs begin with this, so that
/// signed comparisons are right for all words.
template <bool isTall>
constexpr int16_t kBias = isTall ? INT16_MIN : 0;

/// Adds counts of columns, or differences of two as signed ones.
template <bool isSigned>
QORI_INLINE void add(PartSums& sums, __m256i counts) {
    const __m256i zeros = _mm256_setzero_si256(), above = isSigned ? _mm256_cmpgt_epi8(zeros, counts) : zeros;
    sums.low = _mm256_add_epi16(sums.low, _mm256_unpacklo_epi8(counts, above));
    sums.high = _mm256_add_epi16(sums.high, _mm256_unpackhi_epi8(counts, above));
}

template <bool isTall>
QORI_INLINE PartSums ColumnParts::summedUp(int32_t x, int part) const {
    const uint8_t* p = within(part, x);
    const uint8_t* const end = p + ptrdiff_t{width_} * kApart;
    const __m256i none = _mm256_set1_epi16(kBias<isTall>);
    PartSums sums{none, none};
    if (isTall || width_ % 2 != 0) {
        add<false>(sums, block(p));
        p += kApart;
    }
    if constexpr (isTall) {
        for (; p != end; p += kApart) add<false>(sums, block(p));
    } else {
        for (; p != end; p += 2 * kApart) add<false>(sums, _mm256_add_epi8(block(p), block(p + kApart)));
    }
    return sums;
}

/// Counts of a window become those of the next.
template <bool isTall>
QORI_INLINE void move(PartSums& sums, const uint8_t* leaving, const uint8_t* entering) {
    if constexpr (isTall) {
        add<false>(sums, block(entering));
        PartSums less{_mm256_setzero_si256(), _mm256_setzero_si256()};
        add<false>(less, block(leaving));
        sums = {_mm256_sub_epi16(sums.low, less.low), _mm256_sub_epi16(sums.high, less.high)};
    } else {
        add<true>(sums, _mm256_sub_epi8(block(entering), block(leaving)));
    }
}

/// PartSums of lanes 0 to 7 and 16 to 23 are in low, the others in high.
QORI_INLINE void storeInOrder(uint16_t* p, const PartSums& sums) {
    store(p, Vec<uint16_t>{_mm256_permute2x128_si256(sums.low, sums.high, 0x20)});
    store(p + 16, Vec<uint16_t>{_mm256_permute2x128_si256(sums.low, sums.high, 0x31)});
}

/// All of a part's elements.
template <bool isTall>
QORI_INLINE int32_t lastOf(const PartSums& sums) {
    return (_mm_extract_epi16(_mm256_extracti128_si256(sums.high, 1), 7) - kBias<isTall>)&0xFFFF;
}

/// The counts within another part: those of the one left before where they are not much out of date.
template <bool isTall>
QORI_INLINE PartSums ColumnParts::countsOf(const Window& left, int32_t x, int part) const {
    if (left.part != part || 2 * (x - left.x) > width_) return summedUp<isTall>(x, part);
    PartSums counts = left.counts;
    const ptrdiff_t across = ptrdiff_t{width_} * kApart;
    for (const uint8_t *p = within(part, left.x), *const end = within(part, x); p != end; p += kApart)
        move<isTall>(counts, p, p + across);
    return counts;
}

/// Takes the median's part to be the next one up or down, unless it is farther away.
template <bool isTall>
QORI_NOINLINE void ColumnParts::leave(Window& now, Window& left, int32_t below) const {
    const bool isAbove = now.rest >= 0;
    Window next = now;
    next.part += isAbove ? 1 : -1;
    next.counts = countsOf<isTall>(left, now.x, next.part);
    const int32_t all = lastOf<isTall>(next.counts);
    next.rest += isAbove ? -lastOf<isTall>(now.counts) : all;
    if (next.rest < 0 || next.rest >= all) {
        next.part = partOf(now.x, below);
        next.counts = countsOf<isTall>(left, now.x, next.part);
        next.rest = below - before(next.part, now.x);
    }
    left = now;
    now = next;
}

template <bool isTall, bool wantsRests>
void ColumnParts::follow(int32_t below, uint8_t* to, uint16_t* rests) const {
    const int32_t last = columns_ - width_;
    const ptrdiff_t across = ptrdiff_t{width_} * kApart;
    Window left{{}, 0, -1, 0}, now = left;
    now.part = first_;
    now.counts = summedUp<isTall>(0, now.part);
    now.rest = below - before(now.part, 0);
    for (;;) {
        // In this part for as long as the median is.
        const uint8_t *leaving = within(now.part, now.x), *const beneathLeaving = beneath(now.part),
                      *const beneathEntering = beneathLeaving + width_;
        const int base = kBins * now.part - kBins / 2;
        PartSums counts = now.counts;
        int32_t rest = now.rest, x = now.x;
#pragma GCC unroll 4
        for (; x <= last; ++x) {
            const __m256i ranks = _mm256_set1_epi16(static_cast<int16_t>(rest + kBias<isTall>));
            const __m256i low = _mm256_cmpgt_epi16(counts.low, ranks), high = _mm256_cmpgt_epi16(counts.high, ranks);
            const auto bits = static_cast<unsigned>(_mm256_movemask_epi8(_mm256_packs_epi16(low, high)));
            if (rest < 0 || bits == 0) break;
            const int bin = __builtin_ctz(bits);
            to[x] = static_cast<uint8_t>(base + bin);
            if constexpr (wantsRests) {
                alignas(kVectorBytes) uint16_t stored[kBins + 1];
                stored[0] = static_cast<uint16_t>(kBias<isTall>);
                storeInOrder(stored + 1, counts);
                rests[x] = static_cast<uint16_t>(rest + kBias<isTall> - stored[bin]);
            }
            rest += beneathLeaving[x] - beneathEntering[x];
            move<isTall>(counts, leaving, leaving + across);
            leaving += kApart;
        }
        if (x > last) return;
        now = {counts, x, now.part, rest};
        leave<isTall>(now, left, below);
        if (x == 0) first_ = now.part;
    }
}

void ColumnParts::medians(int32_t below, uint8_t* to, uint16_t* rests) const {
    constexpr int32_t kMostSigned = 127;
    if (height_ > kMostSigned || width_ * height_ > INT16_MAX)
        rests == nullptr ? follow<true, false>(below, to, rests) : follow<true, true>(below, to, rests);
    else
        rests == nullptr ? follow<false, false>(below, to, rests) : follow<false, true>(below, to, rests);
}

}  // namespace qori::kernels
