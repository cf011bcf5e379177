// SPDX-License-Identifier: Apache-2.0
// Weighted sums over the windows of a region, by Taps (filter_taps.h), and what becomes of them, by Finish. The sums of
// a few rows at a time lie on the stack between the two.
#pragma once
#include "filter_taps.h"
#include "frame/border.h"

namespace qori::kernels {

/// A kernel as the sums want it: its coefficients from the last to the first, row by row, taps of one or two pixels,
/// each Taps::repeats times.
template <class Taps>
struct PackedKernel {
    const typename Taps::Coefficient* coefficients;
    QorImageSize size;
    typename Taps::Sum start;  ///< What a sum begins with.

    int taps() const { return (size.width + Taps::pixels - 1) / Taps::pixels; }
    bool endsAlone() const { return size.width % Taps::pixels != 0; }
    ptrdiff_t rowCoefficients() const { return ptrdiff_t{taps()} * Taps::repeats; }
};

/// Output rows that share the loads of the source rows between them, as many as the registers hold sums for.
#if defined(__i386__)
inline constexpr int kBandRows = 2;
#else
inline constexpr int kBandRows = 4;
#endif

/// Elements whose sums are made before they are finished; a last chunk takes up to one block more, so that no chunk but
/// that of a narrow region is smaller than a block.
inline constexpr int kChunk = 256;

template <class Taps>
struct ChunkSums {
    static constexpr int slots = kChunk / Taps::block + 1;
    typename Taps::Sum row[kBandRows][slots][2];
};

/// Turns the sums of a row into `elements` of dst. The last slot holds the sums of the last whole block of the row, or
/// of all its elements where they are fewer.
template <class Sum>
struct Finish {
    void (*row)(const void* rule, const Sum (*slots)[2], uint8_t* dst, ptrdiff_t elements);
    const void* rule;
};

namespace detail {

/// Adds one source row to the sums of the outputs `first` to `last` of a band; c is the row of the kernel that the
/// first of them sees, and each further one sees the row before.
template <class Taps, int first, int last, int rows, class Load>
QORI_INLINE void addSourceRow(typename Taps::Sum (&sums)[rows][2], const typename Taps::Source* p, ptrdiff_t pixel,
                              const typename Taps::Coefficient* c, ptrdiff_t rowCoefficients, int taps,
                              const Load& load) {
    for (int t = 0; t < taps; ++t) {
        typename Taps::Sum v[2];
        load(p, t == taps - 1, v);
#pragma GCC unroll 4
        for (int r = first; r <= last; ++r) {
            const auto k = Taps::broadcast(c - (r - first) * rowCoefficients);
            sums[r][0] = Taps::add(sums[r][0], v[0], k);
            sums[r][1] = Taps::add(sums[r][1], v[1], k);
        }
        p += Taps::pixels * pixel;
        c += Taps::repeats;
    }
}

/// The sums of one block in `rows` rows, of a kernel at least as high.
template <class Taps, int rows, class Load>
QORI_INLINE void sumBlock(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                          ptrdiff_t pixel, const Load& load, typename Taps::Sum (&sums)[rows][2]) {
    for (int r = 0; r < rows; ++r) sums[r][0] = sums[r][1] = kernel.start;
    const ptrdiff_t row = kernel.rowCoefficients();
    const int taps = kernel.taps(), height = kernel.size.height;
    const typename Taps::Coefficient* c = kernel.coefficients;
    const auto add = [&]<int first, int last>() {
        addSourceRow<Taps, first, last>(sums, p, pixel, c, row, taps, load);
        p = advance(p, step);
    };
    // Source row s meets kernel row s - r in output r: fewer outputs at both ends of the window.
    if constexpr (rows >= 2) add.template operator()<0, 0>(), c += row;
    if constexpr (rows >= 3) add.template operator()<0, 1>(), c += row;
    if constexpr (rows >= 4) add.template operator()<0, 2>(), c += row;
    for (int s = rows - 1; s < height; ++s) add.template operator()<0, rows - 1>(), c += row;
    c -= row;
    if constexpr (rows >= 2) add.template operator()<1, rows - 1>();
    if constexpr (rows >= 3) add.template operator()<2, rows - 1>();
    if constexpr (rows >= 4) add.template operator()<3, rows - 1>();
}

template <class Taps, int rows>
QORI_NOINLINE void sumBlocksFreely(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                                   ptrdiff_t pixel, ptrdiff_t blocks, ptrdiff_t slot, ChunkSums<Taps>& out) {
    const typename Taps::Free free(pixel);
    const auto load = [&](const typename Taps::Source* at, bool, typename Taps::Sum(&v)[2]) { free(at, v); };
    for (const ptrdiff_t end = slot + blocks; slot < end; ++slot, p += Taps::block) {
        typename Taps::Sum sums[rows][2];
        sumBlock<Taps, rows>(kernel, p, step, pixel, load, sums);
        for (int r = 0; r < rows; ++r)
            for (int k = 0; k < 2; ++k) out.row[r][slot][k] = sums[r][k];
    }
}

/// The first n elements of a block, which nothing else is read for.
template <class Taps>
QORI_NOINLINE void sumBlockExactly(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                                   ptrdiff_t pixel, ptrdiff_t n, typename Taps::Sum (&out)[2]) {
    const bool endsAlone = kernel.endsAlone();
    const auto load = [=](const typename Taps::Source* at, bool isLast, typename Taps::Sum(&v)[2]) {
        Taps::loadExactly(at, isLast && endsAlone ? nullptr : at + pixel, n, v);
    };
    typename Taps::Sum sums[1][2];
    sumBlock<Taps, 1>(kernel, p, step, pixel, load, sums);
    out[0] = sums[0][0];
    out[1] = sums[0][1];
}

/// Sums of `elements` in `rows` rows; blocks that end within `readable` elements may be loaded freely.
template <class Taps, int rows>
void sumChunk(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step, ptrdiff_t pixel,
              ptrdiff_t elements, ptrdiff_t readable, ChunkSums<Taps>& out) {
    constexpr ptrdiff_t block = Taps::block;
    const ptrdiff_t whole = elements / block, all = whole + (elements % block > 0);
    const ptrdiff_t freely = std::min(whole, readable > 0 ? readable / block : 0);
    if (freely > 0) sumBlocksFreely<Taps, rows>(kernel, p, step, pixel, freely, 0, out);
    for (ptrdiff_t slot = freely; slot < all; ++slot) {
        const ptrdiff_t at = slot < whole ? slot * block : std::max<ptrdiff_t>(elements - block, 0);
        if (at + block <= readable) {
            sumBlocksFreely<Taps, rows>(kernel, p + at, step, pixel, 1, slot, out);
            continue;
        }
        for (int r = 0; r < rows; ++r)
            sumBlockExactly(kernel, advance(p + at, r * step), step, pixel, std::min(block, elements - at),
                            out.row[r][slot]);
    }
}

template <class Taps, int rows>
void filterBand(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step, ptrdiff_t pixel,
                ptrdiff_t elements, ptrdiff_t readable, Finish<typename Taps::Sum> finish, uint8_t* dst,
                ptrdiff_t dstStep, ptrdiff_t dstElementBytes, ChunkSums<Taps>& sums) {
    for (ptrdiff_t x = 0; x < elements;) {
        const ptrdiff_t rest = elements - x, chunk = rest < kChunk + Taps::block ? rest : kChunk;
        sumChunk<Taps, rows>(kernel, p + x, step, pixel, chunk, readable - x, sums);
        for (int r = 0; r < rows; ++r)
            finish.row(finish.rule, sums.row[r], dst + r * dstStep + x * dstElementBytes, chunk);
        x += chunk;
    }
}

}  // namespace detail

/// Filters rows of elements whose windows begin at p; slack elements may be read behind the last window of a row.
template <class Taps>
void filterRows(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step, int channels,
                ptrdiff_t elements, ptrdiff_t rows, ptrdiff_t slack, Finish<typename Taps::Sum> finish, uint8_t* dst,
                ptrdiff_t dstStep, ptrdiff_t dstElementBytes) {
    ChunkSums<Taps> sums;
    // A block whose window and overread end within reach may be loaded freely; the last may hold elements in vain.
    const ptrdiff_t readable = elements + slack - Taps::overread;
    const auto band = [&]<int n>() {
        for (; rows >= n && kernel.size.height >= n; rows -= n) {
            detail::filterBand<Taps, n>(kernel, p, step, channels, elements, readable, finish, dst, dstStep,
                                        dstElementBytes, sums);
            p = advance(p, n * step);
            dst += n * dstStep;
        }
    };
    if constexpr (kBandRows >= 4) band.template operator()<4>(), band.template operator()<3>();
    band.template operator()<2>();
    band.template operator()<1>();
}

}  // namespace qori::kernels
