// SPDX-License-Identifier: Apache-2.0
#include "channel_rows.h"

#include "kernels/byte_tables.h"
#include "kernels/groups.h"

namespace qori::kernels {
namespace {

QORI_INLINE Bytes table(const ByteTable& bytes) { return load(bytes.at); }

/// make(0) to make(n - 1).
template <size_t n>
constexpr std::array<ByteTable, n> tables(ByteTable (*make)(int)) {
    std::array<ByteTable, n> all{};
    for (size_t k = 0; k < n; ++k) all[k] = make(static_cast<int>(k));
    return all;
}

/// Of three halves, the one that holds bytes of `channel` at each position: positions repeat modulo 16 because 3 and
/// the number of elements in a half have no common factor.
template <int element>
QORI_INLINE Bytes mix3(Bytes a, Bytes b, Bytes c, int channel) {
    static constexpr ByteTable inSecond[3] = {selectChannel<3, element>(0, 1), selectChannel<3, element>(1, 1),
                                              selectChannel<3, element>(2, 1)};
    static constexpr ByteTable inThird[3] = {selectChannel<3, element>(0, 2), selectChannel<3, element>(1, 2),
                                             selectChannel<3, element>(2, 2)};
    return blend(blend(a, b, table(inSecond[channel])), c, table(inThird[channel]));
}

/// Four-byte word w of vector v becomes word v of vector w, in each half.
QORI_INLINE void transposeWords(Bytes (&a)[4]) {
    const __m256i low01 = _mm256_unpacklo_epi32(a[0].v, a[1].v), high01 = _mm256_unpackhi_epi32(a[0].v, a[1].v);
    const __m256i low23 = _mm256_unpacklo_epi32(a[2].v, a[3].v), high23 = _mm256_unpackhi_epi32(a[2].v, a[3].v);
    a[0].v = _mm256_unpacklo_epi64(low01, low23);
    a[1].v = _mm256_unpackhi_epi64(low01, low23);
    a[2].v = _mm256_unpacklo_epi64(high01, high23);
    a[3].v = _mm256_unpackhi_epi64(high01, high23);
}

template <int channels, int element>
struct Split {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = true;
    static constexpr std::array<Run, 1> in = {wholePixels(channels * element)};
    static constexpr auto out = [] {
        std::array<Run, channels> runs{};
        runs.fill(wholePixels(element));
        return runs;
    }();

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        Bytes a[channels];
        for (int k = 0; k < channels; ++k) a[k] = loadSpans<channels, spans>(from[0], k);
        if constexpr (channels == 3) {
            static constexpr ByteTable take[3] = {takeMixed<3, element>(0), takeMixed<3, element>(1),
                                                  takeMixed<3, element>(2)};
            for (int c = 0; c < 3; ++c)
                storeAllSpans<spans, streaming>(to[static_cast<size_t>(c)],
                                                {shuffleInBlocks(mix3<element>(a[0], a[1], a[2], c), table(take[c]))});
        } else {
            static constexpr ByteTable words = channelWords<element>();
            for (Bytes& half : a) half = element == 4 ? half : shuffleInBlocks(half, table(words));
            transposeWords(a);
            for (size_t c = 0; c < 4; ++c) storeAllSpans<spans, streaming>(to[c], {a[c]});
        }
    }
};

template <int channels, int element>
struct Merge {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = true;
    static constexpr auto in = Split<channels, element>::out;
    static constexpr std::array<Run, 1> out = {wholePixels(channels * element)};

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        Bytes a[channels];
        for (size_t c = 0; c < channels; ++c) a[c] = loadSpans<1, spans>(from[c], 0);
        if constexpr (channels == 3) {
            static constexpr ByteTable put[3] = {putMixed<3, element>(0), putMixed<3, element>(1),
                                                 putMixed<3, element>(2)};
            static constexpr ByteTable second[3] = {selectChannel<3, element>(1, 0), selectChannel<3, element>(1, 1),
                                                    selectChannel<3, element>(1, 2)};
            static constexpr ByteTable third[3] = {selectChannel<3, element>(2, 0), selectChannel<3, element>(2, 1),
                                                   selectChannel<3, element>(2, 2)};
            for (int c = 0; c < 3; ++c) a[c] = shuffleInBlocks(a[c], table(put[c]));
            Bytes halves[3];
            for (int k = 0; k < 3; ++k) halves[k] = blend(blend(a[0], a[1], table(second[k])), a[2], table(third[k]));
            storeAllSpans<spans, streaming>(to[0], halves);
        } else {
            static constexpr ByteTable bytes = interleaveWords<element>();
            transposeWords(a);
            for (Bytes& half : a) half = element == 4 ? half : shuffleInBlocks(half, table(bytes));
            storeAllSpans<spans, streaming>(to[0], a);
        }
    }
};

/// Where half k of a span of one-channel pixels is accessed: the last one begins early, so that it ends with the
/// channel's last element and not with the pixel.
template <int channels, int element>
constexpr int channelHalf(int k) {
    return k < channels - 1 ? 16 * k : 16 * k - (channels - 1) * element;
}

template <int channels, int element, int spans>
QORI_INLINE Bytes loadChannelHalf(const uint8_t* in, int k) {
    return loadSpans<channels, spans>(in + channelHalf<channels, element>(k) - 16 * k, k);
}

template <int channels, int element>
struct Extract {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = true;
    static constexpr std::array<Run, 1> in = {oneChannel(channels * element, element)};
    static constexpr std::array<Run, 1> out = {wholePixels(element)};

    /// The elements of the plane's half that come from half k.
    static constexpr ByteTable moves(int k) {
        return bothHalves([=](int i) {
            const int from = spanIndex(i, channels, element, 0);
            return from / 16 == k ? from - channelHalf<channels, element>(k) : kNone;
        });
    }

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        static constexpr auto take = tables<channels>(moves);
        Bytes gathered = shuffleInBlocks(loadChannelHalf<channels, element, spans>(from[0], 0), table(take[0]));
        for (int k = 1; k < channels; ++k)
            gathered = gathered | shuffleInBlocks(loadChannelHalf<channels, element, spans>(from[0], k),
                                                  table(take[static_cast<size_t>(k)]));
        storeAllSpans<spans, streaming>(to[0], {gathered});
    }
};

template <int channels, int element>
struct Insert {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = false;
    static constexpr std::array<Run, 2> in = {wholePixels(element), oneChannel(channels* element, element)};
    static constexpr std::array<Run, 1> out = {oneChannel(channels * element, element)};

    /// Half k's bytes from the plane's half; none between the elements.
    static constexpr ByteTable moves(int k) {
        return bothHalves([=](int i) {
            const int at = channelHalf<channels, element>(k) + i, within = at % (channels * element);
            return within < element ? at / (channels * element) * element + within : kNone;
        });
    }
    static constexpr ByteTable selects(int k) {
        return bothHalves([=](int i) { return moves(k).at[i] == kNone ? 0 : kAll; });
    }

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        static constexpr auto spread = tables<channels>(moves);
        static constexpr auto select = tables<channels>(selects);
        const Bytes elements = loadSpans<1, spans>(from[0], 0);
        Bytes halves[channels];
        for (int k = 0; k < channels; ++k) {
            const auto t = static_cast<size_t>(k);
            halves[k] = blend(loadChannelHalf<channels, element, spans>(from[1], k),
                              shuffleInBlocks(elements, table(spread[t])), table(select[t]));
        }
        for (int k = 0; k < channels; ++k)
            storeSpans<channels, spans>(to[0] + channelHalf<channels, element>(k) - 16 * k, k, halves[k]);
    }
};

template <int channels, int element>
struct Duplicate {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = true;
    static constexpr std::array<Run, 1> in = {wholePixels(element)};
    static constexpr std::array<Run, 1> out = {wholePixels(channels * element)};

    static constexpr ByteTable moves(int k) {
        return bothHalves(
            [=](int i) { return (16 * k + i) / (channels * element) * element + (16 * k + i) % element; });
    }

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        static constexpr auto spread = tables<channels>(moves);
        const Bytes elements = loadSpans<1, spans>(from[0], 0);
        Bytes halves[channels];
        for (int k = 0; k < channels; ++k) halves[k] = shuffleInBlocks(elements, table(spread[static_cast<size_t>(k)]));
        storeAllSpans<spans, streaming>(to[0], halves);
    }
};

/// Halves of four pixel groups to three: 12 bytes of each of the four source halves, laid end to end.
template <int element>
struct DropAlpha {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = true;
    static constexpr std::array<Run, 1> in = {wholePixels(4 * element)};
    static constexpr std::array<Run, 1> out = {wholePixels(3 * element)};

    /// Bytes of destination half `half` that come from source half `source`.
    static constexpr ByteTable moves(int half, int source) {
        return bothHalves([=](int i) {
            const int colour = 16 * half + i;  // byte index among colour bytes only
            const int from = colour / (3 * element) * 4 * element + colour % (3 * element);
            return from / 16 == source ? from % 16 : kNone;
        });
    }

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        static constexpr ByteTable first[3] = {moves(0, 0), moves(1, 1), moves(2, 2)};
        static constexpr ByteTable second[3] = {moves(0, 1), moves(1, 2), moves(2, 3)};
        Bytes a[4], halves[3];
        for (int k = 0; k < 4; ++k) a[k] = loadSpans<4, spans>(from[0], k);
        for (int k = 0; k < 3; ++k)
            halves[k] = shuffleInBlocks(a[k], table(first[k])) | shuffleInBlocks(a[k + 1], table(second[k]));
        storeAllSpans<spans, streaming>(to[0], halves);
    }
};

template <int element>
struct FillColour {
    static constexpr int span = 16 / element;
    static constexpr bool mayStream = false;
    static constexpr std::array<Run, 2> in = {wholePixels(3 * element), wholePixels(4 * element)};
    static constexpr std::array<Run, 1> out = {wholePixels(4 * element)};

    /// 16 source bytes from an offset that keeps them inside the group feed four colour groups of 12 bytes.
    static constexpr int begin(int k) { return k < 3 ? 12 * k : 32; }
    static constexpr ByteTable moves(int k) {
        return bothHalves([=](int i) {
            const int within = i % (4 * element);
            return within < 3 * element ? i / (4 * element) * 3 * element + within + 12 * k - begin(k) : kNone;
        });
    }

    template <int spans, bool streaming, class Out, class In>
    QORI_INLINE void run(const Out& to, const In& from) const {
        static constexpr auto spread = tables<4>(moves);
        alignas(kVectorBytes) static constexpr auto colour = selectWithinPixel<4 * element>(3 * element);
        Bytes halves[4];
        for (int k = 0; k < 4; ++k) {
            const Bytes elements = shuffleInBlocks(loadSpans<3, spans>(from[0] + begin(k) - 16 * k, k),
                                                   table(spread[static_cast<size_t>(k)]));
            halves[k] = blend(loadSpans<4, spans>(from[1], k), elements, load(colour.data()));
        }
        storeAllSpans<spans, streaming>(to[0], halves);
    }
};

}  // namespace

template <int channels, int element>
void splitRow(uint8_t* const* planes, const uint8_t* src, ptrdiff_t pixels, bool streaming) {
    std::array<uint8_t*, channels> out;
    for (size_t c = 0; c < channels; ++c) out[c] = planes[c];
    mapSpans(Split<channels, element>{}, out, std::array{src}, pixels, streaming);
}

template <int channels, int element>
void mergeRow(uint8_t* dst, const uint8_t* const* planes, ptrdiff_t pixels, bool streaming) {
    std::array<const uint8_t*, channels> in;
    for (size_t c = 0; c < channels; ++c) in[c] = planes[c];
    mapSpans(Merge<channels, element>{}, std::array{dst}, in, pixels, streaming);
}

template <int channels, int element>
void extractRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming) {
    mapSpans(Extract<channels, element>{}, std::array{dst}, std::array{src}, pixels, streaming);
}

template <int channels, int element>
void insertRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels) {
    mapSpans(Insert<channels, element>{}, std::array{dst}, std::array<const uint8_t*, 2>{src, dst}, pixels);
}

template <int channels, int element>
void duplicateRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming) {
    mapSpans(Duplicate<channels, element>{}, std::array{dst}, std::array{src}, pixels, streaming);
}

template <int element>
void dropAlphaRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming) {
    mapSpans(DropAlpha<element>{}, std::array{dst}, std::array{src}, pixels, streaming);
}

template <int element>
void fillColourRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels) {
    mapSpans(FillColour<element>{}, std::array{dst}, std::array<const uint8_t*, 2>{src, dst}, pixels);
}

#define QORI_INSTANTIATE_CHANNELS(channels, element)                                             \
    template void splitRow<channels, element>(uint8_t* const*, const uint8_t*, ptrdiff_t, bool); \
    template void mergeRow<channels, element>(uint8_t*, const uint8_t* const*, ptrdiff_t, bool); \
    template void extractRow<channels, element>(uint8_t*, const uint8_t*, ptrdiff_t, bool);      \
    template void insertRow<channels, element>(uint8_t*, const uint8_t*, ptrdiff_t);             \
    template void duplicateRow<channels, element>(uint8_t*, const uint8_t*, ptrdiff_t, bool)
#define QORI_INSTANTIATE(element)                                                   \
    QORI_INSTANTIATE_CHANNELS(3, element);                                          \
    QORI_INSTANTIATE_CHANNELS(4, element);                                          \
    template void dropAlphaRow<element>(uint8_t*, const uint8_t*, ptrdiff_t, bool); \
    template void fillColourRow<element>(uint8_t*, const uint8_t*, ptrdiff_t)
QORI_INSTANTIATE(1);
QORI_INSTANTIATE(2);
QORI_INSTANTIATE(4);

}  // namespace qori::kernels
