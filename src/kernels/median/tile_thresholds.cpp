// SPDX-License-Identifier: Apache-2.0
#include "tile_thresholds.h"

#include <algorithm>
#include <utility>

#include "lanes.h"

namespace qori::kernels {
namespace {

using namespace lanes;

/// Thresholds of a tile, on average: more than histograms are worth, and few enough to leave histograms for.
constexpr int kMany = 24, kFew = 10;
/// Rows after which thresholds that are not needed any more are left out.
constexpr int32_t kRowsToKeep = 16;
/// Cycles that histograms take for the pixels of a tile.
constexpr int32_t kHistogramsTake = 24 * kVectorBytes;

/// What is below a threshold are bytes with a sign.
QORI_INLINE __m256i ordered(__m256i bytes) { return _mm256_xor_si256(bytes, bytesOf(-128)); }
QORI_INLINE __m256i orderedThreshold(int threshold) { return bytesOf(threshold - 128); }

/// Every 128 bits are added the last element of those before.
QORI_INLINE __m256i lastBefore(__m256i v, __m256i last) {
    return _mm256_shuffle_epi8(_mm256_permute2x128_si256(v, v, 0x08), last);
}
QORI_INLINE __m256i sumsOfBytes(__m256i v) {
    v = _mm256_add_epi8(v, _mm256_slli_si256(v, 1));
    v = _mm256_add_epi8(v, _mm256_slli_si256(v, 2));
    v = _mm256_add_epi8(v, _mm256_slli_si256(v, 4));
    v = _mm256_add_epi8(v, _mm256_slli_si256(v, 8));
    return _mm256_add_epi8(v, lastBefore(v, bytesOf(15)));
}
QORI_INLINE __m256i sumsOfWords(__m256i v) {
    v = _mm256_add_epi16(v, _mm256_slli_si256(v, 2));
    v = _mm256_add_epi16(v, _mm256_slli_si256(v, 4));
    v = _mm256_add_epi16(v, _mm256_slli_si256(v, 8));
    return _mm256_add_epi16(v, lastBefore(v, wordsOf(0x0F0E)));
}

/// The sum of all bytes in the lowest 64 bits.
QORI_INLINE __m128i total(__m256i v) {
    const __m256i four = _mm256_sad_epu8(v, _mm256_setzero_si256());
    const __m128i two = _mm_add_epi32(_mm256_castsi256_si128(four), _mm256_extracti128_si256(four, 1));
    return _mm_add_epi32(two, _mm_unpackhi_epi64(two, two));
}

/// Packed bytes as pixels follow each other.
QORI_INLINE __m256i inOrder(__m256i packed) {
    return _mm256_unpacklo_epi8(packed, _mm256_unpackhi_epi64(packed, packed));
}

}  // namespace

bool TileThresholds::areFew(const uint8_t* medians, int32_t count) {
    int used = 0;
    for (int32_t x = 0; x < count; x += kTile) {
        bool isIn[kValues + 1] = {};
        for (int32_t i = x; i < std::min(count, x + kTile); ++i) isIn[medians[i]] = isIn[medians[i] + 1] = true;
        used += static_cast<int>(std::count(isIn, std::end(isIn), true));
    }
    return used <= kFew * tilesOf(count);
}

void TileThresholds::read(const uint8_t* from, ptrdiff_t apart, uint8_t* to) const {
    ++to;
    if (apart == 1) {
        ptrdiff_t x = 0;
        for (; x <= columns_ - kVectorBytes; x += kVectorBytes) store(to + x, Bytes{ordered(load(from + x).v)});
        if (x < columns_) store(to + x, Bytes{ordered(loadPartial(from + x, columns_ - x).v)});
    } else {
        const ptrdiff_t columns = columns_;
        for (ptrdiff_t x = 0; x < columns; ++x) to[x] = static_cast<uint8_t>(from[x * apart] ^ 128);
    }
}

void TileThresholds::begin(const ByteRows& rows, int32_t y, int32_t columns, QorImageSize window) {
    columns_ = columns;
    window_ = window;
    half_ = window.width * window.height / 2;
    pitch_ = pitchOf(columns);
    const int32_t tiles = tilesOf(columns - window.width + 1);
    rows_ = counts_ + ptrdiff_t{tiles} * kValues * kCountBytes;
    // What is beside the columns has to stay the same from row to row.
    __builtin_memset(rows_, 0, static_cast<size_t>(pitch_ * (ptrdiff_t{window.height} + 1)));
    for (int32_t k = 0; k < window.height; ++k) read(rows.row(ptrdiff_t{y} + k), rows.apart, row(k));
    top_ = 0;
    lowest_ = window.height - 1;
    left_ = window.height;
    since_ = work_ = used_ = 0;
    for (Tile& tile : tiles_) tile.count = 0;
}

void TileThresholds::advance(const uint8_t* entering, ptrdiff_t apart) {
    lowest_ = next(lowest_);
    left_ = top_;
    top_ = next(top_);
    read(entering, apart, row(lowest_));
    ++since_;
}

/// Counts of pixels with even numbers, and with odd ones, of which those of medians that reach the threshold are
/// negative.
QORI_INLINE void TileThresholds::Between::narrow(__m256i even, __m256i odd, __m256i threshold) {
    const __m256i packed = _mm256_packs_epi16(even, odd);
    from = _mm256_max_epi8(from, _mm256_blendv_epi8(bytesOf(-128), threshold, packed));
    to = _mm256_min_epi8(to, _mm256_blendv_epi8(threshold, bytesOf(127), packed));
}

/// How many elements of the windows are below another threshold.
void TileThresholds::add(int32_t tile, int threshold, Between& medians) {
    Tile& thresholds = tiles_[tile];
    ++used_;
    thresholds.at[thresholds.count++] = static_cast<uint8_t>(threshold);
    alignas(kVectorBytes) uint8_t ofColumns[6 * kTile];
    const __m256i below = orderedThreshold(threshold);
    const int vectors = window_.width / kTile + 2;
    work_ += 80 + window_.height * vectors;
    for (int k = 0; k < vectors; ++k) {
        const uint8_t* const p = rows_ + (ptrdiff_t{tile} + k) * kTile;
        __m256i sum = _mm256_cmpgt_epi8(below, load(p + left_ * pitch_).v);
        for (const uint8_t *q = p, *const end = p + (window_.height + 1) * pitch_; q != end; q += pitch_)
            sum = _mm256_sub_epi8(sum, _mm256_cmpgt_epi8(below, load(q).v));
        storeBlock(ofColumns + k * kTile, sum);
    }
    // The window before the first pixel's has the column before the tile.
    int before = 0;
    for (int x = 0; x < window_.width; x += kTile)
        before += _mm_cvtsi128_si32(total(_mm256_and_si256(block(ofColumns + x), firsts(window_.width - x))));
    const __m256i in = load(ofColumns + window_.width).v, out = block(ofColumns), low = wordsOf(255);
    const __m256i even = _mm256_sub_epi16(_mm256_and_si256(in, low), _mm256_and_si256(out, low));
    const __m256i odd = _mm256_sub_epi16(_mm256_srli_epi16(in, 8), _mm256_srli_epi16(out, 8));
    const __m256i atOdd = _mm256_add_epi16(sumsOfWords(_mm256_add_epi16(even, odd)), wordsOf(before - half_ - 1));
    const __m256i atEven = _mm256_sub_epi16(atOdd, odd);
    uint8_t* const to = countsOf(tile, threshold);
    storeBlock(to, atEven);
    storeBlock(to + kTile, atOdd);
    medians.narrow(atEven, atOdd, below);
}

/// Counts of the row before become those of this row.
template <int vectors>
TileThresholds::Between TileThresholds::step(int32_t tile) const {
    const Tile& thresholds = tiles_[tile];
    const uint8_t *const in = row(lowest_) + ptrdiff_t{tile} * kTile, *const out = row(left_) + ptrdiff_t{tile} * kTile;
    const __m256i inRight = load(in + window_.width).v, outRight = load(out + window_.width).v;
    const __m256i inLeft = load(in).v, outLeft = load(out).v;
    // Of the window before the first pixel's; what is not in it is below no threshold.
    __m256i ins[vectors], outs[vectors];
    for (int k = 0; k < vectors; ++k) {
        const __m256i isIn = firsts(window_.width - k * kTile);
        ins[k] = _mm256_blendv_epi8(bytesOf(127), load(in + k * kTile).v, isIn);
        outs[k] = _mm256_blendv_epi8(bytesOf(127), load(out + k * kTile).v, isIn);
    }
    const __m256i evens = wordsOf(1), odds = wordsOf(256);
    Between medians{bytesOf(-128), bytesOf(127)};
    uint8_t* const counts = countsOf(tile, 0);
    for (const uint8_t *at = thresholds.at, *const end = at + thresholds.count; at != end; ++at) {
        const __m256i below = orderedThreshold(*at);
        uint8_t* const p = counts + ptrdiff_t{*at} * kCountBytes;
        __m256i first = _mm256_setzero_si256();
        for (int k = 0; k < vectors; ++k)
            first = _mm256_add_epi8(
                first, _mm256_sub_epi8(_mm256_cmpgt_epi8(below, outs[k]), _mm256_cmpgt_epi8(below, ins[k])));
        const __m256i right = _mm256_sub_epi8(_mm256_cmpgt_epi8(below, outRight), _mm256_cmpgt_epi8(below, inRight));
        const __m256i left = _mm256_sub_epi8(_mm256_cmpgt_epi8(below, inLeft), _mm256_cmpgt_epi8(below, outLeft));
        const __m256i change =
            _mm256_add_epi8(sumsOfBytes(_mm256_add_epi8(right, left)), _mm256_broadcastb_epi8(total(first)));
        const __m256i even = _mm256_add_epi16(block(p), _mm256_maddubs_epi16(evens, change));
        const __m256i odd = _mm256_add_epi16(block(p + kTile), _mm256_maddubs_epi16(odds, change));
        storeBlock(p, even);
        storeBlock(p + kTile, odd);
        medians.narrow(even, odd, below);
    }
    return medians;
}

TileThresholds::Between TileThresholds::stepped(int32_t tile) const {
    switch ((window_.width - 1) / kTile) {
        case 0: return step<1>(tile);
        case 1: return step<2>(tile);
        case 2: return step<3>(tile);
        default: return step<4>(tile);
    }
}

/// The elements of a pixel's window below one of the thresholds, or all or none, less those that come before the
/// median, less one.
int32_t TileThresholds::countAt(int32_t tile, int threshold, int pixel) const {
    if (threshold == 0) return -half_ - 1;
    if (threshold == kValues) return half_;
    const auto* const counts = reinterpret_cast<const int16_t*>(countsOf(tile, threshold) + pixel % 2 * kTile);
    return counts[pixel / 2];
}

/// A threshold between two: where the median would be if elements were evenly spread, or in the middle.
int TileThresholds::inside(int32_t tile, int pixel, int from, int to, bool middle) const {
    if (middle) return (from + to) / 2;
    const int32_t before = -countAt(tile, from, pixel), behind = countAt(tile, to, pixel) + 1;
    return std::clamp(from + (to - from) * before / (before + behind), from + 1, to - 1);
}

/// More thresholds, until medians are one of them and less than the next value. False if they are too many.
bool TileThresholds::search(int32_t tile, Between& medians) {
    const Tile& thresholds = tiles_[tile];
    const auto pixels =
        static_cast<unsigned>(_mm256_movemask_epi8(firsts(columns_ - window_.width + 1 - tile * kTile)));
    for (bool middle = false;; middle = !middle) {
        const __m256i from = inOrder(medians.from), to = inOrder(medians.to);
        const __m256i isFound = _mm256_or_si256(_mm256_cmpeq_epi8(_mm256_sub_epi8(from, bytesOf(-1)), to),
                                                _mm256_cmpeq_epi8(from, bytesOf(127)));
        const unsigned missing = ~static_cast<unsigned>(_mm256_movemask_epi8(isFound)) & pixels;
        if (missing == 0) return true;
        if (thresholds.count + 2 > kMost || used_ > kMany * tilesOf(columns_ - window_.width + 1)) return false;
        alignas(kVectorBytes) uint8_t lows[kTile], highs[kTile];
        storeBlock(lows, ordered(from));
        storeBlock(highs, ordered(to));
        const int pixel = __builtin_ctz(missing), low = lows[pixel];
        // 255 is one of the thresholds where 254 is.
        const int high = highs[pixel] == kValues - 1 && !thresholds.isIn(kValues - 1) ? kValues : highs[pixel];
        const int threshold = inside(tile, pixel, low, high, middle);
        add(tile, threshold, medians);
        if (threshold == kValues - 2 && high == kValues) add(tile, kValues - 1, medians);
    }
}

/// Those remain that the row's medians take, and those next to them.
void TileThresholds::leaveOut(Tile& tile, const uint8_t* medians, int32_t count) {
    bool isNear[kValues + 3] = {};  // from -1 on
    for (int32_t i = 0; i < count; ++i) std::fill_n(isNear + medians[i], 4, true);
    isNear[kValues] = isNear[kValues] || isNear[kValues - 1];
    const uint8_t* const end =
        std::remove_if(tile.at, tile.at + tile.count, [&](uint8_t threshold) { return !isNear[threshold + 1]; });
    tile.count = static_cast<int>(end - tile.at);
}

bool TileThresholds::makeTile(int32_t tile, uint8_t* to, uint16_t* rests) {
    Between between = stepped(tile);
    work_ += 80 + tiles_[tile].count * (11 + window_.width / 10);
    if (!search(tile, between)) return false;
    const int32_t x = tile * kTile, count = std::min(columns_ - window_.width + 1 - x, kTile);
    const Bytes found{ordered(inOrder(between.from))};
    if (count == kTile)
        store(to + x, found);
    else
        storePartial(to + x, found, count);
    if (rests != nullptr)
        for (int32_t i = x; i < x + count; ++i) rests[i] = static_cast<uint16_t>(~countAt(tile, to[i], i % kTile));
    if (since_ % kRowsToKeep == kRowsToKeep - 1) {
        used_ -= tiles_[tile].count;
        leaveOut(tiles_[tile], to + x, count);
        used_ += tiles_[tile].count;
    }
    return true;
}

bool TileThresholds::medians(uint8_t* to, uint16_t* rests) {
    const int32_t tiles = tilesOf(columns_ - window_.width + 1);
    for (int32_t tile = 0; tile < tiles; ++tile)
        if (!makeTile(tile, to, rests)) return false;
    if (since_ % kRowsToKeep != kRowsToKeep - 1) return true;
    return std::exchange(work_, 0) <= kRowsToKeep * kHistogramsTake * tiles;
}

}  // namespace qori::kernels
