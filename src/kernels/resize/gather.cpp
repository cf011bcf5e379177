// SPDX-License-Identifier: Apache-2.0
#include "gather.h"

#include "floats.h"

namespace qori::kernels {
namespace {

constexpr int kLane = Gather::kLane;

/// So many rows pay for tables, where pixels are not of one or two bytes, of which lanes move very many at once.
constexpr int32_t kTabledRows = 4;

enum class Kind {
    bytes,       ///< Pixels of one.
    pixels,      ///< Of more.
    pairs,       ///< Elements of one byte, and their neighbours'.
    insidePairs  ///< The same where no index needs clamping.
};

/// What the bytes of a group's two lanes are of: which pixel, counted from the one that the lane begins in, and which
/// byte of it. For pairs, a lane is of eight elements; the second of each takes the place of a pixel eight behind the
/// first's.
struct GroupPattern {
    int32_t pixel[2];  ///< The pixels that the lanes begin in, counted from the round's first.
    int32_t begin[2];  ///< Their bytes that the lanes begin with.
    alignas(kVectorBytes) uint8_t order[2 * kLane], bytes[2 * kLane];
};

/// Groups until one begins like the first.
struct Round {
    static constexpr int kMost = 6;
    GroupPattern of[kMost];
    int32_t groups, pixels;
};

constexpr Round makeRound(Kind kind, int pixelBytes) {
    const bool isOfPairs = kind == Kind::pairs || kind == Kind::insidePairs;
    const int perElement = isOfPairs ? 2 : 1, elements = kLane / perElement;
    Round round{};
    round.groups = (pixelBytes % 3 == 0 ? 3 : 1) * perElement;
    round.pixels = 2 * round.groups * elements / pixelBytes;
    for (int g = 0; g < round.groups; ++g)
        for (int half = 0; half < 2; ++half) {
            GroupPattern& group = round.of[g];
            // Pairs are in linearOrder(): of four lanes the middle ones change places.
            const int lane = isOfPairs ? g / 2 * 4 + g % 2 + 2 * half : 2 * g + half;
            group.pixel[half] = lane * elements / pixelBytes;
            group.begin[half] = lane * elements % pixelBytes;
            for (int i = 0; i < kLane; ++i) {
                const int element = group.begin[half] + i / perElement, at = half * kLane + i;
                const int second = i % perElement, apart = kind == Kind::insidePairs ? pixelBytes : 0;
                group.order[at] = static_cast<uint8_t>(element / pixelBytes + (apart > 0 ? 0 : 8 * second));
                group.bytes[at] = static_cast<uint8_t>(element % pixelBytes + apart * second);
            }
        }
    return round;
}
template <Kind kind, int pixelBytes>
constexpr Round kRound = makeRound(kind, pixelBytes);

/// How many bytes behind the first the pixels of two lanes lie, 127 for what is further; for pairs their first and
/// their second eight.
template <Kind kind, int pixelBytes>
QORI_INLINE __m256i distances(const int32_t* const indices[2], const Picks& picks, const int32_t first[2]) {
    constexpr bool isOfEight = kind == Kind::pixels || kind == Kind::insidePairs;
    const auto from = [&](int half, int at) { return load(indices[half] + at).v; };
    const auto behind = [&](int half, __m256i v) { return _mm256_sub_epi32(v, _mm256_set1_epi32(first[half])); };
    __m256i low, high;
    if constexpr (isOfEight) {
        low = high = _mm256_packs_epi32(behind(0, from(0, 0)), behind(1, from(1, 0)));
    } else {
        const auto both = [&](int half) {
            if constexpr (kind == Kind::bytes)
                return _mm256_packs_epi32(behind(half, from(half, 0)), behind(half, from(half, 8)));
            const __m256i least = _mm256_set1_epi32(picks.first), most = _mm256_set1_epi32(picks.last);
            const auto clamp = [&](__m256i v) { return _mm256_min_epi32(_mm256_max_epi32(v, least), most); };
            const __m256i next = _mm256_add_epi32(from(half, 0), _mm256_set1_epi32(1));
            return _mm256_packs_epi32(behind(half, clamp(from(half, 0))), behind(half, clamp(next)));
        };
        low = both(0);
        high = both(1);
    }
    if constexpr (pixelBytes > 1) {
        const auto times = [](__m256i v) {
            return _mm256_mullo_epi16(_mm256_min_epi16(v, _mm256_set1_epi16(127)), _mm256_set1_epi16(pixelBytes));
        };
        low = times(low);
        high = times(high);
    }
    // Packing leaves fours of the first lane at 0 and 4 and, where there are any, its second eight at 1 and 5.
    const __m256i order =
        isOfEight ? _mm256_setr_epi32(0, 4, 0, 4, 1, 5, 1, 5) : _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7);
    return _mm256_permutevar8x32_epi32(_mm256_packs_epi16(low, high), order);
}

/// The tables under construction.
struct Lanes {
    Picks picks;
    int32_t windows, most;  ///< The last base that a row has.
    uint8_t* masks;
    int32_t* bases;
    Bytes widest;  ///< How far behind a lane's first byte each byte lies at most.

    /// Masks and bases of one group.
    template <Kind kind, int pixelBytes>
    QORI_INLINE void make(const GroupPattern& pattern, const int32_t* const indices[2]) {
        const auto legal = [&](int32_t index) { return kind == Kind::pairs ? picks.clamp(index) : index; };
        int32_t index[2], first[2];
        for (int half = 0; half < 2; ++half) {
            index[half] = legal(indices[half][0]);
            first[half] = (index[half] - picks.first) * pixelBytes;
        }
        const Bytes places = shuffleInBlocks({distances<kind, pixelBytes>(indices, picks, index)}, load(pattern.order));
        Bytes from{_mm256_add_epi8(places.v, load(pattern.bytes).v)};
        if constexpr (pixelBytes % 3 == 0) {  // others begin with whole pixels
            // Where the next pixel repeats the first, the lane needs all of it.
            int32_t begin[2];
            for (int half = 0; half < 2; ++half) {
                begin[half] = legal(indices[half][1]) == index[half] ? 0 : pattern.begin[half];
                first[half] += begin[half];
            }
            from.v = _mm256_sub_epi8(from.v, bytesOf(begin[0], begin[1]));
        }
        widest = {_mm256_max_epu8(widest.v, from.v)};
        for (int32_t w = 0; w < windows; ++w, masks += 2 * kLane, bases += 2) {
            for (int half = 0; half < 2; ++half) {
                const int32_t wanted = first[half] + w * kLane;
                bases[half] = wanted < most ? wanted : most;
            }
            // Indices outside the window's 16 bytes get their top bit set: 0x70 added to 0..15 leaves the low bits.
            const __m256i inside = _mm256_sub_epi8(from.v, bytesOf(bases[0] - first[0], bases[1] - first[1]));
            store(masks, Bytes{_mm256_adds_epu8(inside, _mm256_set1_epi8(0x70))});
        }
    }
    int32_t span() const {
        uint8_t all[2 * kLane];
        store(all, widest);
        int32_t span = 0;
        for (uint8_t s : all) span = s > span ? s : span;
        return span + 1;
    }

private:
    static QORI_INLINE __m256i bytesOf(int32_t low, int32_t high) {
        return _mm256_set_m128i(_mm_set1_epi8(static_cast<char>(high)), _mm_set1_epi8(static_cast<char>(low)));
    }
};

/// Masks and bases of the groups from `begin`, where a round begins, to before `end`, by the number of windows, 0 to
/// make none. Returns how many bytes a lane spans at most; what spans
/// more than the windows hold is not done right.
template <Kind kind, int pixelBytes>
QORI_NOINLINE int32_t makeLanes(const Gather& gather, ptrdiff_t begin, ptrdiff_t end) {
    constexpr Kind kInside = kind == Kind::pairs ? Kind::insidePairs : kind;
    constexpr const Round &round = kRound<kind, pixelBytes>, &inside = kRound<kInside, pixelBytes>;
    constexpr int32_t kRead = kind == Kind::bytes ? 16 : 8;
    const Picks picks = gather.picks;
    const int32_t rowBytes = (picks.last - picks.first + 1) * pixelBytes;
    const ptrdiff_t made = begin * gather.windows;
    Lanes lanes{picks,
                gather.windows,
                rowBytes > kLane ? rowBytes - kLane : 0,
                gather.masks + 2 * kLane * made,
                gather.bases + 2 * made,
                zero<uint8_t>()};
    int32_t clear = 0, clearEnd = picks.count;  // pixels that need no clamping
    while (kind == Kind::pairs && clear < clearEnd && picks.indices[clear] < picks.first) ++clear;
    while (kind == Kind::pairs && clear < clearEnd && picks.indices[clearEnd - 1] >= picks.last) --clearEnd;
    int32_t pixel = static_cast<int32_t>(begin / round.groups) * round.pixels, phase = 0;
    for (ptrdiff_t g = begin; g < end; ++g) {
        const int32_t* const at = round.of[phase].pixel;
        if (clear <= pixel + at[0] && pixel + at[1] + kRead <= clearEnd) {
            const int32_t* const indices[2] = {picks.indices + pixel + at[0], picks.indices + pixel + at[1]};
            lanes.make<kInside, pixelBytes>(inside.of[phase], indices);
        } else {
            int32_t copies[2][kRead];
            const int32_t* indices[2];
            for (int half = 0; half < 2; ++half)
                indices[half] = readable(picks.indices, picks.count, pixel + at[half], kRead, copies[half]);
            lanes.make<kind, pixelBytes>(round.of[phase], indices);
        }
        if (++phase == round.groups) phase = 0, pixel += round.pixels;
    }
    return lanes.span();
}

/// The groups before this one are alike by the period from the third on: all their pixels are there, need no clamping
/// and have whole windows behind them. Groups of pairs go by twos, which are of 32 elements.
ptrdiff_t periodicEnd(const Gather& gather) {
    const Picks& picks = gather.picks;
    const int32_t pixels = 32 / gather.pixelBytes;
    if (gather.pixelBytes % 3 == 0 || picks.period <= 0 || pixels % picks.period != 0) return 0;
    ptrdiff_t twos = picks.count / pixels;
    const auto isWhole = [&](int32_t index) {
        return index < picks.last && (picks.last - index + 1) * gather.pixelBytes >= kLane;
    };
    while (twos > 0 && !isWhole(picks.indices[twos * pixels - 1])) --twos;
    return 2 * twos;
}

/// By as many windows as the first groups take, or more where a later one needs them. Of few groups one window is tried
/// at once, which mostly is what they take.
template <Kind kind, int pixelBytes>
Gather build(uint8_t* memory, const Picks& picks, ptrdiff_t groups) {
    constexpr ptrdiff_t kProbed = 16;
    auto* const bases = reinterpret_cast<int32_t*>(memory + 2 * groups * kLane * Gather::kMostWindows);
    Gather gather{picks, pixelBytes, groups <= kProbed ? 1 : 0, groups, bases, memory};
    int32_t span = makeLanes<kind, pixelBytes>(gather, 0, groups < kProbed ? groups : kProbed);
    if constexpr (kind == Kind::pairs) {
        const ptrdiff_t end = span <= kLane ? periodicEnd(gather) : 0;
        if (end > kProbed) {
            gather.windows = 1;
            makeLanes<kind, pixelBytes>(gather, 0, Gather::kListed);
            makeLanes<kind, pixelBytes>(gather, end, groups);
            gather.stride = bases[8] - bases[4];
            gather.alikeEnd = end;
            gather.isPeriodic = true;
            return gather;
        }
    }
    while (span > gather.windows * kLane) {
        gather.windows = (span + kLane - 1) / kLane;
        if (gather.windows > Gather::kMostWindows) {
            gather.windows = 0;
            break;
        }
        span = makeLanes<kind, pixelBytes>(gather, 0, groups);
    }
    return gather;
}

template <int windows>
QORI_NOINLINE void gatherRowOf(const Gather& gather, const uint8_t* row, const uint8_t* later, uint8_t* dst) {
    const ptrdiff_t bytes = ptrdiff_t{gather.picks.count} * gather.pixelBytes;
    const int32_t* base = gather.bases;
    const uint8_t* mask = gather.masks;
    ptrdiff_t i = 0;
    for (; i + 32 <= bytes; i += 32) {
        if constexpr (windows > 1) prefetch(later + base[0]);
        store(dst + i, gatherGroup<windows>(row, base, mask));
    }
    if (i < bytes) storePartial(dst + i, gatherGroup<windows>(row, base, mask), bytes - i);
}

/// Pixels of 3, 6 and 12 bytes are moved with what lies behind them, which the next pixel overwrites.
template <int pixelBytes>
QORI_NOINLINE void movePixels(const Gather& gather, const uint8_t* row, uint8_t* dst) {
    const Picks picks = gather.picks;
    const auto move = [&]<int bytes>(int32_t i) {
        const ptrdiff_t from = ptrdiff_t{picks.indices[i] - picks.first} * pixelBytes;
        uint8_t pixel[bytes];  // images may overlap where the caller does not mind what comes out
        __builtin_memcpy(pixel, row + from, bytes);
        __builtin_memcpy(dst, pixel, bytes);
        dst += pixelBytes;
    };
    constexpr int kWide = pixelBytes % 3 == 0 ? pixelBytes / 3 * 4 : pixelBytes;
    int32_t end = picks.count;
    if constexpr (kWide > pixelBytes) {
        --end;
        while (end > 0 && picks.indices[end - 1] >= picks.last) --end;
    }
    int32_t i = 0;
    for (; i < end; ++i) move.template operator()<kWide>(i);
    for (; i < picks.count; ++i) move.template operator()<pixelBytes>(i);
}

void findAlike(Gather& gather) {
    const int32_t* bases = gather.bases;
    if (gather.groups < 6) return;
    gather.stride = bases[8] - bases[4];
    const auto isAlike = [&](ptrdiff_t g) {
        return bases[2 * g] - bases[2 * g - 4] == gather.stride &&
               bases[2 * g + 1] - bases[2 * g - 3] == gather.stride &&
               isSame(gather.masks + 32 * g, gather.masks + 32 * g - 64);
    };
    gather.alikeEnd = 4;
    while (gather.alikeEnd < gather.groups && isAlike(gather.alikeEnd)) ++gather.alikeEnd;
}

}  // namespace

Gather buildGather(uint8_t* memory, const Picks& picks, int pixelBytes, int32_t rows) {
    if (rows < kTabledRows && pixelBytes > 2) return {picks, pixelBytes, 0, 0, nullptr, nullptr};
    const ptrdiff_t groups = (ptrdiff_t{picks.count} * pixelBytes + 31) / 32;
    switch (pixelBytes) {
        case 1: return build<Kind::bytes, 1>(memory, picks, groups);
        case 2: return build<Kind::pixels, 2>(memory, picks, groups);
        case 3: return build<Kind::pixels, 3>(memory, picks, groups);
        case 4: return build<Kind::pixels, 4>(memory, picks, groups);
        case 6: return build<Kind::pixels, 6>(memory, picks, groups);
        case 8: return build<Kind::pixels, 8>(memory, picks, groups);
        case 12: return build<Kind::pixels, 12>(memory, picks, groups);
        default: return build<Kind::pixels, 16>(memory, picks, groups);
    }
}

Gather buildPairs(uint8_t* memory, const Picks& picks, int channels) {
    const ptrdiff_t groups = (ptrdiff_t{picks.count} * channels + 31) / 32 * 2;
    Gather gather = channels == 1   ? build<Kind::pairs, 1>(memory, picks, groups)
                    : channels == 3 ? build<Kind::pairs, 3>(memory, picks, groups)
                                    : build<Kind::pairs, 4>(memory, picks, groups);
    if (gather.windows == 1 && !gather.isPeriodic) findAlike(gather);
    return gather;
}

void gatherRow(const Gather& gather, const uint8_t* row, const uint8_t* later, uint8_t* dst) {
    switch (gather.windows) {
        case 1: return gatherRowOf<1>(gather, row, later, dst);
        case 2: return gatherRowOf<2>(gather, row, later, dst);
        case 3: return gatherRowOf<3>(gather, row, later, dst);
        case 4: return gatherRowOf<4>(gather, row, later, dst);
        default: break;
    }
    switch (gather.pixelBytes) {
        case 1: return movePixels<1>(gather, row, dst);
        case 2: return movePixels<2>(gather, row, dst);
        case 3: return movePixels<3>(gather, row, dst);
        case 4: return movePixels<4>(gather, row, dst);
        case 6: return movePixels<6>(gather, row, dst);
        case 8: return movePixels<8>(gather, row, dst);
        case 12: return movePixels<12>(gather, row, dst);
        default: return movePixels<16>(gather, row, dst);
    }
}

}  // namespace qori::kernels
