// SPDX-License-Identifier: Apache-2.0
#include "short_rows.h"

#include <initializer_list>

#include "passes.h"
#include "roots.h"

namespace qori::kernels {
namespace {

using Line = ComplexLineOf<double>;

constexpr int kLineDoubles = kLineBytes / 8;

// --- tables ---------------------------------------------------------------------------------------------------------

/// Odd primes from the largest, then a 2 or 4s, then 8s.
int32_t nextRadix(int32_t n) {
    for (int32_t prime : {13, 11, 7, 5, 3})
        if (n % prime == 0) return prime;
    return n == 2 ? 2 : n == 8 || n == 64 ? 8 : 4;
}

struct ShortRowLayout {
    ShortRowTable table{};
    int64_t bytes = (sizeof(ShortRowTable) + 63) / 64 * 64;

    explicit ShortRowLayout(int32_t n) {
        table.points = n;
        for (int32_t left = n; left > 1;) {
            ShortRowTable::Stage& stage = table.stages[table.stageCount++];
            stage.radix = nextRadix(left);
            stage.part = left / stage.radix;
            stage.turns = add(stage.radix % 2 == 1 ? stage.radix / 2 : 0);
            stage.twiddles = add(stage.part > 1 ? stage.part * (stage.radix - 1) : 0);
            left = stage.part;
        }
    }

private:
    int32_t add(int32_t roots) {
        const auto offset = static_cast<int32_t>(bytes);
        bytes += roots * int64_t{sizeof(Root)};
        return offset;
    }
};

// --- passes ---------------------------------------------------------------------------------------------------------

template <int radix>
void passOf(double* lines, ptrdiff_t blocks, ptrdiff_t part, const double* turns, const double* twiddles) {
    if (part == 1)
        line::passBlocks<radix, false>(lines, blocks, 1, turns, twiddles);
    else
        line::passBlocks<radix, true>(lines, blocks, part, turns, twiddles);
}

void transform(const ShortRowTable& table, double* lines) {
    ptrdiff_t blocks = 1;
    for (int32_t i = 0; i < table.stageCount; ++i) {
        const ShortRowTable::Stage& stage = table.stages[i];
        const auto *const turns = table.at<double>(stage.turns), *const twiddles = table.at<double>(stage.twiddles);
        switch (stage.radix) {
            case 2: passOf<2>(lines, blocks, stage.part, turns, twiddles); break;
            case 3: passOf<3>(lines, blocks, stage.part, turns, twiddles); break;
            case 4: passOf<4>(lines, blocks, stage.part, turns, twiddles); break;
            case 5: passOf<5>(lines, blocks, stage.part, turns, twiddles); break;
            case 7: passOf<7>(lines, blocks, stage.part, turns, twiddles); break;
            case 8: passOf<8>(lines, blocks, stage.part, turns, twiddles); break;
            case 11: passOf<11>(lines, blocks, stage.part, turns, twiddles); break;
            default: passOf<13>(lines, blocks, stage.part, turns, twiddles);
        }
        blocks *= stage.radix;
    }
}

// --- spectra --------------------------------------------------------------------------------------------------------

QORI_INLINE Vec<float> narrow(Vec<double> low, Vec<double> high) {
    return {_mm256_insertf128_ps(_mm256_castps128_ps256(_mm256_cvtpd_ps(low.v)), _mm256_cvtpd_ps(high.v), 1)};
}
QORI_INLINE Line widen(Vec<float> v) {
    return {{_mm256_cvtps_pd(_mm256_castps256_ps128(v.v))}, {_mm256_cvtps_pd(_mm256_extractf128_ps(v.v, 1))}};
}

/// The line at k and its mirror, four lanes at a time, as doubles: each(x, y, root) makes two lines of two. From memory
/// and to it, where halves of vectors cost no shuffle.
template <class Each>
QORI_INLINE void forWideHalves(float* at, float* mirror, const double* root, Each each) {
    const auto take = [](const float* p) {
        return Line{{_mm256_cvtps_pd(_mm_load_ps(p))}, {_mm256_cvtps_pd(_mm_load_ps(p + kLineColumns))}};
    };
    const auto put = [](float* p, Line a) {
        _mm_store_ps(p, _mm256_cvtpd_ps(a.re.v));
        _mm_store_ps(p + kLineColumns, _mm256_cvtpd_ps(a.im.v));
    };
    const Vec<double> re = splat(root[0]), im = splat(root[1]);
    for (int lane = 0; lane < kLineColumns; lane += 4) {
        Line first, second;
        each(take(at + lane), take(mirror + lane), re, im, first, second);
        put(mirror + lane, second);
        put(at + lane, first);
    }
}

double* lineAt(double* lines, int32_t i) { return lines + ptrdiff_t{i} * kLineDoubles; }

/// Frequency k of eight rows to the line of their transform at k; frequency n / 2 has the imaginary part of 0.
void splitRows(const ShortRowTable& table, double scale, double* lines) {
    const int32_t n = table.points;
    const auto at = [=, &table](int32_t k) { return lineAt(lines, table.positions[k]); };
    const auto put = [=](int32_t k, Vec<float> re, Vec<float> im) {
        line::storeLine(reinterpret_cast<float*>(at(k)), ComplexLine{re, im});
    };
    const Vec<double> whole = splat(scale), half = splat(scale / 2);
    const Line ends = line::loadLine(at(0));
    const Line middle = n % 2 == 0 ? line::loadLine(at(n / 2)) : ends;
    put(0, narrow(ends.re * whole, ends.im * whole), narrow(middle.re * whole, middle.im * whole));
    for (int32_t k = 1; k < n - k; ++k) {
        const Line z = line::loadLine(at(k)), y = line::loadLine(at(n - k));
        put(k, narrow((z.re + y.re) * half, (z.im + y.im) * half), narrow((z.im - y.im) * half, (y.re - z.re) * half));
    }
}

/// From frequency k at line k to points whose transform is the rows, parts exchanged.
void joinRows(const ShortRowTable& table, double scale, double* lines) {
    const int32_t n = table.points;
    const Vec<double> factor = splat(scale);
    const auto take = [=](int32_t k, int part) {
        const Line a = widen(load(reinterpret_cast<const float*>(lineAt(lines, k)) + part * kLineColumns));
        return Line{a.re * factor, a.im * factor};
    };
    const auto put = [=](int32_t k, Vec<double> re, Vec<double> im) {
        line::storeLine(lineAt(lines, k), Line{im, re});
    };
    const Line first = take(0, 0), middle = take(0, n % 2 == 0);
    put(0, first.re, first.im);
    for (int32_t k = 1; k < n - k; ++k) {
        const Line re = take(k, 0), im = take(k, 1);
        put(k, re.re - im.im, im.re + re.im);
        put(n - k, re.re + im.im, re.im - im.re);
    }
    if (n % 2 == 0) put(n / 2, middle.re, middle.im);
}

/// Where a part of a frequency lies in a packed column of n elements, of an even n the last as imaginary part of the
/// first.
int32_t packedRow(int32_t n, int32_t k, int part) { return k > 0 ? 2 * k - 1 + part : part == 0 ? 0 : n - 1; }

/// Calls each(k, part) for those that a column has.
template <class Each>
void forEachPart(int32_t n, Each each) {
    each(0, 0);
    if (n % 2 == 0) each(0, 1);
    for (int32_t k = 1; k < n - k; ++k) {
        each(k, 0);
        each(k, 1);
    }
}

/// Lane 0 of the first four rows, and of the others.
template <class Each>
void forEachColumn(const ColumnPair& columns, Each each) {
    each(columns.first, 0);
    if (columns.second.count > 0) each(columns.second, 1);
}

template <class Each>
void forEachChannel(const ShortRowTable& table, const LineRows& rows, float* lines, Each each) {
    for (int c = 0; c < rows.processed; ++c)
        each(reinterpret_cast<double*>(lines + ptrdiff_t{c} * table.points * kLineFloats));
}

}  // namespace

int64_t shortRowTableBytes(int32_t n) { return ShortRowLayout(n).bytes; }

void makeShortRowTable(ShortRowTable* table, int32_t n) {
    *table = ShortRowLayout(n).table;
    const auto rootsAt = [=](int32_t offset) {
        return reinterpret_cast<Root*>(reinterpret_cast<uint8_t*>(table) + offset);
    };
    int32_t ratio = 1;
    for (int32_t i = 0; i < table->stageCount; ++i) {
        const auto [radix, part, turns, twiddles] = table->stages[i];
        Root* out = rootsAt(turns);
        for (int32_t q = 1; q <= radix / 2 && radix % 2 == 1; ++q) {
            const Root root = rootOfUnity(q, radix);
            *out++ = {root.re, -root.im};
        }
        out = rootsAt(twiddles);
        for (int32_t j = 0; j < part && part > 1; ++j)
            for (int32_t p = 1; p < radix; ++p) *out++ = rootOfUnity(j * p * ratio % n, n);
        ratio *= radix;
    }
    for (int32_t k = 0; k < n; ++k) {
        int32_t rest = k, position = 0;
        for (int32_t i = 0; i < table->stageCount; ++i) {
            position += rest % table->stages[i].radix * table->stages[i].part;
            rest /= table->stages[i].radix;
        }
        table->positions[k] = position;
    }
}

void makeWideHalfRoots(double* roots, int32_t n) {
    for (int32_t k = 0; k <= n / 4; ++k) {
        const Root root = rootOfUnity(k, n);
        *roots++ = root.re;
        *roots++ = root.im;
    }
}

void splitWideHalves(float* lines, int32_t n, const int32_t* positions, const double* roots) {
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{positions[k]} * kLineFloats; };
    line::storeLine(at(0), line::sumAndDifference(line::loadLine(at(0))));
    const Vec<double> half = splat(0.5);
    for (int32_t k = 1; k <= n / 2 - k; ++k)
        forWideHalves(at(k), at(n / 2 - k), roots + 2 * k,
                      [=](Line z, Line y, Vec<double> re, Vec<double> im, Line& x, Line& mirror) {
                          const Line even = {z.re + y.re, z.im - y.im};
                          const Line odd = line::times(Line{z.im + y.im, y.re - z.re}, re * half, im * half);
                          x = line::mulAdd(even, half, odd);
                          mirror = {line::mulSub(even.re, half, odd.re), line::negMulAdd(even.im, half, odd.im)};
                      });
}

void joinWideHalves(float* lines, int32_t n, const double* roots) {
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{k} * kLineFloats; };
    line::storeLine(at(0), line::joinEnds(line::loadLine(at(0))));
    for (int32_t k = 1; k <= n / 2 - k; ++k)
        forWideHalves(at(k), at(n / 2 - k), roots + 2 * k,
                      [](Line x, Line y, Vec<double> re, Vec<double> im, Line& z, Line& mirror) {
                          const Line even = {x.re + y.re, x.im - y.im};
                          const Line odd = line::times(Line{x.im + y.im, x.re - y.re}, re, im);
                          z = {even.im + odd.im, even.re - odd.re};
                          mirror = {odd.im - even.im, even.re + odd.re};
                      });
}

void shortRowsToSpectra(const ShortRowTable& table, const LineRows& src, float scale, float* lines,
                        const LineRows& dst) {
    rowsToWideLines(src, table.points, lines);
    forEachChannel(table, src, lines, [&](double* of) {
        transform(table, of);
        splitRows(table, double{scale}, of);
    });
    spectraToRows(lines, table.positions, table.points, dst);
}

void shortSpectraToRows(const ShortRowTable& table, const LineRows& rows, float scale, float* lines) {
    rowsToSpectra(rows, table.points, lines);
    forEachChannel(table, rows, lines, [&](double* of) {
        joinRows(table, double{scale}, of);
        transform(table, of);
    });
    wideLinesToRows(lines, table.positions, table.points, rows);
}

void shortColumnsToSpectra(const ShortRowTable& table, const ColumnPair& columns, float scale, float* lines) {
    auto* const wide = reinterpret_cast<double*>(lines);
    const int32_t n = table.points;
    for (int32_t i = 0; i < kLineDoubles * n; i += kLineDoubles / 2) store(wide + i, zero<double>());
    forEachColumn(columns, [=](const LineRows& column, int part) {
        for (int32_t y = 0; y < n; ++y) lineAt(wide, y)[part * kLineDoubles / 2] = double{*column.row(y)};
    });
    transform(table, wide);
    splitRows(table, double{scale}, wide);
    forEachColumn(columns, [=, &table](const LineRows& column, int which) {
        forEachPart(n, [=, &table](int32_t k, int part) {
            const auto* const at = reinterpret_cast<const float*>(lineAt(wide, table.positions[k]));
            *column.row(packedRow(n, k, part)) = at[part * kLineColumns + which * kLineColumns / 2];
        });
    });
}

void shortSpectraToColumns(const ShortRowTable& table, const ColumnPair& src, float scale, float* lines,
                           const ColumnPair& dst) {
    auto* const wide = reinterpret_cast<double*>(lines);
    const int32_t n = table.points;
    for (int32_t i = 0; i < kLineFloats * n; i += kLineColumns) store(lines + i, zero<float>());
    forEachColumn(src, [=](const LineRows& column, int which) {
        forEachPart(n, [=](int32_t k, int part) {
            lines[k * kLineFloats + part * kLineColumns + which * kLineColumns / 2] =
                *column.row(packedRow(n, k, part));
        });
    });
    joinRows(table, double{scale}, wide);
    transform(table, wide);
    forEachColumn(dst, [=, &table](const LineRows& column, int which) {
        for (int32_t y = 0; y < n; ++y)
            *column.row(y) = static_cast<float>(lineAt(wide, table.positions[y])[(1 - which) * kLineDoubles / 2]);
    });
}

}  // namespace qori::kernels
