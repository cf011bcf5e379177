// SPDX-License-Identifier: Apache-2.0
#include "cosine_passes.h"

#include "block_floats.h"
#include "cosine_lines.h"

namespace qori::kernels {
namespace {

constexpr int kStripColumns = kStripGroups * kGroupColumns, kGroupRows = kGroupColumns;

/// Vectors of a row: those that hold elements of the image, and of these the ones that are processed.
class RowMask {
public:
    RowMask(ptrdiff_t elements, CosineChannels channels)
        : elements_(elements), isWhole_(channels.inPixel == channels.processed) {}

    bool isWhole(ptrdiff_t at) const { return isWhole_ && at + kGroupColumns <= elements_; }
    __m256i of(ptrdiff_t at) const {
        const ptrdiff_t left = elements_ - at;
        const __m256i inside = firstLanes<float>(left < 0 ? 0 : left < kGroupColumns ? left : kGroupColumns).v;
        return isWhole_ ? inside : _mm256_and_si256(inside, _mm256_setr_epi32(-1, -1, -1, 0, -1, -1, -1, 0));
    }

private:
    ptrdiff_t elements_;
    bool isWhole_;
};

QORI_INLINE Vec<float> loadMasked(const float* p, __m256i mask) { return {_mm256_maskload_ps(p, mask)}; }
QORI_INLINE void storeMasked(float* p, Vec<float> v, __m256i mask) { _mm256_maskstore_ps(p, mask, v.v); }

/// Groups that lines are made of: both of an odd length share theirs.
int groupsOf(const CosineTable& table, bool hasSecond) { return hasSecond || table.isOdd() ? 2 : 1; }

// --- columns --------------------------------------------------------------------------------------------------------

/// A strip of columns by how its vectors are loaded and stored: load(group, row), put(group, row, vector).
template <class Load, class Put>
QORI_INLINE void transformColumns(const CosineTable& table, int groups, bool isInverse, float* lines, Load load,
                                  Put put) {
    float* const work = lines + stripFloats(table.n);
    const StripOrder order(table);
    if (isInverse) {
        stripOfCosines(table, load, lines, groups, work);
        for (int32_t y = 0; y < table.n; ++y)
            for (int g = 0; g < groups; ++g) put(g, y, qori::load(lines + order.after(y, g)));
        return;
    }
    for (int32_t y = 0; y < table.n; ++y)
        for (int g = 0; g < groups; ++g) store(lines + order.before(y, g), load(g, y));
    cosinesOfStrip(table, lines, groups, work, put);
}

/// Columns at `at`, and others so far apart where there are any.
void transformStrip(const CosineTable& table, Image<float> image, ptrdiff_t at, ptrdiff_t apart, ptrdiff_t elements,
                    const RowMask& mask, bool isInverse, float* work) {
    const auto place = [=](int g, int32_t y) { return image.row(y) + at + g * apart; };
    if (mask.isWhole(at) && mask.isWhole(at + apart))
        return transformColumns(
            table, kStripGroups, isInverse, work, [=](int g, int32_t y) { return load(place(g, y)); },
            [=](int g, int32_t y, Vec<float> v) { store(place(g, y), v); });
    const __m256i masks[kStripGroups] = {mask.of(at), mask.of(at + apart)};
    transformColumns(
        table, groupsOf(table, at + apart < elements), isInverse, work,
        [=](int g, int32_t y) { return loadMasked(place(g, y), masks[g]); },
        [=](int g, int32_t y, Vec<float> v) { storeMasked(place(g, y), v, masks[g]); });
}

// --- rows -----------------------------------------------------------------------------------------------------------

/// Up to 16 rows of an image. Missing ones are the last one again where they are read, and not written.
struct RowStrip {
    const float* src[kStripColumns];
    float* dst[kStripColumns];
    int count;
};

RowStrip stripAt(Image<const float> src, Image<float> dst, int32_t y, int32_t height) {
    RowStrip strip;
    strip.count = height - y < kStripColumns ? height - y : kStripColumns;
    for (int i = 0; i < kStripColumns; ++i) {
        const int32_t row = y + (i < strip.count ? i : strip.count - 1);
        strip.src[i] = src.row(row);
        strip.dst[i] = dst.row(row);
    }
    return strip;
}

/// Buffers of as many floats as a strip has, one for each channel and one more: what is made of a channel goes into
/// the buffer before its own, which the channel before has done with.
struct StripBuffers {
    float* first;
    ptrdiff_t apart;

    float* in(int channel) const { return first + (channel + 1) * apart; }
    float* out(int channel) const { return first + channel * apart; }
};

/// Rows to vectors of one element of eight rows each, put(group, channel, x, vector).
template <class Put>
QORI_INLINE void takeRows(const RowStrip& strip, int groups, ptrdiff_t elements, CosineChannels channels,
                          const RowMask& mask, Put put) {
    for (int g = 0; g < groups; ++g) {
        int channel = 0;
        int32_t x = 0;
        for (ptrdiff_t at = 0; at < elements; at += kGroupColumns) {
            dct8::FloatRows v;
            const float* const* const rows = strip.src + kGroupRows * g;
            if (mask.isWhole(at))
                for (int i = 0; i < kGroupRows; ++i) v[i] = load(rows[i] + at).v;
            else
                for (int i = 0; i < kGroupRows; ++i) v[i] = loadMasked(rows[i] + at, mask.of(at)).v;
            dct8::turnRows(v);
            for (int i = 0; i < kGroupColumns && at + i < elements; ++i) {
                if (channel < channels.processed) put(g, channel, x, Vec<float>{v[i]});
                if (++channel == channels.inPixel) channel = 0, ++x;
            }
        }
    }
}

/// The way back, from get(group, channel, x).
template <class Get>
QORI_INLINE void giveRows(const RowStrip& strip, ptrdiff_t elements, CosineChannels channels, const RowMask& mask,
                          Get get) {
    for (int g = 0; kGroupRows * g < strip.count; ++g) {
        int channel = 0;
        int32_t x = 0;
        const int count = strip.count - kGroupRows * g < kGroupRows ? strip.count - kGroupRows * g : kGroupRows;
        for (ptrdiff_t at = 0; at < elements; at += kGroupColumns) {
            dct8::FloatRows v;
            for (int i = 0; i < kGroupColumns; ++i) {
                const bool isThere = at + i < elements && channel < channels.processed;
                v[i] = isThere ? get(g, channel, x).v : _mm256_setzero_ps();
                if (++channel == channels.inPixel) channel = 0, ++x;
            }
            dct8::turnRows(v);
            float* const* const rows = strip.dst + kGroupRows * g;
            const bool isWhole = mask.isWhole(at);
            for (int i = 0; i < count; ++i) {
                if (isWhole)
                    store(rows[i] + at, Vec<float>{v[i]});
                else
                    storeMasked(rows[i] + at, {v[i]}, mask.of(at));
            }
        }
    }
}

/// Elements in their order, one group behind the other.
QORI_INLINE ptrdiff_t inOrder(int32_t n, int32_t k, int group) { return kGroupColumns * (ptrdiff_t{n} * group + k); }

}  // namespace

int64_t cosineRowsWork(int32_t n, int channels) {
    return (channels + 1) * int64_t{kLineBytes} * n + cosineWorkBytes(n);
}

int64_t cosineColumnsWork(int32_t n) { return int64_t{kLineBytes} * n + cosineWorkBytes(n); }

void cosineRows(const CosineTable& table, Image<const float> src, Image<float> dst, int32_t height,
                CosineChannels channels, bool isInverse, float* work) {
    const int32_t n = table.n;
    const ptrdiff_t elements = ptrdiff_t{n} * channels.inPixel;
    const RowMask mask(elements, channels);
    const StripOrder order(table);
    const StripBuffers buffers{work, stripFloats(n)};
    float* const rest = buffers.in(channels.processed);
    for (int32_t y = 0; y < height; y += kStripColumns) {
        const RowStrip strip = stripAt(src, dst, y, height);
        const int groups = groupsOf(table, strip.count > kGroupRows);
        takeRows(strip, groups, elements, channels, mask, [=](int g, int c, int32_t x, Vec<float> v) {
            store(buffers.in(c) + (isInverse ? inOrder(n, x, g) : order.before(x, g)), v);
        });
        for (int c = 0; c < channels.processed; ++c) {
            float *const in = buffers.in(c), *const out = buffers.out(c);
            if (isInverse)
                stripOfCosines(
                    table, [=](int g, int32_t k) { return load(in + inOrder(n, k, g)); }, out, groups, rest);
            else
                cosinesOfStrip(table, in, groups, rest,
                               [=](int g, int32_t k, Vec<float> v) { store(out + inOrder(n, k, g), v); });
        }
        giveRows(strip, elements, channels, mask, [=](int g, int c, int32_t x) {
            return load(buffers.out(c) + (isInverse ? order.after(x, g) : inOrder(n, x, g)));
        });
    }
}

void cosineColumns(const CosineTable& table, Image<float> image, int32_t width, CosineChannels channels, bool isInverse,
                   float* work) {
    const ptrdiff_t elements = ptrdiff_t{width} * channels.inPixel;
    const RowMask mask(elements, channels);
    // Groups of one strip begin with the same channel: of odd length they share lines, and the rounding errors.
    const ptrdiff_t apart = channels.inPixel == 3 ? 3 * kGroupColumns : kGroupColumns;
    for (ptrdiff_t first = 0; first < elements; first += 2 * apart)
        for (ptrdiff_t at = first; at < first + apart && at < elements; at += kGroupColumns)
            transformStrip(table, image, at, apart, elements, mask, isInverse, work);
}

}  // namespace qori::kernels
