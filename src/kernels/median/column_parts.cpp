// SPDX-License-Identifier: Apache-2.0
#include "column_parts.h"

#include "lanes.h"

namespace qori::kernels {
namespace {

using namespace lanes;

/// -1 in places beyond.
QORI_INLINE __m256i beyond(const uint8_t* place, __m256i n) {
    return _mm256_cmpgt_epi8(n, _mm256_set1_epi8(static_cast<char>(*place)));
}

}  // namespace

/// v + kBefore is 32 a + b, 31 a + (a + b).
QORI_INLINE ColumnParts::Entry ColumnParts::split(__m256i v) {
    const __m256i high = _mm256_and_si256(_mm256_srli_epi16(_mm256_avg_epu8(v, bytesOf(kBefore - 1)), 4), bytesOf(15));
    const __m256i low = _mm256_and_si256(_mm256_add_epi8(v, bytesOf(kBefore)), bytesOf(31));
    const __m256i sum = _mm256_add_epi8(high, low);
    const __m256i more = _mm256_cmpgt_epi8(sum, bytesOf(kValues - 1));
    const __m256i part = _mm256_sub_epi8(high, more);
    return {part, _mm256_sub_epi8(sum, _mm256_and_si256(more, bytesOf(kValues)))};
}

/// A row's, at their columns, of which some are looked at.
const uint8_t* ColumnParts::elements(int32_t y, int32_t from, int32_t to, uint8_t* gathered) const {
    const uint8_t* const row = rows_.row(y);
    if (rows_.apart == 1) return row;
    const ptrdiff_t apart = rows_.apart;
    for (ptrdiff_t x = from; x < to; ++x) gathered[x] = row[x * apart];
    return gathered;
}

/// What stands behind the last column becomes counts that are in no window.
QORI_INLINE Bytes ColumnParts::some(const uint8_t* elements, ptrdiff_t x, ptrdiff_t end) {
    return end - x >= kVectorBytes ? load(elements + x) : loadPartial(elements + x, end - x);
}

void ColumnParts::begin(const ByteRows& rows, int32_t columns, QorImageSize window) {
    rows_ = rows;
    columns_ = columns;
    padded_ = static_cast<ptrdiff_t>(paddedOf(columns));
    plane_ = padded_ * kPlaces;
    width_ = window.width;
    height_ = window.height;
    within_ = memory_;
    beneath_ = within_ + plane_ * kParts;
    differences_ = beneath_ + padded_ * kParts;
    uint8_t* const entries = differences_ + padded_ * kParts;
    in_ = {entries, entries + padded_};
    out_ = {entries + 2 * padded_, entries + 3 * padded_};
    __builtin_memset(beneath_, 0, static_cast<size_t>(padded_ * kParts));
    __builtin_memset(hints_, kParts / 2, sizeof hints_);
}

void ColumnParts::build(int32_t y, int32_t from, int32_t to) {
    for (int part = 0; part < kParts; ++part) {
        __builtin_memset(within_ + part * plane_ + ptrdiff_t{from} * kPlaces, 0,
                         static_cast<size_t>(to - from) * kPlaces);
        __builtin_memset(beneath(part) + from, 0, static_cast<size_t>(to - from));
    }
    for (int32_t k = 0; k < height_; ++k) enter(y + k, from, to);
}

void ColumnParts::enter(int32_t y, int32_t from, int32_t to) {
    const Entries in = in_;
    const uint8_t* const ins = elements(y, from, to, in.part);
    uint8_t* const beneaths = beneath_;
    const ptrdiff_t padded = padded_, plane = plane_, end = to;
    for (ptrdiff_t x = from; x < end; x += kVectorBytes) {
        const Entry enters = split(some(ins, x, end).v);
        store(in.part + x, Bytes{enters.part});
        store(in.place + x, Bytes{enters.place});
        uint8_t* p = beneaths + x;
        for (int part = 1; part < kParts; ++part) {
            p += padded;
            const __m256i notBelow = _mm256_cmpgt_epi8(enters.part, bytesOf(part - 1));
            store(p, Bytes{_mm256_add_epi8(load(p).v, _mm256_sub_epi8(notBelow, bytesOf(-1)))});
        }
    }
    const __m256i n = numbers();
    uint8_t* column = within_ + from * ptrdiff_t{kPlaces};
    for (ptrdiff_t x = from; x < end; ++x, column += kPlaces) {
        uint8_t* const p = column + in.part[x] * plane;
        storeBlock(p, _mm256_sub_epi8(block(p), beyond(in.place + x, n)));
    }
}

void ColumnParts::advance(int32_t y, int32_t from, int32_t to) {
    const Entries in = in_, out = out_;
    const ptrdiff_t padded = padded_, plane = plane_, end = to;
    // The next row is far from this one, where no prefetcher looks for it.
    const uint8_t* const next = rows_.row(ptrdiff_t{y} + height_);
    for (ptrdiff_t x = from * rows_.apart; x < end * rows_.apart; x += 64) __builtin_prefetch(next + x);
    const uint8_t *const ins = elements(y + height_ - 1, from, to, in.part), *const outs =
                                                                                 elements(y - 1, from, to, out.part);
    // What is stored are bytes, which may be anything: members are not read among the stores.
    uint8_t* const beneaths = beneath_;
    for (ptrdiff_t x = from; x < end; x += kVectorBytes) {
        const Entry enters = split(some(ins, x, end).v), leaves = split(some(outs, x, end).v);
        store(in.part + x, Bytes{enters.part});
        store(in.place + x, Bytes{enters.place});
        store(out.part + x, Bytes{leaves.part});
        store(out.place + x, Bytes{leaves.place});
        uint8_t* p = beneaths + x;
#pragma GCC unroll 8
        for (int part = 1; part < kParts; ++part) {
            p += padded;
            const __m256i last = bytesOf(part - 1);
            const __m256i change =
                _mm256_sub_epi8(_mm256_cmpgt_epi8(enters.part, last), _mm256_cmpgt_epi8(leaves.part, last));
            store(p, Bytes{_mm256_add_epi8(load(p).v, change)});
        }
    }
    const __m256i n = numbers();
    uint8_t* column = within_ + from * ptrdiff_t{kPlaces};
#pragma GCC unroll 4
    for (ptrdiff_t x = from; x < end; ++x, column += kPlaces) {
        uint8_t *const p = column + in.part[x] * plane, *const q = column + out.part[x] * plane;
        storeBlock(p, _mm256_sub_epi8(block(p), beyond(in.place + x, n)));
        storeBlock(q, _mm256_add_epi8(block(q), beyond(out.place + x, n)));
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
    const Bytes rest = load(p) & Bytes{firsts(static_cast<int>(left))};
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

/// By columns, the elements below a part in the column behind the window less those in its first one; where these are
/// no signed bytes, the elements themselves.
template <bool isTall>
const uint8_t* ColumnParts::beside(int part, int32_t end) {
    const uint8_t* const p = beneath(part);
    if constexpr (isTall) {
        return p;
    } else {
        uint8_t* const to = differences_ + part * padded_;
        if ((fresh_ >> part & 1) == 0) {
            fresh_ |= 1u << part;
            for (ptrdiff_t x = from_; x < end; x += kVectorBytes)
                store(to + x, Bytes{_mm256_sub_epi8(load(p + x + width_).v, load(p + x).v)});
        }
        return to;
    }
}

namespace {

/// Counts of a window become those of the next. Differences of columns are signed bytes unless they are tall.
template <bool isTall>
QORI_INLINE void move(PartSums& sums, const uint8_t* leaving, const uint8_t* entering, const uint8_t* beneath,
                      int32_t width) {
    if constexpr (isTall) {
        const __m256i in = _mm256_add_epi8(block(entering), bytesOf(beneath[width])),
                      out = _mm256_add_epi8(block(leaving), bytesOf(*beneath)), low = wordsOf(255);
        sums.even =
            _mm256_add_epi16(sums.even, _mm256_sub_epi16(_mm256_and_si256(in, low), _mm256_and_si256(out, low)));
        sums.odd = _mm256_add_epi16(sums.odd, _mm256_sub_epi16(_mm256_srli_epi16(in, 8), _mm256_srli_epi16(out, 8)));
    } else {
        const __m256i change = _mm256_add_epi8(_mm256_sub_epi8(block(entering), block(leaving)), bytesOf(*beneath));
        sums.even = _mm256_add_epi16(sums.even, _mm256_maddubs_epi16(wordsOf(1), change));
        sums.odd = _mm256_add_epi16(sums.odd, _mm256_maddubs_epi16(wordsOf(256), change));
    }
}
QORI_INLINE void raise(PartSums& sums, int by) {
    sums = {_mm256_add_epi16(sums.even, wordsOf(by)), _mm256_add_epi16(sums.odd, wordsOf(by))};
}
QORI_INLINE int firstOf(const PartSums& sums) {
    return static_cast<int16_t>(_mm_extract_epi16(_mm256_castsi256_si128(sums.even), 0));
}
QORI_INLINE int lastOf(const PartSums& sums) {
    return static_cast<int16_t>(_mm_extract_epi16(_mm256_extracti128_si256(sums.odd, 1), 7));
}
/// Places before that of the median.
QORI_INLINE unsigned placesBefore(const PartSums& sums) {
    return static_cast<unsigned>(
        __builtin_popcount(static_cast<unsigned>(_mm256_movemask_epi8(_mm256_packs_epi16(sums.even, sums.odd)))));
}

}  // namespace

/// Counts of a window's columns, so many of which are added up as bytes.
template <int atOnce>
QORI_INLINE void addColumns(PartSums& sums, const uint8_t*& p, int32_t& left) {
    constexpr int kBytes = 32;
    for (; left >= atOnce; left -= atOnce, p += atOnce * kBytes) {
        __m256i bytes = block(p);
        for (int k = 1; k < atOnce; ++k) bytes = _mm256_add_epi8(bytes, block(p + k * kBytes));
        sums.even = _mm256_add_epi16(sums.even, _mm256_and_si256(bytes, wordsOf(255)));
        sums.odd = _mm256_add_epi16(sums.odd, _mm256_srli_epi16(bytes, 8));
    }
}

QORI_INLINE PartSums ColumnParts::summedUp(int32_t x, int part) const {
    PartSums sums{_mm256_setzero_si256(), _mm256_setzero_si256()};
    const uint8_t* p = within(part, x);
    int32_t left = width_;
    if (height_ <= 255 / 8) addColumns<8>(sums, p, left);
    if (height_ <= 255 / 4) addColumns<4>(sums, p, left);
    addColumns<1>(sums, p, left);
    return sums;
}

/// Takes the median's part to be the next one up or down, unless it is farther away.
QORI_NOINLINE void ColumnParts::leave(Window& now, int32_t below) const {
    const int first = firstOf(now.sums), last = lastOf(now.sums);
    const bool isAbove = last < 0;
    now.part += isAbove ? 1 : -1;
    now.sums = summedUp(now.x, now.part);
    raise(now.sums, isAbove ? last : first - (lastOf(now.sums) & 0xFFFF));
    if (placesBefore(now.sums) - 1 < unsigned{kValues}) return;
    now.part = partOf(now.x, below);
    now.sums = summedUp(now.x, now.part);
    raise(now.sums, before(now.part, now.x) - below - 1);
}

template <bool isTall, bool wantsRests>
void ColumnParts::follow(int32_t first, int32_t end, int32_t below, uint8_t* to, uint16_t* rests) {
    const ptrdiff_t across = ptrdiff_t{width_} * kPlaces;
    uint8_t& hint = hints_[static_cast<size_t>(first / kBlock) % sizeof hints_];
    from_ = first;
    fresh_ = 0;
    Window now{summedUp(first, hint), first, hint};
    raise(now.sums, before(now.part, first) - below - 1);
    for (;;) {
        // In this part for as long as the median is.
        const uint8_t *leaving = within(now.part, now.x),
                      *entering = leaving + across, *const beneaths = beside<isTall>(now.part, end);
        const int base = kValues * now.part - kBefore - 1;
        PartSums sums = now.sums;
        int32_t x = now.x;
#pragma GCC unroll 4
        for (; x < end; ++x) {
            const unsigned place = placesBefore(sums);
            if (place - 1 >= unsigned{kValues}) break;
            to[x] = static_cast<uint8_t>(base + static_cast<int>(place));
            if constexpr (wantsRests) {
                alignas(kVectorBytes) uint16_t stored[2][kPlaces / 2];
                store(stored[0], Vec<uint16_t>{sums.even});
                store(stored[1], Vec<uint16_t>{sums.odd});
                rests[x] = static_cast<uint16_t>(~stored[(place - 1) % 2][(place - 1) / 2]);
            }
            move<isTall>(sums, leaving, entering, beneaths + x, width_);
            leaving += kPlaces;
            entering += kPlaces;
        }
        if (x == end) return;
        now.sums = sums;
        now.x = x;
        leave(now, below);
        if (x == first) hint = static_cast<uint8_t>(now.part);
    }
}

void ColumnParts::medians(int32_t first, int32_t end, int32_t below, uint8_t* to, uint16_t* rests) {
    constexpr int32_t kMostSigned = 127;
    if (height_ > kMostSigned)
        rests == nullptr ? follow<true, false>(first, end, below, to, rests)
                         : follow<true, true>(first, end, below, to, rests);
    else
        rests == nullptr ? follow<false, false>(first, end, below, to, rests)
                         : follow<false, true>(first, end, below, to, rests);
}

}  // namespace qori::kernels
