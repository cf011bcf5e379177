// SPDX-License-Identifier: Apache-2.0
// Weighted sums over the windows of a region, by Taps (filter_taps.h), and what becomes of them, by Finish. The sums of
// a few rows at a time lie on the stack between the two.
#pragma once
#include "image/image.h"
#include "taps.h"

namespace qori::kernels {

/// A kernel as the sums want it: its coefficients from the last to the first, row by row, taps of one or two pixels,
/// each Taps::repeats times.
template <class Taps>
struct PackedKernel {
    const typename Taps::Coefficient* coefficients;
    QorImageSize size;
    typename Taps::Sum start;  ///< What a sum begins with.
    int32_t groups = 1;        ///< Parts of about as many rows each, that InGroups sums apart.

    /// The rows that are summed at once.
    int32_t leastRows() const { return size.height / groups; }

    int taps() const { return (size.width + Taps::pixels - 1) / Taps::pixels; }
    bool endsAlone() const { return size.width % Taps::pixels != 0; }
    ptrdiff_t rowCoefficients() const { return ptrdiff_t{taps()} * Taps::repeats; }
};

/// Elements whose sums are made before they are finished; a last chunk takes up to one block more, so that no chunk but
/// that of a narrow region is smaller than a block.
inline constexpr int kChunk = 256;

template <class Taps>
struct ChunkSums {
    static constexpr int slots = kChunk / Taps::block + 1;
    typename Taps::Sum row[Taps::bandRows][slots][2];
};
template <class Taps>
struct ChunkSums<InGroups<Taps>> : ChunkSums<Taps> {
    WideSum total[Taps::bandRows][ChunkSums<Taps>::slots][2];
};

/// Turns the sums of a row into `elements` of dst. The last slot holds the sums of the last whole block of the row, or
/// of all its elements where they are fewer.
template <class Sum>
struct Finish {
    void (*row)(const void* rule, const Sum (*slots)[2], uint8_t* dst, ptrdiff_t elements);
    const void* rule;
    bool isCopy;  ///< The sums are the elements.
};

namespace detail {

/// Calls body(first) to body(last) with constants: sums must not live in arrays that are walked. In one expression:
/// by recursion the compiler would take the last body through as many functions as there are bodies.
template <int first, class Body, int... i>
QORI_INLINE void forEachOf(const Body& body, std::integer_sequence<int, i...>) {
    (body(std::integral_constant<int, first + i>{}), ...);
}
template <int first, int last, class Body>
QORI_INLINE void forEach(const Body& body) {
    if constexpr (first <= last) forEachOf<first>(body, std::make_integer_sequence<int, last - first + 1>{});
}
#define QORI_LAMBDA __attribute__((always_inline))

/// Whether a tap may be added vector by vector.
template <class Taps, class Load>
constexpr bool takesVectors = requires(const Load& load, const typename Taps::Source* p) {
    load.vector(p, 0);
};

/// One vector of a tap, to the sums of `rows` rows.
template <class Taps, int first, int last, int rows, int wide, class Vector, class Scalar>
QORI_INLINE void addVector(typename Taps::Partial (&sums)[rows][wide], int i, Vector v, const Scalar (&k)[rows]) {
    loadOnce(v.v);
    if constexpr (first <= 0) Taps::add(sums[0][i / 2].v[i % 2], v, k[0]);
    if constexpr (first <= 1 && last >= 1) Taps::add(sums[1][i / 2].v[i % 2], v, k[1]);
    if constexpr (first <= 2 && last >= 2) Taps::add(sums[2][i / 2].v[i % 2], v, k[2]);
    if constexpr (first <= 3 && last >= 3) Taps::add(sums[3][i / 2].v[i % 2], v, k[3]);
}

/// One tap: the coefficients of all rows, then one vector after the other. Sums, coefficients and a vector are as many
/// as the registers; a vector that is kept waiting would be loaded again for every row.
template <class Taps, int first, int last, int rows, int wide, class Load>
QORI_INLINE void addVectors(typename Taps::Partial (&sums)[rows][wide], const typename Taps::Source* p,
                            const typename Taps::Coefficient* c, ptrdiff_t row, const Load& load) {
    static_assert(rows <= 4 && wide <= 2);
    decltype(Taps::broadcast(c)) k[rows];
    if constexpr (first <= 0) k[0] = Taps::broadcast(c - (0 - first) * row);
    if constexpr (first <= 1 && last >= 1) k[1] = Taps::broadcast(c - (1 - first) * row);
    if constexpr (first <= 2 && last >= 2) k[2] = Taps::broadcast(c - (2 - first) * row);
    if constexpr (first <= 3 && last >= 3) k[3] = Taps::broadcast(c - (3 - first) * row);
    addVector<Taps, first, last>(sums, 0, load.vector(p, 0), k);
    addVector<Taps, first, last>(sums, 1, load.vector(p, 1), k);
    if constexpr (wide == 2) {
        addVector<Taps, first, last>(sums, 2, load.vector(p, 2), k);
        addVector<Taps, first, last>(sums, 3, load.vector(p, 3), k);
    }
}

/// Adds one source row to the sums of the outputs `first` to `last` of a band; c is the row of the kernel that the
/// first of them sees, and each further one sees the row before. `count` taps, or as many as the kernel has where it is
/// 0.
template <class Taps, int first, int last, int count, int rows, int wide, class Load>
QORI_INLINE void addSourceRow(const PackedKernel<Taps>& kernel, typename Taps::Partial (&sums)[rows][wide],
                              const typename Taps::Source* p, ptrdiff_t pixel, const typename Taps::Coefficient* c,
                              const Load& load) {
    const int taps = count > 0 ? count : kernel.taps();
    const ptrdiff_t row = ptrdiff_t{taps} * Taps::repeats;
    const auto addTap = [&](bool isLast) QORI_LAMBDA {
        if constexpr (takesVectors<Taps, Load>) {
            addVectors<Taps, first, last>(sums, p, c, row, load);
        } else {
            typename Taps::Partial v[wide];
            forEach<0, wide - 1>([&](auto w) QORI_LAMBDA { load(p + w * Taps::block, isLast, v[w]); });
            forEach<first, last>([&](auto r) QORI_LAMBDA {
                const auto k = Taps::broadcast(c - (r - first) * row);
                forEach<0, 2 * wide - 1>([&](auto i)
                                             QORI_LAMBDA { Taps::add(sums[r][i / 2].v[i % 2], v[i / 2].v[i % 2], k); });
            });
        }
        p += Taps::pixels * pixel;
        c += Taps::repeats;
    };
    if constexpr (count > 0) {
#pragma GCC unroll 8
        for (int t = 0; t < count; ++t) addTap(t == count - 1);
        // Source rows that share coefficients would else share them through the stack.
        __asm__ volatile("" : : : "memory");
    } else {
        for (int t = 0; t < taps; ++t) addTap(t == taps - 1);
    }
}

/// The sums of `wide` blocks side by side in `rows` rows, of a kernel at least as high.
template <class Taps, int count, int rows, int wide, class Load>
QORI_INLINE void sumBlock(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                          ptrdiff_t pixel, const Load& load, typename Taps::Partial (&sums)[rows][wide]) {
    forEach<0, rows - 1>([&](auto r) QORI_LAMBDA {
        forEach<0, wide - 1>([&](auto w) QORI_LAMBDA { Taps::begin(sums[r][w], kernel.start); });
    });
    const ptrdiff_t row = kernel.rowCoefficients();
    const typename Taps::Coefficient* c = kernel.coefficients;
    const auto add = [&]<int first, int last>() QORI_LAMBDA {
        addSourceRow<Taps, first, last, count>(kernel, sums, p, pixel, c, load);
        p = advance(p, step);
    };
    // Source row s meets kernel row s - r in output r: fewer outputs at both ends of the window.
    if constexpr (rows >= 2) add.template operator()<0, 0>(), c += row;
    if constexpr (rows >= 3) add.template operator()<0, 1>(), c += row;
    if constexpr (rows >= 4) add.template operator()<0, 2>(), c += row;
    for (int s = rows - 1; s < kernel.size.height; ++s) add.template operator()<0, rows - 1>(), c += row;
    c -= row;
    if constexpr (rows >= 2) add.template operator()<1, rows - 1>();
    if constexpr (rows >= 3) add.template operator()<2, rows - 1>();
    if constexpr (rows >= 4) add.template operator()<3, rows - 1>();
}

/// Where the sums of a band's blocks go.
template <class Sum>
struct SumRows {
    uint8_t* first;  ///< The first block's in the first row.
    ptrdiff_t step;

    QORI_INLINE void put(int r, ptrdiff_t block, const Sum (&sums)[2]) const {
        using Element = std::remove_reference_t<decltype(*elementOf(sums[0]))>;
        auto* const at = reinterpret_cast<Element*>(first + r * step) + 2 * Sum::lanes * block;
        store(at, sums[0]);
        store(at + Sum::lanes, sums[1]);
    }
    template <class T>
    static T* elementOf(Vec<T>);
};

template <class Taps, int rows, int wide, int count>
QORI_NOINLINE void sumBlocks(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                             ptrdiff_t pixel, ptrdiff_t blocks, SumRows<typename Taps::Sum> out) {
    const typename Taps::Free load(pixel);
    for (ptrdiff_t b = 0; b + wide <= blocks; b += wide, p += wide * Taps::block) {
        typename Taps::Partial sums[rows][wide];
        sumBlock<Taps, count, rows, wide>(kernel, p, step, pixel, load, sums);
        forEach<0, rows - 1>([&](auto r) QORI_LAMBDA {
            forEach<0, wide - 1>([&](auto w) QORI_LAMBDA {
                typename Taps::Sum whole[2];
                Taps::end(sums[r][w], whole);
                out.put(r, b + w, whole);
            });
        });
    }
}

/// Kernels of three rows, three rows at a time: the coefficients stay in registers, which spares the load ports.
template <class Taps, int count>
QORI_NOINLINE void sumBlocksOfThree(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                                    ptrdiff_t pixel, ptrdiff_t blocks, SumRows<typename Taps::Sum> out) {
    const typename Taps::Free load(pixel);
    decltype(Taps::broadcast(kernel.coefficients)) held[3][count];
    for (int i = 0; i < 3 * count; ++i)
        held[i / count][i % count] = Taps::broadcast(kernel.coefficients + ptrdiff_t{i} * Taps::repeats);
    const auto start = kernel.start;
    for (ptrdiff_t b = 0; b < blocks; ++b, p += Taps::block) {
        typename Taps::Partial sums[3];
        forEach<0, 2>([&](auto r) QORI_LAMBDA { Taps::begin(sums[r], start); });
        forEach<0, 4>([&](auto s) QORI_LAMBDA {
            const auto* const row = advance(p, s * step);
            forEach<0, 2 * count - 1>([&](auto i) QORI_LAMBDA {
                auto v = load.vector(row + i / 2 * Taps::pixels * pixel, i % 2);
                loadOnce(v.v);
                forEach<(s > 2 ? s - 2 : 0), (s < 2 ? s : 2)>(
                    [&](auto r) QORI_LAMBDA { Taps::add(sums[r].v[i % 2], v, held[s - r][i / 2]); });
            });
        });
        forEach<0, 2>([&](auto r) QORI_LAMBDA {
            typename Taps::Sum whole[2];
            Taps::end(sums[r], whole);
            out.put(r, b, whole);
        });
    }
}

/// Common widths are unrolled where a type is worth it.
template <class Taps, int rows, int wide>
void sumBlocksOfWidth(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step, ptrdiff_t pixel,
                      ptrdiff_t blocks, SumRows<typename Taps::Sum> out) {
    if constexpr (Taps::unrolls && rows >= 3) {
        switch (kernel.taps()) {
            case 2: return sumBlocks<Taps, rows, wide, 2>(kernel, p, step, pixel, blocks, out);
            case 3: return sumBlocks<Taps, rows, wide, 3>(kernel, p, step, pixel, blocks, out);
            case 4: return sumBlocks<Taps, rows, wide, 4>(kernel, p, step, pixel, blocks, out);
            case 5: return sumBlocks<Taps, rows, wide, 5>(kernel, p, step, pixel, blocks, out);
            case 7: return sumBlocks<Taps, rows, wide, 7>(kernel, p, step, pixel, blocks, out);
            case 8: return sumBlocks<Taps, rows, wide, 8>(kernel, p, step, pixel, blocks, out);
            default: break;
        }
    }
    sumBlocks<Taps, rows, wide, 0>(kernel, p, step, pixel, blocks, out);
}

template <class Taps, int rows>
void sumBlocksFreely(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step, ptrdiff_t pixel,
                     ptrdiff_t blocks, SumRows<typename Taps::Sum> out) {
    if constexpr (rows == 3 && takesVectors<Taps, typename Taps::Free>) {
        constexpr int three = (3 + Taps::pixels - 1) / Taps::pixels;
        if (kernel.size.height == 3 && kernel.taps() == three)
            return sumBlocksOfThree<Taps, three>(kernel, p, step, pixel, blocks, out);
    }
    constexpr int wide = Taps::bandBlocks;
    const ptrdiff_t inWide = blocks - blocks % wide;
    if (inWide > 0) sumBlocksOfWidth<Taps, rows, wide>(kernel, p, step, pixel, inWide, out);
    if (inWide == blocks) return;
    out.first += inWide * Taps::block * ptrdiff_t{sizeof(typename Taps::Sum)} / Taps::Sum::lanes;
    sumBlocks<Taps, rows, 1, 0>(kernel, p + inWide * Taps::block, step, pixel, blocks - inWide, out);
}

/// The first n elements of a block, which nothing else is read for.
template <class Taps>
QORI_NOINLINE void sumBlockExactly(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step,
                                   ptrdiff_t pixel, ptrdiff_t n, typename Taps::Sum (&out)[2]) {
    const bool endsAlone = kernel.endsAlone();
    const auto load = [=](const typename Taps::Source* at, bool isLast, typename Taps::Partial& v)
                          QORI_LAMBDA { Taps::loadExactly(at, isLast && endsAlone ? nullptr : at + pixel, n, v); };
    typename Taps::Partial sums[1][1];
    sumBlock<Taps, 0>(kernel, p, step, pixel, load, sums);
    Taps::end(sums[0][0], out);
}

/// A piece of a band: the same rows, `elements` wide; blocks that end within `readable` elements may be loaded freely.
template <class Source, int block>
struct Chunk {
    const Source* window;
    ptrdiff_t step, pixel, elements, readable;
    uint8_t* dst;
    ptrdiff_t dstStep, dstElementBytes;

    /// One for each block and for the rest.
    ptrdiff_t slots() const { return (elements + block - 1) / block; }
};
template <class Taps>
using ChunkOf = Chunk<typename Taps::Source, Taps::block>;

/// The sums of a chunk, by slots; where `toDst`, those of its first blocks go there instead. Returns how many did.
template <class Taps, int rows>
QORI_INLINE ptrdiff_t sumChunk(const PackedKernel<Taps>& kernel, const ChunkOf<Taps>& chunk, bool toDst,
                               ChunkSums<Taps>& sums) {
    constexpr ptrdiff_t block = Taps::block;
    const auto [p, step, pixel, elements, readable, dst, dstStep, dstElementBytes] = chunk;
    const ptrdiff_t whole = elements / block, all = chunk.slots();
    const ptrdiff_t freely = std::min(whole, readable > 0 ? readable / block : 0);
    const auto slots = [&](ptrdiff_t slot) {
        return SumRows<typename Taps::Sum>{reinterpret_cast<uint8_t*>(sums.row[0][slot]), sizeof sums.row[0]};
    };
    if (freely > 0)
        sumBlocksFreely<Taps, rows>(kernel, p, step, pixel, freely,
                                    toDst ? SumRows<typename Taps::Sum>{dst, dstStep} : slots(0));
    for (ptrdiff_t slot = freely; slot < all; ++slot) {
        const ptrdiff_t at = slot < whole ? slot * block : std::max<ptrdiff_t>(elements - block, 0);
        if (at + block <= readable) {
            sumBlocksFreely<Taps, rows>(kernel, p + at, step, pixel, 1, slots(slot));
            continue;
        }
        for (int r = 0; r < rows; ++r)
            sumBlockExactly(kernel, advance(p + at, r * step), step, pixel, std::min(block, elements - at),
                            sums.row[r][slot]);
    }
    return toDst ? freely : 0;
}

template <class Taps, int rows>
void filterChunk(const PackedKernel<Taps>& kernel, const ChunkOf<Taps>& chunk, Finish<typename Taps::Sum> finish,
                 ChunkSums<Taps>& sums) {
    const ptrdiff_t done = sumChunk<Taps, rows>(kernel, chunk, finish.isCopy, sums);
    // Where the sums are the elements, whole blocks lie in dst already, and a last one may reach back over them.
    if (finish.isCopy && done == chunk.slots()) return;
    const ptrdiff_t first =
        finish.isCopy ? std::min(done * Taps::block, std::max<ptrdiff_t>(chunk.elements - Taps::block, 0)) : 0;
    for (int r = 0; r < rows; ++r)
        finish.row(finish.rule, sums.row[r] + done, chunk.dst + r * chunk.dstStep + first * chunk.dstElementBytes,
                   chunk.elements - first);
}

/// For InGroups, whose every rule would have it again.
template <class Taps, int rows>
QORI_NOINLINE void sumGroup(const PackedKernel<Taps>& kernel, const ChunkOf<Taps>& chunk, ChunkSums<Taps>& sums) {
    sumChunk<Taps, rows>(kernel, chunk, false, sums);
}

/// The sums of one group of rows to those of the groups before it; `start` is the total's, for the first.
template <int rows, class Taps>
QORI_NOINLINE void addGroup(ChunkSums<InGroups<Taps>>& sums, ptrdiff_t slots, bool isFirst, int32_t start) {
    const WideSum initial{{{_mm256_set1_epi32(start)}, {_mm256_set1_epi32(start)}}};
    for (int r = 0; r < rows; ++r)
        for (ptrdiff_t slot = 0; slot < slots; ++slot)
            for (int k = 0; k < 2; ++k) {
                const WideSum add = WideSum::of(sums.row[r][slot][k]);
                WideSum& total = sums.total[r][slot][k];
                const WideSum before = isFirst ? initial : total;
                for (int i = 0; i < 2; ++i) total.v[i].v = _mm256_add_epi32(before.v[i].v, add.v[i].v);
            }
}

template <class Grouped, int rows>
requires(!std::is_same_v<typename Grouped::Sum, typename Grouped::Total>)  //
    void filterChunk(const PackedKernel<Grouped>& kernel, const ChunkOf<Grouped>& chunk, Finish<WideSum> finish,
                     ChunkSums<Grouped>& sums) {
    using Taps = typename Grouped::Ungrouped;
    // Every group starts at the same 16 bits, which the total makes good, modulo 2^32 as all sums.
    const auto each = static_cast<int16_t>(_mm256_extract_epi16(kernel.start.v, 0));
    const auto start = static_cast<int32_t>(0u - static_cast<uint32_t>(kernel.groups) * static_cast<uint32_t>(each));
    int32_t y = 0;
    for (int32_t group = 0; group < kernel.groups; ++group) {
        const auto end = static_cast<int32_t>(int64_t{kernel.size.height} * (group + 1) / kernel.groups);
        const PackedKernel<Taps> part{
            kernel.coefficients + y * kernel.rowCoefficients(), {kernel.size.width, end - y}, kernel.start};
        ChunkOf<Taps> below = chunk;
        below.window = advance(chunk.window, y * chunk.step);
        sumGroup<Taps, rows>(part, below, sums);
        addGroup<rows>(sums, chunk.slots(), group == 0, start);
        y = end;
    }
    for (int r = 0; r < rows; ++r)
        finish.row(finish.rule, sums.total[r], chunk.dst + r * chunk.dstStep, chunk.elements);
}

template <class Taps, int rows>
void filterBand(const PackedKernel<Taps>& kernel, ChunkOf<Taps> band, Finish<typename Taps::Total> finish,
                ChunkSums<Taps>& sums) {
    for (ptrdiff_t rest = band.elements; rest > 0;) {
        band.elements = rest < kChunk + Taps::block ? rest : kChunk;
        filterChunk<Taps, rows>(kernel, band, finish, sums);
        band.window += band.elements;
        band.dst += band.elements * band.dstElementBytes;
        band.readable -= band.elements;
        rest -= band.elements;
    }
}

}  // namespace detail

/// Filters rows of elements whose windows begin at p; slack elements may be read behind the last window of a row.
template <class Taps>
void filterRows(const PackedKernel<Taps>& kernel, const typename Taps::Source* p, ptrdiff_t step, int channels,
                ptrdiff_t elements, ptrdiff_t rows, ptrdiff_t slack, Finish<typename Taps::Total> finish, uint8_t* dst,
                ptrdiff_t dstStep, ptrdiff_t dstElementBytes) {
    ChunkSums<Taps> sums;
    // A block whose window and overread end within reach may be loaded freely; the last may hold elements in vain.
    detail::ChunkOf<Taps> band{p,   step,    channels,       elements, elements + slack - Taps::overread,
                               dst, dstStep, dstElementBytes};
    const auto bandsOf = [&]<int n>() {
        for (; rows >= n && kernel.leastRows() >= n; rows -= n) {
            detail::filterBand<Taps, n>(kernel, band, finish, sums);
            band.window = advance(band.window, n * step);
            band.dst += n * dstStep;
        }
    };
    if constexpr (Taps::bandRows >= 4) bandsOf.template operator()<4>();
    if constexpr (Taps::bandRows >= 3) bandsOf.template operator()<3>();
    bandsOf.template operator()<2>();
    bandsOf.template operator()<1>();
}

}  // namespace qori::kernels
