// SPDX-License-Identifier: Apache-2.0
#include "move_lines.h"

#include "turned_rows.h"

namespace qori::kernels {
namespace {

constexpr int kRows = kLineColumns;

/// Eight rows become eight columns.
QORI_INLINE void turn(Vec<float> (&v)[kRows]) {
    for (int i = 0; i < 4; ++i) {
        const __m256 low = _mm256_permute2f128_ps(v[i].v, v[i + 4].v, 0x20);
        v[i + 4] = {_mm256_permute2f128_ps(v[i].v, v[i + 4].v, 0x31)};
        v[i] = {low};
    }
    Vec<float> first[4] = {v[0], v[1], v[2], v[3]}, second[4] = {v[4], v[5], v[6], v[7]};
    line::turnHalves(first);
    line::turnHalves(second);
    for (int i = 0; i < 4; ++i) {
        v[i] = first[i];
        v[i + 4] = second[i];
    }
}

/// Indices of eight elements of a channel.
QORI_INLINE __m256i indices(int apart) {
    return _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(apart));
}

/// The first n of eight elements `apart` floats from each other, zeros behind them.
QORI_INLINE Vec<float> loadApart(const float* p, int apart, ptrdiff_t n) {
    if (apart == 1) return loadUpTo(p, n);
    const __m256 mask = _mm256_castsi256_ps(firstLanes<float>(n < kRows ? n : kRows).v);
    return {_mm256_mask_i32gather_ps(_mm256_setzero_ps(), p, indices(apart), mask, 4)};
}

QORI_INLINE void storeApart(float* p, int apart, Vec<float> a, ptrdiff_t n) {
    if (apart == 1) return storeUpTo(p, a, n);
    float elements[kRows];
    store(elements, a);
    for (ptrdiff_t i = 0; i < n && i < kRows; ++i) p[i * apart] = elements[i];
}

/// Where rows end, the last one stands in for those that are not there: their lanes hold no junk.
template <class Place>
QORI_INLINE void turnRowsIn(const LineRows& rows, ptrdiff_t elements, float scale, Place place) {
    const Vec<float> factor = splat(scale);
    ptrdiff_t e = 0;
    const line::EightRows eight(rows);
    if (line::isPlain(rows))
        for (; e + 4 <= elements; e += 4) {
            Vec<float> v[4];
            line::loadTurned(eight, e, v);
            for (int i = 0; i < 4; ++i) store(place(e + i), v[i] * factor);
        }
    for (; e < elements; e += kRows) {
        Vec<float> v[kRows];
        for (int y = 0; y < kRows; ++y)
            v[y] = loadApart(rows.row(y < rows.count ? y : rows.count - 1) + e * rows.channels, rows.channels,
                             elements - e) *
                   factor;
        turn(v);
        for (int i = 0; i < kRows && e + i < elements; ++i) store(place(e + i), v[i]);
    }
}

template <class Place>
QORI_INLINE void turnRowsOut(const LineRows& rows, ptrdiff_t elements, Place place) {
    ptrdiff_t e = 0;
    const line::EightRows eight(rows);
    if (line::isPlain(rows))
        for (; e + 4 <= elements; e += 4) {
            Vec<float> v[4];
            for (int i = 0; i < 4; ++i) v[i] = load(place(e + i));
            line::storeTurned(eight, e, v);
        }
    for (; e < elements; e += kRows) {
        Vec<float> v[kRows];
        for (int i = 0; i < kRows; ++i) v[i] = e + i < elements ? load(place(e + i)) : zero<float>();
        turn(v);
        for (int y = 0; y < kRows && y < rows.count; ++y)
            storeApart(rows.row(y) + e * rows.channels, rows.channels, v[y], elements - e);
    }
}

/// The eight rows of each part of a pair; the second may have none, and repeats the first's last then.
struct RowPair {
    LineRows first, second;

    explicit RowPair(const LineRows& rows) : first(rows), second(rows) {
        if (rows.count <= kRows) {
            second.first += (rows.count - 1) * rows.step;
            second.count = 0;
        } else {
            first.count = kRows;
            second.first += kRows * rows.step;
            second.count = rows.count - kRows;
        }
    }
    LineRows secondOrLast() const {
        LineRows rows = second;
        if (rows.count == 0) rows.count = 1;
        return rows;
    }
};

/// Where element e of a packed spectrum of odd length belongs: a line by its frequency, and a part.
struct PackedPlace {
    int32_t line;
    int part;

    QORI_INLINE PackedPlace(ptrdiff_t e, ptrdiff_t n, bool isMirrored) {
        const ptrdiff_t k = (e + 1) / 2;
        line = static_cast<int32_t>(isMirrored && k > 0 ? n - k : k);
        part = e == 0 ? isMirrored : e % 2 == 0;
    }
};

constexpr int offsetOf(Parts parts, ptrdiff_t part) {
    return (part != 0) != (parts == Parts::exchanged) ? kLineColumns : 0;
}

QORI_INLINE ComplexLine scaled(ComplexLine a, Vec<float> factor, Parts parts) {
    a = {a.re * factor, a.im * factor};
    return parts == Parts::inOrder ? a : ComplexLine{a.im, a.re};
}
QORI_INLINE ComplexLine ordered(ComplexLine a, Parts parts) {
    return parts == Parts::inOrder ? a : ComplexLine{a.im, a.re};
}

/// Of sixteen elements those of lanes begin to end.
struct LaneMasks {
    __m256i low, high;

    LaneMasks(int begin, int end) {
        const auto between = [](int from, int to) {
            const auto within = [](int n) { return n < 0 ? 0 : n > kRows ? kRows : n; };
            return _mm256_andnot_si256(firstLanes<float>(within(from)).v, firstLanes<float>(within(to)).v);
        };
        low = between(2 * begin, 2 * end);
        high = between(2 * begin - kRows, 2 * end - kRows);
    }
};

template <class Each>
QORI_INLINE void forEachRowOf(const LineColumns& columns, Each each) {
    uint8_t* p = reinterpret_cast<uint8_t*>(columns.rows.row(0) + columns.element * columns.rows.channels);
    for (ptrdiff_t y = 0; y < columns.rows.count; ++y, p += columns.rows.step) each(reinterpret_cast<float*>(p), y);
}

}  // namespace

void rowsToLines(const LineRows& rows, ptrdiff_t elements, float scale, Parts parts, float* lines) {
    if (parts == Parts::inOrder)
        turnRowsIn(rows, elements, scale, [=](ptrdiff_t e) { return lines + e * kRows; });
    else
        turnRowsIn(rows, elements, scale, [=](ptrdiff_t e) { return lines + (e ^ 1) * kRows; });
}

void linesToRows(const float* lines, const int32_t* positions, ptrdiff_t elements, Parts parts, const LineRows& rows) {
    const int first = offsetOf(parts, 0);
    turnRowsOut(rows, elements, [=](ptrdiff_t e) {
        return lines + ptrdiff_t{positions[e / 2]} * kLineFloats + (e % 2 == 0 ? first : kLineColumns - first);
    });
}

void rowsToPairs(const LineRows& rows, ptrdiff_t n, float scale, float* lines) {
    const RowPair pair(rows);
    turnRowsIn(pair.first, n, scale, [=](ptrdiff_t e) { return lines + e * kLineFloats; });
    turnRowsIn(pair.secondOrLast(), n, scale, [=](ptrdiff_t e) { return lines + e * kLineFloats + kLineColumns; });
}

void pairsToSpectra(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows) {
    const RowPair pair(rows);
    const auto from = [=](bool isMirrored) {
        return [=](ptrdiff_t e) {
            const PackedPlace place(e, n, isMirrored);
            return lines + ptrdiff_t{positions[place.line]} * kLineFloats + place.part * kLineColumns;
        };
    };
    turnRowsOut(pair.first, n, from(false));
    if (pair.second.count > 0) turnRowsOut(pair.second, n, from(true));
}

void spectraToPairs(const LineRows& rows, ptrdiff_t n, float scale, float* lines) {
    const RowPair pair(rows);
    const auto to = [=](bool isMirrored) {
        return [=](ptrdiff_t e) {
            const PackedPlace place(e, n, isMirrored);
            return lines + ptrdiff_t{place.line} * kLineFloats + place.part * kLineColumns;
        };
    };
    turnRowsIn(pair.first, n, scale, to(false));
    turnRowsIn(pair.secondOrLast(), n, scale, to(true));
}

void pairsToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows) {
    const RowPair pair(rows);
    const auto from = [=](int offset) {
        return [=](ptrdiff_t e) { return lines + ptrdiff_t{positions[e]} * kLineFloats + offset; };
    };
    turnRowsOut(pair.first, n, from(kLineColumns));
    if (pair.second.count > 0) turnRowsOut(pair.second, n, from(0));
}

void columnsToLines(const LineColumns& columns, float scale, Parts parts, float* lines) {
    const Vec<float> factor = splat(scale);
    const int channels = columns.rows.channels;
    const bool isWhole = columns.begin == 0 && columns.end == kLineColumns;
    if (channels == 1 && isWhole)
        return forEachRowOf(columns, [=](const float* p, ptrdiff_t y) {
            line::storeLine(lines + y * kLineFloats, scaled(line::separate(load(p), load(p + kRows)), factor, parts));
        });
    if (channels == 1) {
        const LaneMasks masks(columns.begin, columns.end);
        return forEachRowOf(columns, [=](const float* p, ptrdiff_t y) {
            const Vec<float> a{_mm256_maskload_ps(p, masks.low)}, b{_mm256_maskload_ps(p + kRows, masks.high)};
            line::storeLine(lines + y * kLineFloats, scaled(line::separate(a, b), factor, parts));
        });
    }
    const __m256i places = indices(2 * channels);
    const __m256 mask =
        _mm256_castsi256_ps(_mm256_andnot_si256(firstLanes<float>(columns.begin).v, firstLanes<float>(columns.end).v));
    forEachRowOf(columns, [=](const float* p, ptrdiff_t y) {
        const Vec<float> re{_mm256_mask_i32gather_ps(_mm256_setzero_ps(), p, places, mask, 4)};
        const Vec<float> im{_mm256_mask_i32gather_ps(_mm256_setzero_ps(), p + channels, places, mask, 4)};
        line::storeLine(lines + y * kLineFloats, scaled({re, im}, factor, parts));
    });
}

void linesToColumns(const float* lines, const int32_t* positions, Parts parts, const LineColumns& columns) {
    const int channels = columns.rows.channels;
    const auto lineOf = [=](ptrdiff_t y) {
        return ordered(line::loadLine(lines + ptrdiff_t{positions[y]} * kLineFloats), parts);
    };
    if (channels == 1 && columns.begin == 0 && columns.end == kLineColumns)
        return forEachRowOf(columns, [=](float* p, ptrdiff_t y) {
            Vec<float> a, b;
            line::interleave(lineOf(y), a, b);
            store(p, a);
            store(p + kRows, b);
        });
    if (channels == 1) {
        const LaneMasks masks(columns.begin, columns.end);
        return forEachRowOf(columns, [=](float* p, ptrdiff_t y) {
            Vec<float> a, b;
            line::interleave(lineOf(y), a, b);
            _mm256_maskstore_ps(p, masks.low, a.v);
            _mm256_maskstore_ps(p + kRows, masks.high, b.v);
        });
    }
    forEachRowOf(columns, [=](float* p, ptrdiff_t y) {
        float elements[kLineFloats];
        line::storeLine(elements, lineOf(y));
        for (int lane = columns.begin; lane < columns.end; ++lane) {
            p[2 * lane * channels] = elements[lane];
            p[(2 * lane + 1) * channels] = elements[lane + kLineColumns];
        }
    });
}

void splitRealColumns(const float* lines, const int32_t* positions, const LineRows& column, float* second) {
    const int32_t n = column.count;
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{positions[k]} * kLineFloats; };
    const auto put = [&](int32_t row, float first, float other) {
        *column.row(row) = first;
        if (second != nullptr) second[row] = other;
    };
    put(0, at(0)[0], at(0)[kLineColumns]);
    for (int32_t k = 1; k < n - k; ++k) {
        const float *const z = at(k), *const y = at(n - k);
        const float re = z[0], im = z[kLineColumns], mirroredRe = y[0], mirroredIm = y[kLineColumns];
        put(2 * k - 1, (re + mirroredRe) * 0.5f, (im + mirroredIm) * 0.5f);
        put(2 * k, (im - mirroredIm) * 0.5f, (mirroredRe - re) * 0.5f);
    }
    if (n % 2 == 0) put(n - 1, at(n / 2)[0], at(n / 2)[kLineColumns]);
}

void joinRealColumns(const LineRows& column, const float* second, float scale, float* lines) {
    const int32_t n = column.count;
    const auto first = [&](int32_t row) { return *column.row(row) * scale; };
    const auto other = [&](int32_t row) { return second == nullptr ? 0 : second[row] * scale; };
    const auto put = [=](int32_t k, float re, float im) {
        lines[ptrdiff_t{k} * kLineFloats] = im;
        lines[ptrdiff_t{k} * kLineFloats + kLineColumns] = re;
    };
    put(0, first(0), other(0));
    for (int32_t k = 1; k < n - k; ++k) {
        const float re = first(2 * k - 1), im = first(2 * k), otherRe = other(2 * k - 1), otherIm = other(2 * k);
        put(k, re - otherIm, im + otherRe);
        put(n - k, re + otherIm, otherRe - im);
    }
    if (n % 2 == 0) put(n / 2, first(n - 1), other(n - 1));
}

void joinRealColumn(const LineRows& column, float scale, float* lines) {
    for (ptrdiff_t y = 0; y < column.count; ++y) {
        lines[y * kLineFloats] = *column.row(y) * scale;
        lines[y * kLineFloats + kLineColumns] = 0;
    }
}

void storeRealColumn(const float* lines, const int32_t* positions, const LineRows& column) {
    for (ptrdiff_t y = 0; y < column.count; ++y)
        *column.row(y) = lines[ptrdiff_t{positions[y]} * kLineFloats + kLineColumns];
}

void columnToFloats(const LineRows& column, float* out) {
    for (ptrdiff_t y = 0; y < column.count; ++y) out[y] = *column.row(y);
}

void floatsToColumn(const float* in, const LineRows& column) {
    for (ptrdiff_t y = 0; y < column.count; ++y) *column.row(y) = in[y];
}

}  // namespace qori::kernels
