// SPDX-License-Identifier: Apache-2.0
// Transforms of columns whose first pass reads the image and whose last one writes it.
#include "move_lines.h"
#include "passes.h"

namespace qori::kernels {
namespace {

template <bool isExchanged>
QORI_INLINE ComplexLine exchangedIf(ComplexLine a) {
    return isExchanged ? ComplexLine{a.im, a.re} : a;
}

QORI_INLINE float* rowOf(const LineColumns& columns, ptrdiff_t y) { return columns.rows.row(y) + columns.element; }

/// Whole blocks of one channel, and of four of which all are processed: two columns of four lanes each.
struct PlainLanes {
    QORI_INLINE static ComplexLine read(const float* p) { return line::separate(load(p), load(p + kLineColumns)); }
    QORI_INLINE static void write(float* p, ComplexLine a) {
        Vec<float> low, high;
        line::interleave(a, low, high);
        store(p, low);
        store(p + kLineColumns, high);
    }
};
struct FourChannelLanes {
    QORI_INLINE static ComplexLine read(const float* p) { return exchanged({load(p), load(p + kLineColumns)}); }
    QORI_INLINE static void write(float* p, ComplexLine a) {
        a = exchanged(a);
        store(p, a.re);
        store(p + kLineColumns, a.im);
    }

private:
    /// The halves in the middle change places, either way.
    QORI_INLINE static ComplexLine exchanged(ComplexLine a) {
        return {{_mm256_permute2f128_ps(a.re.v, a.im.v, 0x20)}, {_mm256_permute2f128_ps(a.re.v, a.im.v, 0x31)}};
    }
};

/// The first stage, of the whole length: rows of the image to lines.
template <int radix, bool isExchanged, class Lanes>
QORI_NOINLINE void passIn(const LineColumns& from, float scale, const FourierTable& table, float* lines) {
    const ptrdiff_t part = table.points / radix, apart = part * kLineFloats;
    const float* w = table.at<float>(table.stages[0].twiddles);
    const Vec<float> factor = splat(scale);
    for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
        ComplexLine a[radix];
        if (from.ahead != 0)
            for (int q = 0; q < radix; ++q)
                _mm_prefetch(reinterpret_cast<const char*>(rowOf(from, j + q * part) + from.ahead), _MM_HINT_T1);
        for (int q = 0; q < radix; ++q) {
            const ComplexLine z = Lanes::read(rowOf(from, j + q * part));
            a[q] = exchangedIf<isExchanged>({z.re * factor, z.im * factor});
        }
        line::butterfly(a);
        float* const x = lines + j * kLineFloats;
        line::storeLine(x, a[0]);
        for (int p = 1; p < radix; ++p) line::storeLine(x + p * apart, line::times(a[p], w + 2 * p - 2));
    }
}

/// Frequencies first, first + apart, ... of a transform whose last stage is not done yet.
struct Frequencies {
    int32_t first, apart;
};

/// Of a first-level cache of 64 sets of 8 lines or more: rows a power of two apart share few.
bool areKept(const LineRows& rows) {
    constexpr ptrdiff_t sets = 64, ways = 8, least = kLineBytes, most = sets * kLineBytes;
    const ptrdiff_t power = rows.step & -rows.step;
    return rows.count <= ways * most / (power < least ? least : power > most ? most : power);
}

/// Stores wait for each other: rows that are in a second-level cache, but no longer in the first, are asked for before.
/// Others are written as whole lines, which need not be fetched.
bool areAskedFor(const LineColumns& from, const LineColumns& to) {
    const bool isSmall = to.rows.count * to.rows.step <= 1 << 21;
    return !areKept(to.rows) && (from.rows.first == to.rows.first || isSmall);
}

/// The last stage, of blocks of `radix` lines: calls write(frequency, line) for each line of its results, whose rows
/// are those of `to`.
template <int radix, class Write>
QORI_INLINE void lastStage(const FourierTable& table, const float* lines, Frequencies f, const LineColumns& to,
                           bool isAhead, Write write) {
    const int32_t part = table.points / radix;
    const int32_t* const positions = table.positions();
    for (int32_t k = f.first; k < part; k += f.apart) {
        if (isAhead)
            for (int p = 0; p < radix; ++p)
                _mm_prefetch(reinterpret_cast<const char*>(rowOf(to, k + ptrdiff_t{p} * part)), _MM_HINT_T0);
        const float* const x = lines + ptrdiff_t{positions[k]} * kLineFloats;
        ComplexLine a[radix];
        for (int q = 0; q < radix; ++q) a[q] = line::loadLine(x + q * kLineFloats);
        line::butterfly(a);
        for (int p = 0; p < radix; ++p) write(k + ptrdiff_t{p} * part, a[p]);
    }
}

/// To rows of the image.
template <int radix, bool isExchanged, class Lanes>
QORI_NOINLINE void passOut(const FourierTable& table, const float* lines, Frequencies f, const LineColumns& to,
                           bool isAhead) {
    lastStage<radix>(
        table, lines, f, to, isAhead, [&](ptrdiff_t y, const ComplexLine& a) __attribute__((always_inline)) {
            Lanes::write(rowOf(to, y), exchangedIf<isExchanged>(a));
        });
}

/// The same into rows that begin an element earlier, on the boundaries of what was read.
template <int radix>
QORI_NOINLINE void passOutShifted(const FourierTable& table, const float* lines, Frequencies f, float* carry,
                                  const LineColumns& to, bool isAhead) {
    const __m256i next = _mm256_setr_epi32(1, 2, 3, 4, 5, 6, 7, 0);
    constexpr int last = 0x80;
    lastStage<radix>(
        table, lines, f, to, isAhead, [&](ptrdiff_t y, const ComplexLine& a) __attribute__((always_inline)) {
            float* const row = rowOf(to, y);
            Vec<float> low, high;
            line::interleave(a, low, high);
            const __m256 behind = _mm256_broadcast_ss(carry + y);
            _mm_store_ss(carry + y, _mm256_castps256_ps128(low.v));
            const __m256 first = _mm256_permutevar8x32_ps(low.v, next), second = _mm256_permutevar8x32_ps(high.v, next);
            store(row, Vec<float>{_mm256_blend_ps(first, second, last)});
            store(row + kLineColumns, Vec<float>{_mm256_blend_ps(second, behind, last)});
        });
}

/// The same of four channels: rows begin four elements earlier, and carry as many.
template <int radix>
QORI_NOINLINE void passOutShiftedByFour(const FourierTable& table, const float* lines, Frequencies f, float* carry,
                                        const LineColumns& to, bool isAhead) {
    lastStage<radix>(
        table, lines, f, to, isAhead, [&](ptrdiff_t y, const ComplexLine& a) __attribute__((always_inline)) {
            float *const row = rowOf(to, y), *const carried = carry + 4 * y;
            const __m128 behind = _mm_loadu_ps(carried), lastImaginary = _mm256_extractf128_ps(a.im.v, 1);
            _mm_storeu_ps(carried, _mm256_castps256_ps128(a.re.v));
            store(row, Vec<float>{_mm256_blend_ps(a.im.v, a.re.v, 0xF0)});
            store(row + kLineColumns,
                  Vec<float>{_mm256_insertf128_ps(_mm256_castps128_ps256(lastImaginary), behind, 1)});
        });
}

/// The stages behind the first and before the last, then the last, of blocks that fit a cache.
template <class Last>
void middleAndLast(const FourierTable& table, int32_t stage, float* lines, ptrdiff_t points, Frequencies f, Last last) {
    const int32_t end = table.stageCount - 1;
    for (; stage < end && points > line::kPointsAtOnce; ++stage) {
        const int32_t radix = table.stages[stage].radix;
        line::runStage(table, table.stages[stage], lines, 1);
        const ptrdiff_t part = points / radix;
        for (int32_t i = 1; i < radix; ++i)
            middleAndLast(table, stage + 1, lines + i * part * kLineFloats, part,
                          {f.first + f.apart * i, f.apart * radix}, last);
        points = part;
        f.apart *= radix;
    }
    for (; stage < end; ++stage) line::runStage(table, table.stages[stage], lines, points / table.stages[stage].length);
    last(f);
}

/// All stages; last(frequencies) does the last. The first radix is 8 or 4.
template <bool isExchanged, class Lanes, class Last>
void transformFused(const FourierTable& table, const LineColumns& from, float scale, float* lines, Last last) {
    const int32_t firstRadix = table.stages[0].radix;
    if (firstRadix == 8)
        passIn<8, isExchanged, Lanes>(from, scale, table, lines);
    else
        passIn<4, isExchanged, Lanes>(from, scale, table, lines);
    if (table.points <= line::kPointsAtOnce) return middleAndLast(table, 1, lines, table.points, {0, 1}, last);
    const ptrdiff_t part = table.points / firstRadix;
    for (int32_t i = 0; i < firstRadix; ++i)
        middleAndLast(table, 1, lines + i * part * kLineFloats, part, {i, firstRadix}, last);
}

template <class Lanes>
void transformFused(const FourierTable& table, const LineColumns& from, const LineColumns& to, float scale, Parts parts,
                    float* lines) {
    const bool isAhead = areAskedFor(from, to);
    if (parts == Parts::inOrder)
        transformFused<false, Lanes>(table, from, scale, lines,
                                     [&](Frequencies f) { passOut<8, false, Lanes>(table, lines, f, to, isAhead); });
    else
        transformFused<true, Lanes>(table, from, scale, lines,
                                    [&](Frequencies f) { passOut<8, true, Lanes>(table, lines, f, to, isAhead); });
}

bool isWhole(const LineColumns& columns) {
    return columns.begin == 0 && columns.end == kLineColumns && columns.rows.processed == columns.rows.channels;
}

/// Powers of two from 32 on, and their products with others where those come in between.
bool isFusible(const FourierTable& table) {
    const int32_t stages = table.stageCount;
    return stages >= 2 && table.convolvedPoints == 1 && table.stages[stages - 1].radix == 8 &&
           (table.stages[0].radix == 8 || table.stages[0].radix == 4);
}

}  // namespace

void transformColumns(const FourierTable* table, const LineColumns& from, const LineColumns& to, float scale,
                      Parts parts, float* lines, float* work) {
    if (isWhole(from) && isWhole(to) && isFusible(*table)) {
        if (from.rows.channels == 1) return transformFused<PlainLanes>(*table, from, to, scale, parts, lines);
        if (from.rows.channels == 4) return transformFused<FourChannelLanes>(*table, from, to, scale, parts, lines);
    }
    columnsToLines(from, scale, parts, lines);
    transformLines(table, lines, work);
    linesToColumns(lines, table->positions(), parts, to);
}

bool areColumnsShiftable(const FourierTable* table, const LineColumns& columns) {
    const int channels = columns.rows.channels;
    return (channels == 1 || channels == 4) && isWhole(columns) && isFusible(*table);
}

void transformColumnsShifted(const FourierTable* table, const LineColumns& columns, float scale, float* carry,
                             float* lines) {
    const bool isAhead = areAskedFor(columns, columns);
    if (columns.rows.channels == 1)
        return transformFused<false, PlainLanes>(*table, columns, scale, lines, [&](Frequencies f) {
            passOutShifted<8>(*table, lines, f, carry, columns, isAhead);
        });
    transformFused<false, FourChannelLanes>(*table, columns, scale, lines, [&](Frequencies f) {
        passOutShiftedByFour<8>(*table, lines, f, carry, columns, isAhead);
    });
}

}  // namespace qori::kernels
