// SPDX-License-Identifier: Apache-2.0
#include "move_lines.h"

#include "channel_lanes.h"
#include "turned_rows.h"

namespace qori::kernels {
namespace {

constexpr int kRows = kLineColumns;

using qori::load, qori::store;

/// Where eight floats are as doubles: four of one part of a line, then four of the other.
template <class T>
struct WidePlace {
    T *first, *second;
};
QORI_INLINE void store(WidePlace<double> to, Vec<float> v) {
    _mm256_store_pd(to.first, _mm256_cvtps_pd(_mm256_castps256_ps128(v.v)));
    _mm256_store_pd(to.second, _mm256_cvtps_pd(_mm256_extractf128_ps(v.v, 1)));
}
QORI_INLINE Vec<float> load(WidePlace<const double> from) {
    const __m128 low = _mm256_cvtpd_ps(_mm256_load_pd(from.first));
    return {_mm256_insertf128_ps(_mm256_castps128_ps256(low), _mm256_cvtpd_ps(_mm256_load_pd(from.second)), 1)};
}
/// In floats, as between other places.
template <class T>
QORI_INLINE WidePlace<T> operator+(WidePlace<T> at, ptrdiff_t floats) {
    return {at.first + floats / 2, at.second + floats / 2};
}

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

/// Elements of all channels in their order from pixel `first` on: place(e) is where element e of the first channel
/// belongs, other channels are `apart` floats behind the one before. Called once for each.
template <class Place>
QORI_INLINE auto ofChannels(int channels, ptrdiff_t apart, ptrdiff_t first, Place place) {
    return [=, channel = 0, element = first](ptrdiff_t) mutable {
        const auto at = place(element) + channel * apart;
        if (++channel == channels) {
            channel = 0;
            ++element;
        }
        return at;
    };
}

/// Eight whole rows, four pixels at a time; each(element, vectors) of the next four elements. The pixels done.
template <int channels, class Each>
QORI_INLINE ptrdiff_t forFourPixels(ptrdiff_t n, ptrdiff_t apart, Each each) {
    ptrdiff_t x = 0;
    for (; x + 4 <= n; x += 4)
#pragma GCC unroll 4
        for (int g = 0; g < channels; ++g)
            each(
                x * channels + 4 * g, [=](auto place, int i) __attribute__((always_inline)) {
                    return place(x + (4 * g + i) / channels) + (4 * g + i) % channels * apart;
                });
    return x;
}

/// Elements from `first` on. Where rows end, the last one stands in for those that are not there: their lanes hold no
/// junk.
template <class Place>
QORI_INLINE void turnElementsIn(const LineRows& rows, ptrdiff_t first, ptrdiff_t elements, float scale, Place place) {
    const Vec<float> factor = splat(scale);
    for (ptrdiff_t e = first; e < elements; e += kRows) {
        Vec<float> v[kRows];
        for (int y = 0; y < kRows; ++y)
            v[y] = loadUpTo(rows.row(y < rows.count ? y : rows.count - 1) + e, elements - e) * factor;
        turn(v);
        for (int i = 0; i < kRows && e + i < elements; ++i) store(place(e + i), v[i]);
    }
}

template <int channels, class Place>
QORI_INLINE void turnPixelsIn(const LineRows& rows, ptrdiff_t n, float scale, ptrdiff_t apart, Place place) {
    const Vec<float> factor = splat(scale);
    const line::EightRows eight(rows);
    ptrdiff_t done = 0;
    if (rows.count >= kRows)
        done = forFourPixels<channels>(
            n, apart, [=](ptrdiff_t e, auto placeOf) __attribute__((always_inline)) {
                Vec<float> v[4];
                line::loadTurned(eight, e, v);
#pragma GCC unroll 4
                for (int i = 0; i < 4; ++i) store(placeOf(place, i), v[i] * factor);
            });
    turnElementsIn(rows, done * channels, n * channels, scale, ofChannels(channels, apart, done, place));
}

/// Of 4 channels the first three.
QORI_INLINE __m256i withoutFourth(__m256i lanes) {
    return _mm256_and_si256(lanes, _mm256_setr_epi32(-1, -1, -1, 0, -1, -1, -1, 0));
}

template <class Place>
QORI_INLINE void turnElementsOut(const LineRows& rows, ptrdiff_t first, ptrdiff_t elements, Place place) {
    for (ptrdiff_t e = first; e < elements; e += kRows) {
        Vec<float> v[kRows];
        for (int i = 0; i < kRows; ++i) v[i] = e + i < elements ? load(place(e + i)) : zero<float>();
        turn(v);
        const ptrdiff_t left = elements - e;
        const __m256i there = firstLanes<float>(left < kRows ? left : kRows).v;
        const __m256i lanes = rows.channels == rows.processed ? there : withoutFourth(there);
        for (int y = 0; y < kRows && y < rows.count; ++y) _mm256_maskstore_ps(rows.row(y) + e, lanes, v[y].v);
    }
}

template <int channels, class Place>
QORI_INLINE void turnPixelsOut(const LineRows& rows, ptrdiff_t n, ptrdiff_t apart, Place place) {
    const line::EightRows eight(rows);
    ptrdiff_t done = 0;
    if (line::isPlain(rows))
        done = forFourPixels<channels>(
            n, apart, [=](ptrdiff_t e, auto placeOf) __attribute__((always_inline)) {
                Vec<float> v[4];
#pragma GCC unroll 4
                for (int i = 0; i < 4; ++i) v[i] = load(placeOf(place, i));
                line::storeTurned(eight, e, v);
            });
    turnElementsOut(rows, done * channels, n * channels, ofChannels(channels, apart, done, place));
}

/// Of n elements of each channel; of a channel's lines there are `floats`.
template <class Place>
QORI_INLINE void turnRowsIn(const LineRows& rows, ptrdiff_t n, float scale, ptrdiff_t floats, Place place) {
    switch (rows.channels) {
        case 3: return turnPixelsIn<3>(rows, n, scale, floats, place);
        case 4: return turnPixelsIn<4>(rows, n, scale, floats, place);
        default: return turnPixelsIn<1>(rows, n, scale, floats, place);
    }
}

template <class Place>
QORI_INLINE void turnRowsOut(const LineRows& rows, ptrdiff_t n, ptrdiff_t floats, Place place) {
    switch (rows.channels) {
        case 3: return turnPixelsOut<3>(rows, n, floats, place);
        case 4: return turnPixelsOut<4>(rows, n, floats, place);
        default: return turnPixelsOut<1>(rows, n, floats, place);
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

/// Of columns that are read: each(elements, row), and what is read next in every row.
template <class Each>
QORI_INLINE void forEachRowRead(const LineColumns& columns, Each each) {
    const uint8_t* p = reinterpret_cast<const uint8_t*>(columns.rows.row(0) + columns.element);
    const ptrdiff_t ahead = columns.ahead * ptrdiff_t{sizeof(float)};
    for (ptrdiff_t y = 0; y < columns.rows.count; ++y, p += columns.rows.step) {
        if (ahead != 0) _mm_prefetch(reinterpret_cast<const char*>(p + ahead), _MM_HINT_T1);
        each(reinterpret_cast<const float*>(p), y);
    }
}

template <class Each>
QORI_INLINE void forEachRowOf(const LineColumns& columns, Each each) {
    uint8_t* p = reinterpret_cast<uint8_t*>(columns.rows.row(0) + columns.element);
    for (ptrdiff_t y = 0; y < columns.rows.count; ++y, p += columns.rows.step) each(reinterpret_cast<float*>(p), y);
}

}  // namespace

void rowsToLines(const LineRows& rows, ptrdiff_t elements, float scale, Parts parts, float* lines) {
    if (parts == Parts::inOrder)
        turnRowsIn(rows, elements, scale, elements * kRows, [=](ptrdiff_t e) { return lines + e * kRows; });
    else
        turnRowsIn(rows, elements, scale, elements * kRows, [=](ptrdiff_t e) { return lines + (e ^ 1) * kRows; });
}

void linesToRows(const float* lines, const int32_t* positions, ptrdiff_t elements, Parts parts, const LineRows& rows) {
    const int first = offsetOf(parts, 0);
    turnRowsOut(rows, elements, elements * kRows, [=](ptrdiff_t e) {
        return lines + ptrdiff_t{positions[e / 2]} * kLineFloats + (e % 2 == 0 ? first : kLineColumns - first);
    });
}

void rowsToPairs(const LineRows& rows, ptrdiff_t n, float scale, bool areAlone, float* lines) {
    const RowPair pair(rows);
    const auto to = [=](int offset) { return [=](ptrdiff_t e) { return lines + e * kLineFloats + offset; }; };
    turnRowsIn(pair.first, n, scale, n * kLineFloats, to(0));
    if (!areAlone) return turnRowsIn(pair.secondOrLast(), n, scale, n * kLineFloats, to(kLineColumns));
    for (ptrdiff_t e = 0; e < n * rows.channels; ++e) store(to(kLineColumns)(e), zero<float>());
}

void pairsToSpectra(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows) {
    const RowPair pair(rows);
    const auto from = [=](bool isMirrored) {
        return [=](ptrdiff_t e) {
            const PackedPlace place(e, n, isMirrored);
            return lines + ptrdiff_t{positions[place.line]} * kLineFloats + place.part * kLineColumns;
        };
    };
    turnRowsOut(pair.first, n, n * kLineFloats, from(false));
    if (pair.second.count > 0) turnRowsOut(pair.second, n, n * kLineFloats, from(true));
}

namespace {

/// Element e of eight rows.
QORI_INLINE Vec<float> turnedElement(line::EightRows rows, ptrdiff_t e) {
    alignas(kVectorBytes) float lanes[kRows];
    for (int y = 0; y < kRows; ++y) lanes[y] = *rows.at(y, e);
    return load(lanes);
}

/// Two times eight rows of one channel: their frequencies are put together where they are at hand.
void joinWholePairs(const RowPair& pair, ptrdiff_t n, float scale, float* lines) {
    const line::EightRows first(pair.first), second(pair.second);
    const Vec<float> factor = splat(scale);
    const auto put = [=](ptrdiff_t k, const Vec<float>* a, const Vec<float>* b) {
        const ComplexLine x = {a[0] * factor, a[1] * factor}, y = {b[0] * factor, b[1] * factor};
        line::storeLine(lines + k * kLineFloats, ComplexLine{x.im + y.re, x.re - y.im});
        line::storeLine(lines + (n - k) * kLineFloats, ComplexLine{y.re - x.im, x.re + y.im});
    };
    line::storeLine(lines, ComplexLine{turnedElement(second, 0) * factor, turnedElement(first, 0) * factor});
    ptrdiff_t e = 1;
    for (; e + 4 <= n; e += 4) {
        Vec<float> a[4], b[4];
        line::loadTurned(first, e, a);
        line::loadTurned(second, e, b);
        put(e / 2 + 1, a, b);
        put(e / 2 + 2, a + 2, b + 2);
    }
    if (e == n) return;
    const Vec<float> a[2] = {turnedElement(first, e), turnedElement(first, e + 1)};
    const Vec<float> b[2] = {turnedElement(second, e), turnedElement(second, e + 1)};
    put(e / 2 + 1, a, b);
}

}  // namespace

void spectraToPairs(const LineRows& rows, ptrdiff_t n, float scale, bool areAlone, float* lines) {
    const RowPair pair(rows);
    if (rows.channels == 1 && rows.count == 2 * kRows && !areAlone) return joinWholePairs(pair, n, scale, lines);
    const auto to = [=](bool isMirrored) {
        return [=](ptrdiff_t e) {
            const PackedPlace place(e, n, isMirrored);
            return lines + ptrdiff_t{place.line} * kLineFloats + place.part * kLineColumns;
        };
    };
    turnRowsIn(pair.first, n, scale, n * kLineFloats, to(false));
    if (!areAlone)
        turnRowsIn(pair.secondOrLast(), n, scale, n * kLineFloats, to(true));
    else
        for (int c = 0; c < rows.processed; ++c)
            for (ptrdiff_t e = 0; e < n; ++e) store(to(true)(e) + c * n * kLineFloats, zero<float>());
    for (int c = 0; c < rows.processed; ++c) joinPairs(lines + c * n * kLineFloats, static_cast<int32_t>(n));
}

void pairsToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows) {
    const RowPair pair(rows);
    const auto from = [=](int offset) {
        return [=](ptrdiff_t e) { return lines + ptrdiff_t{positions[e]} * kLineFloats + offset; };
    };
    turnRowsOut(pair.first, n, n * kLineFloats, from(kLineColumns));
    if (pair.second.count > 0) turnRowsOut(pair.second, n, n * kLineFloats, from(0));
}

void rowsToWideLines(const LineRows& rows, ptrdiff_t n, float* lines) {
    turnRowsIn(rows, n, 1, n * kLineFloats, [=](ptrdiff_t e) {
        auto* const at = reinterpret_cast<double*>(lines + e * kLineFloats);
        return WidePlace<double>{at, at + 4};
    });
}

void wideLinesToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows) {
    turnRowsOut(rows, n, n * kLineFloats, [=](ptrdiff_t e) {
        const auto* const at = reinterpret_cast<const double*>(lines + ptrdiff_t{positions[e]} * kLineFloats);
        return WidePlace<const double>{at + 4, at};
    });
}

void spectraToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows) {
    const auto at = [=](ptrdiff_t k) { return lines + ptrdiff_t{positions[k]} * kLineFloats; };
    if (n % 2 == 0)
        return turnRowsOut(rows, n, n * kLineFloats, [=](ptrdiff_t e) { return at(e / 2) + e % 2 * kLineColumns; });
    turnRowsOut(rows, n, n * kLineFloats, [=](ptrdiff_t e) {
        const PackedPlace place(e, n, false);
        return at(place.line) + place.part * kLineColumns;
    });
}

void rowsToSpectra(const LineRows& rows, ptrdiff_t n, float* lines) {
    if (n % 2 == 0)
        return turnRowsIn(rows, n, 1, n * kLineFloats,
                          [=](ptrdiff_t e) { return lines + e / 2 * kLineFloats + e % 2 * kLineColumns; });
    turnRowsIn(rows, n, 1, n * kLineFloats, [=](ptrdiff_t e) {
        const PackedPlace place(e, n, false);
        return lines + ptrdiff_t{place.line} * kLineFloats + place.part * kLineColumns;
    });
}

void columnsToLines(const LineColumns& columns, float scale, Parts parts, float* lines) {
    const Vec<float> factor = splat(scale);
    const int channels = columns.rows.channels;
    const bool isWhole = columns.begin == 0 && columns.end == kLineColumns;
    if (channels == 1 && isWhole)
        return forEachRowRead(columns, [=](const float* p, ptrdiff_t y) {
            line::storeLine(lines + y * kLineFloats, scaled(line::separate(load(p), load(p + kRows)), factor, parts));
        });
    if (channels == 1) {
        const LaneMasks masks(columns.begin, columns.end);
        return forEachRowRead(columns, [=](const float* p, ptrdiff_t y) {
            const Vec<float> a{_mm256_maskload_ps(p, masks.low)}, b{_mm256_maskload_ps(p + kRows, masks.high)};
            line::storeLine(lines + y * kLineFloats, scaled(line::separate(a, b), factor, parts));
        });
    }
    line::withChannelLanes(columns, [&](auto lanes) {
        forEachRowRead(columns, [=](const float* p, ptrdiff_t y) {
            line::storeLine(lines + y * kLineFloats, scaled(lanes.read(p), factor, parts));
        });
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
    line::withChannelLanes(
        columns, [&](auto lanes) { forEachRowOf(columns, [=](float* p, ptrdiff_t y) { lanes.write(p, lineOf(y)); }); });
}

void splitRealColumns(const float* lines, const int32_t* positions, const LineRows& column, float* second) {
    const int32_t n = column.count;
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{positions[k]} * kLineFloats; };
    const auto put = [&](int32_t row, float first, float other) {
        *column.row(row) = first;
        second[row] = other;
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

void packRealColumn(const float* lines, const int32_t* positions, const LineRows& column) {
    const int32_t n = column.count;
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{positions[k]} * kLineFloats; };
    *column.row(0) = at(0)[0];
    for (int32_t k = 1; k < n - k; ++k) {
        *column.row(2 * k - 1) = at(k)[0];
        *column.row(2 * k) = at(k)[kLineColumns];
    }
    if (n % 2 == 0) *column.row(n - 1) = at(n / 2)[0];
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

void copyImaginary(const float* lines, const LineRows& column) {
    for (ptrdiff_t y = 0; y < column.count; ++y) *column.row(y) = lines[y * kLineFloats + kLineColumns];
}

void columnToFloats(const LineRows& column, float* out) {
    for (ptrdiff_t y = 0; y < column.count; ++y) out[y] = *column.row(y);
}

void floatsToColumn(const float* in, const LineRows& column) {
    for (ptrdiff_t y = 0; y < column.count; ++y) *column.row(y) = in[y];
}

}  // namespace qori::kernels
