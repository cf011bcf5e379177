// SPDX-License-Identifier: Apache-2.0
// Element-wise row kernels: one loop for every operation, type and layout. A block is as many elements as one vector of
// the smallest element type holds, so that each image contributes whole vectors to it.
//
// Rows that do not fill a block are gathered into blocks, many at a time: an operation costs the same for one element
// as for all of a vector.
//
// An operation is a callable: Pack<D, n> op(int phase, Pack<S, n>... sources), where phase runs 0, 1, 2, 0, ... over
// the blocks of a row: with 1, 3 or 4 channels, constants per channel repeat after three blocks. It may keep state (a
// warning seen) and may offer
//     Pack<D, n> tail(int phase, ptrdiff_t count, Pack<S, n>... sources)   for the last, partial block, whose elements
//                                                                           from count on are zeros and never stored;
//     static constexpr bool mayStream = true                               to be compiled with streaming stores too;
//     static constexpr bool inRegisters = true                             to run from a copy, which stays as it is:
//                                                                           stores might change the original, so that
//                                                                           constants are loaded for every vector.
#pragma once
#include <algorithm>
#include <cstdlib>
#include <utility>

#include "copy_rows.h"
#include "image/driver.h"
#include "simd.h"
#include "streamed_lines.h"

namespace qori::kernels {

/// n elements of type T in whole vectors.
template <class T, int n>
struct Pack {
    static constexpr int vectors = n * static_cast<int>(sizeof(T)) / kVectorBytes;
    Vec<T> v[vectors];
};

template <class... T>
constexpr int blockOf = kVectorBytes / static_cast<int>(std::min({sizeof(T)...}));

namespace detail {

template <class T, int n>
QORI_INLINE Pack<T, n> loadPack(const T* p) {
    Pack<T, n> pack;
    for (int i = 0; i < Pack<T, n>::vectors; ++i) pack.v[i] = load(p + i * Vec<T>::lanes);
    return pack;
}

template <class T, int n>
QORI_INLINE Pack<T, n> loadPackUpTo(const T* p, ptrdiff_t count) {
    Pack<T, n> pack;
    if constexpr (Pack<T, n>::vectors == 1) {
        pack.v[0] = loadPartial(p, count);  // a block is one vector, and less than that is left
        return pack;
    }
    for (int i = 0; i < Pack<T, n>::vectors; ++i)
        pack.v[i] = loadUpTo(p + i * Vec<T>::lanes, count - i * Vec<T>::lanes);
    return pack;
}

/// Keeps the fourth element of each four of `old`.
template <class T>
QORI_INLINE Vec<T> withAlphaOf(Vec<T> a, Vec<T> old) {
    if constexpr (sizeof(T) == 1) {
        return fromInteger<T>(
            _mm256_blendv_epi8(toInteger(a.v), toInteger(old.v), _mm256_set1_epi32(static_cast<int>(0xFF000000u))));
    } else if constexpr (sizeof(T) == 2) {
        return fromInteger<T>(_mm256_blend_epi16(toInteger(a.v), toInteger(old.v), 0x88));
    } else if constexpr (sizeof(T) == 4) {
        return fromInteger<T>(_mm256_blend_epi32(toInteger(a.v), toInteger(old.v), 0x88));
    } else {
        return fromInteger<T>(_mm256_blend_epi32(toInteger(a.v), toInteger(old.v), 0xC0));
    }
}

template <bool keepAlpha, bool streaming, class T, int n>
QORI_INLINE void storePack(T* p, Pack<T, n> pack) {
    for (int i = 0; i < Pack<T, n>::vectors; ++i) {
        T* const at = p + i * Vec<T>::lanes;
        if constexpr (keepAlpha) pack.v[i] = withAlphaOf(pack.v[i], load(at));
        storeAs<streaming>(at, pack.v[i]);
    }
}

template <bool keepAlpha, class T, int n>
QORI_INLINE void storePackUpTo(T* p, Pack<T, n> pack, ptrdiff_t count) {
    for (int i = 0; i < Pack<T, n>::vectors; ++i) {
        T* const at = p + i * Vec<T>::lanes;
        const ptrdiff_t rest = count - i * Vec<T>::lanes;
        if (rest <= 0) return;
        if constexpr (keepAlpha) pack.v[i] = withAlphaOf(pack.v[i], loadUpTo(at, rest));
        if constexpr (Pack<T, n>::vectors == 1)
            storePartial(at, pack.v[i], rest);
        else
            storeUpTo(at, pack.v[i], rest);
    }
}

template <class Op>
constexpr bool runsFromCopy = requires {
    Op::inRegisters;
};

/// Blocks three at a time; gives how many elements that made. Pointers come by value: through a reference, every
/// store might change them, and they would be loaded again for each vector. Where the blocks stream, what lies `ahead`
/// of them is fetched.
template <bool keepAlpha, bool streams, int n, class Op, class D, class... S>
QORI_INLINE ptrdiff_t mapTriples(Op& op, ptrdiff_t elements, [[maybe_unused]] ptrdiff_t ahead, D* dst,
                                 const S*... src) {
    ptrdiff_t i = 0;
    for (; i <= elements - 3 * n; i += 3 * n) {
        if constexpr (streams) (fetchLines<3 * n * sizeof(S)>(src + i, ahead), ...);
        for (int phase = 0; phase < 3; ++phase)
            storePack<keepAlpha, streams>(dst + i + phase * n, op(phase, loadPack<S, n>(src + i + phase * n)...));
    }
    return i;
}

template <class Op, class... Packs>
QORI_INLINE auto applyTail(Op& op, int phase, ptrdiff_t count, Packs... packs) {
    if constexpr (requires { op.tail(phase, count, packs...); })
        return op.tail(phase, count, packs...);
    else
        return op(phase, packs...);
}

template <bool keepAlpha, int n, class Op, class D, class... S>
QORI_INLINE void mapTail(Op& op, int phase, ptrdiff_t rest, D* dst, const S*... src) {
    storePackUpTo<keepAlpha>(dst, applyTail(op, phase, rest, loadPackUpTo<S, n>(src, rest)...), rest);
}

/// What an operation does with a row; the operation is known to the function alone, so that whatever calls it for many
/// rows is compiled once for all operations.
template <class D, class... S>
using RowFunction = void (*)(void* op, ptrdiff_t elements, RowStores stores, D* dst, const S*... src);

template <class Op, class D, class... S>
QORI_NOINLINE void streamRow(void* operation, ptrdiff_t elements, ptrdiff_t ahead, D* dst, const S*... src);

}  // namespace detail

/// dst[i] = op(src[i]...) for `elements` elements. keepAlpha leaves every fourth element of dst as it was; dst and the
/// sources may be the same. What streams wants dst on a vector's boundary; elsewhere, and with keepAlpha, which reads
/// what it writes anyway, everything goes through the cache.
template <bool keepAlpha, class Op, class D, class... S>
QORI_NOINLINE void mapRow(void* operation, ptrdiff_t elements, RowStores stores, D* dst, const S*... src) {
    constexpr int n = blockOf<D, S...>;
    // As the last call that a row makes, it costs rows that do not stream nothing.
    if constexpr (!keepAlpha && requires { Op::mayStream; })
        if (stores != RowStores::cached)
            return detail::streamRow<Op>(operation, elements, fetchedAhead(stores), dst, src...);
    std::conditional_t<detail::runsFromCopy<Op>, Op, Op&> op = *static_cast<Op*>(operation);
    ptrdiff_t i = detail::mapTriples<keepAlpha, false, n>(op, elements, 0, dst, src...);
    int phase = 0;
    for (; i <= elements - n; i += n, ++phase)
        detail::storePack<keepAlpha, false>(dst + i, op(phase, detail::loadPack<S, n>(src + i)...));
    if (i < elements) detail::mapTail<keepAlpha, n>(op, phase, elements - i, dst + i, (src + i)...);
}

namespace detail {

/// A row whose whole cache lines stream. Apart from mapRow, whose phases the compiler knows: short rows take up to 1.5
/// times as long where it does not.
template <class Op, class D, class... S>
void streamRow(void* operation, ptrdiff_t elements, ptrdiff_t ahead, D* dst, const S*... src) {
    const auto [head, lines] = StreamedLines::ofGroups(dst, elements);
    if (head > 0 || lines == 0)
        mapRow<false, Op>(operation, lines == 0 ? elements : head, RowStores::cached, dst, src...);
    if (lines == 0) return;
    elements -= head;
    dst += head;
    (void(src += head), ...);
    constexpr int n = blockOf<D, S...>;
    std::conditional_t<runsFromCopy<Op>, Op, Op&> op = *static_cast<Op*>(operation);
    ptrdiff_t i = mapTriples<false, true, n>(op, lines, ahead, dst, src...);
    int phase = 0;
    for (; i <= elements - n; i += n, phase = phase == 2 ? 0 : phase + 1) {
        const auto result = op(phase, loadPack<S, n>(src + i)...);
        if (i + n <= lines)
            storePack<false, true>(dst + i, result);
        else
            storePack<false, false>(dst + i, result);
    }
    if (i < elements) mapTail<false, n>(op, phase, elements - i, dst + i, (src + i)...);
}

}  // namespace detail

namespace detail {

/// A row function over rows of fewer elements than a block, with buffers of 12 blocks for each image. False, and
/// nothing done, where rows are long in bytes, are one run, or do not lie apart in every image: a row that is read
/// ahead of the one before it being written must be the same row.
template <bool keepAlpha, class D, class... S>
QORI_NOINLINE bool mapGathered(RowFunction<D, S...> makeRow, void* op, int channels, QorImageSize roi,
                               const Image<D>& dst, const Image<const S>&... src) {
    const int elements = roi.width * channels;
    const auto liesApart = [=](const auto& image) {
        const int bytes = elements * static_cast<int>(sizeof(*image.data));
        return bytes <= kNarrowRow && std::abs(int64_t{image.step}) >= bytes;
    };
    if (!(liesApart(dst) && ... && liesApart(src))) return false;
    if (isOneRun(roi, walk(dst, channels), walk(src, channels)...)) return false;
    constexpr int n = blockOf<D, S...>, room = 12 * n;
    alignas(kVectorBytes) D result[room];
    alignas(kVectorBytes) uint8_t sources[sizeof...(S) + 1][room * std::max({sizeof(D), sizeof(S)...})];
    const auto gather = [=](auto* to, auto from, int32_t y, int count) {
        const int bytes = elements * static_cast<int>(sizeof(*from.data));
        copyNarrowRows(asBytes(to), bytes, asBytes(from.row(y)), from.step, bytes, count);
    };
    const int most = room / elements;
    for (int32_t y = 0, count; y < roi.height; y += count) {
        count = std::min(most, roi.height - y);
        if constexpr (keepAlpha) gather(result, dst, y, count);
        [&]<size_t... i>(std::index_sequence<i...>) {
            (gather(sources[i], src, y, count), ...);
            makeRow(op, ptrdiff_t{elements} * count, RowStores::cached, result,
                    reinterpret_cast<const S*>(sources[i])...);
        }
        (std::index_sequence_for<S...>{});
        const int bytes = elements * elementBytes<D>;
        copyNarrowRows(asBytes(dst.row(y)), dst.step, asBytes(result), bytes, bytes, count);
    }
    return true;
}

/// An image's rows, or those that a run is cut into.
template <class T>
struct Rows {
    T* first;
    ptrdiff_t step;

    QORI_INLINE T* at(int32_t y, ptrdiff_t i) const { return advance(first, step * y) + i; }
};

/// Elements of a piece of a row that streams: whole lines and groups of three blocks.
template <class D, class... S>
constexpr ptrdiff_t streamedPiece = std::max<ptrdiff_t>(384 / elementBytes<D>, 3 * blockOf<D, S...>);

/// Rows of the destination do not overlap.
template <class D, class... S>
QORI_NOINLINE void streamRows(RowFunction<D, S...> makeRow, void* op, ptrdiff_t elements, int32_t rows, Rows<D> dst,
                              Rows<const S>... src) {
    constexpr ptrdiff_t piece = streamedPiece<D, S...>, fewest = StreamedLines::fewestBytes / elementBytes<D>;
    forStreamedPieces(
        rows, streamedApart(dst.step), elements,
        [=](int32_t y, ptrdiff_t begin) {
            const ptrdiff_t left = elements - begin,
                            count = StreamedLines::ofGroups(dst.at(y, begin), left).head + piece;
            return left - count < fewest ? left : count;
        },
        [=](int32_t y, ptrdiff_t begin, ptrdiff_t count) {
            makeRow(op, count, RowStores::fetching, dst.at(y, begin), src.at(y, begin)...);
        });
}

/// A run as rows of whole pieces, and what is left of it.
template <class D, class... S>
void streamRun(RowFunction<D, S...> makeRow, void* op, ptrdiff_t elements, D* dst, const S*... src) {
    constexpr ptrdiff_t piece = streamedPiece<D, S...>, row = kStreamedApart / elementBytes<D> / piece * piece;
    const ptrdiff_t rows = elements / row, done = rows * row;
    streamRows<D, S...>(makeRow, op, row, static_cast<int32_t>(rows), {dst, row * elementBytes<D>},
                        {src, row * elementBytes<S>}...);
    if (done < elements) makeRow(op, elements - done, RowStores::fetching, dst + done, (src + done)...);
}

template <bool keepAlpha, class D, class... S>
QORI_NOINLINE void mapRows(RowFunction<D, S...> makeRow, void* op, QorImageSize roi, int channels, bool streaming,
                           const Image<D>& dst, const Image<const S>&... src) {
    constexpr int fewest = 4;  // rows that are worth gathering
    const ptrdiff_t elements = ptrdiff_t{roi.width} * channels, bytes = elements * elementBytes<D>;
    if (elements < blockOf<D, S...> && roi.height >= fewest) [[unlikely]] {
        if (mapGathered<keepAlpha>(makeRow, op, channels, roi, dst, src...)) return;
    }
    const bool isRun = roi.height == 1 || isOneRun(roi, walk(dst, channels), walk(src, channels)...);
    RowStores stores = RowStores::cached;
    if (streaming && (isRun || (bytes >= StreamedLines::fewestBytes && std::abs(ptrdiff_t{dst.step}) >= bytes)))
        stores = std::min({RowStores::fetching, storesOfRows(roi.height, src.step, elements * elementBytes<S>)...});
    if (stores != RowStores::fetching) {
        const auto makeOne = [=](ptrdiff_t pixels, D* d, const S*... s) {
            makeRow(op, pixels * channels, stores, d, s...);
        };
        forEachRow(roi, makeOne, walk(dst, channels), walk(src, channels)...);
    } else if (isRun) {
        streamRun<D, S...>(makeRow, op, elements * roi.height, dst.data, src.data...);
    } else {
        streamRows<D, S...>(makeRow, op, elements, roi.height, {dst.data, dst.step}, {src.data, src.step}...);
    }
    if (stores != RowStores::cached) streamFence();
}

}  // namespace detail

/// mapRow over a region of `channels` interleaved channels.
template <bool keepAlpha = false, class Op, class D, class... S>
void mapImage(QorImageSize roi, int channels, Op&& op, bool streaming, Image<D> dst, Image<const S>... src) {
    using Operation = std::remove_reference_t<Op>;
    detail::mapRows<keepAlpha, D, S...>(mapRow<keepAlpha, Operation, D, S...>, &op, roi, channels, streaming, dst,
                                        src...);
}

/// One constant per channel, repeated over three vectors: the constants of phase p are v[p]. AC4 constants come as four
/// with any fourth.
template <class T>
struct ChannelVectors {
    Vec<T> v[3];
};

template <class T>
ChannelVectors<T> channelVectors(const T* values, int channels) {
    constexpr int kGroup = 12;  // whole pixels of 1, 3 and 4 channels
    alignas(kVectorBytes) T all[3 * Vec<T>::lanes];
    T group[kGroup];
    for (int i = 0, c = 0; i < kGroup; ++i, c = c + 1 < channels ? c + 1 : 0) group[i] = values[c];
    for (int i = 0; i < 3 * Vec<T>::lanes; i += kGroup) __builtin_memcpy(all + i, group, sizeof group);
    return {{load(all), load(all + Vec<T>::lanes), load(all + 2 * Vec<T>::lanes)}};
}

}  // namespace qori::kernels
