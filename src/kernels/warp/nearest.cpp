// SPDX-License-Identifier: Apache-2.0
#include "nearest.h"

#include "fixed_places.h"
#include "kernels/copy_rows.h"

namespace qori::kernels {
namespace {

using namespace warp;

/// Pixels of up to 8 bytes are gathered as words of 4 or 8, whose first bytes they are.
template <int pixelBytes>
constexpr int kWordOf = pixelBytes <= 4 ? 4 : 8;

constexpr __m256i shufflePattern(auto byteAt) {
    alignas(kVectorBytes) struct { uint8_t at[kVectorBytes]; } table{};
    for (int i = 0; i < kVectorBytes; ++i) table.at[i] = static_cast<uint8_t>(byteAt(i % kBlockBytes));
    return __builtin_bit_cast(__m256i, table);
}

/// Brings the first bytes of the words together, at the vector's beginning.
template <int pixelBytes>
QORI_INLINE Bytes packPixels(__m256i words) {
    constexpr int word = kWordOf<pixelBytes>, inBlock = kBlockBytes / word * pixelBytes;
    if constexpr (pixelBytes == word) return {words};
    constexpr auto byteAt = [](int i) { return i < inBlock ? i / pixelBytes * word + i % pixelBytes : 0x80; };
    const __m256i packed = _mm256_shuffle_epi8(words, shufflePattern(byteAt));
    constexpr int words32 = inBlock / 4;  // of a block
    const __m256i order = words32 == 1   ? _mm256_setr_epi32(0, 4, 1, 1, 1, 1, 1, 1)
                          : words32 == 2 ? _mm256_setr_epi32(0, 1, 4, 5, 2, 2, 2, 2)
                                         : _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 3, 3);
    return {_mm256_permutevar8x32_epi32(packed, order)};
}

template <int pixelBytes, bool anywhere>
struct Gather {
    static constexpr int kPixels = 8, kPixelBytes = pixelBytes, kWord = kWordOf<pixelBytes>;
    static constexpr bool kPreparesAhead = false;

    const uint8_t* origin;
    ptrdiff_t ahead;
    int32_t turn;

    struct Prepared {
        __m256i offsets, shifts;
    };

    template <class Blocks>
    QORI_INLINE void prepare(const Blocks& blocks, Prepared& to) const {
        const Block block = blocks.at(0);
        to = {block.offsets, block.shifts};
    }

    QORI_INLINE void make(const Prepared& from, uint8_t* dst, int n) const {
        if constexpr (!anywhere) {
            alignas(kVectorBytes) int32_t offsets[8];
            store(offsets, Vec<int32_t>{from.offsets});
            prefetchAhead(origin + offsets[turn], ahead);
        }
        constexpr bool shifts = anywhere && pixelBytes != kWord;
        if constexpr (kWord == 4) {
            const __m256i words = _mm256_i32gather_epi32(reinterpret_cast<const int*>(origin), from.offsets, 1);
            write<8>(shifts ? _mm256_srlv_epi32(words, from.shifts) : words, n, dst);
        } else {
            const auto half = [&](__m128i o, __m128i s) __attribute__((always_inline)) {
                const __m256i words = _mm256_i32gather_epi64(reinterpret_cast<const long long*>(origin), o, 1);
                return shifts ? _mm256_srlv_epi64(words, _mm256_cvtepu32_epi64(s)) : words;
            };
            write<4>(half(_mm256_castsi256_si128(from.offsets), _mm256_castsi256_si128(from.shifts)), n, dst);
            if (n > 4)
                write<4>(half(_mm256_extracti128_si256(from.offsets, 1), _mm256_extracti128_si256(from.shifts, 1)),
                         n - 4, dst + 4 * pixelBytes);
        }
    }

private:
    template <int pixels>
    QORI_INLINE static void write(__m256i words, int n, uint8_t* dst) {
        const Bytes packed = packPixels<pixelBytes>(words);
        if (n >= pixels)
            storeFirst<pixels * pixelBytes>(dst, packed);
        else
            storePartial(dst, packed, n * pixelBytes);
    }
};

/// Larger pixels one by one.
template <int pixelBytes>
struct Moves {
    static constexpr int kPixels = 8, kPixelBytes = pixelBytes, kWord = pixelBytes;
    static constexpr bool kPreparesAhead = false;

    const uint8_t* origin;
    ptrdiff_t ahead;
    int32_t turn;

    struct Prepared {
        alignas(kVectorBytes) int32_t offsets[8];
    };

    template <class Blocks>
    QORI_INLINE void prepare(const Blocks& blocks, Prepared& to) const {
        store(to.offsets, Vec<int32_t>{blocks.at(0).offsets});
        __asm__("" : "+m"(to.offsets));  // to be loaded, not moved out of the vector
    }

    QORI_INLINE void make(const Prepared& from, uint8_t* dst, int n) const {
        prefetchAhead(origin + from.offsets[turn], ahead);
        prefetchAhead(origin + from.offsets[turn ^ 4], ahead);
        for (int i = 0; i < n; ++i) movePixel<pixelBytes>(dst + i * pixelBytes, origin + from.offsets[i]);
    }
};

enum class Reads { fixed, inside, anywhere };

template <int pixelBytes, Reads reads>
void nearestRun(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                uint8_t* dst) {
    constexpr bool anywhere = reads == Reads::anywhere;
    if (!anywhere && line.alongX == 1 && line.alongY == 0) {
        const auto x = static_cast<int32_t>(__builtin_floor(first + line.startX - kFineBias));
        const auto y = static_cast<int32_t>(__builtin_floor(line.startY - kFineBias));
        return copyRow(dst, source.origin + y * source.step + x * ptrdiff_t{pixelBytes}, count * ptrdiff_t{pixelBytes});
    }
    using Way = std::conditional_t<pixelBytes <= 8, Gather<pixelBytes, anywhere>, Moves<pixelBytes>>;
    const Way way{source.origin, source.ahead, line.turn};
    if constexpr (reads == Reads::fixed)
        makeFixedBlocks(way, source, line, first, count, dst);
    else
        makeDoubleBlocks<anywhere>(way, source, line, box, first, count, dst);
}

template <int pixelBytes>
void nearestFar(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                uint8_t* dst) {
    const DoubleAxis across{line.alongX, line.startX, line.bias, box.left, box.right, box.right};
    const DoubleAxis down{line.alongY, line.startY, line.bias, box.top, box.bottom, box.bottom};
    int32_t x[kBatch], y[kBatch];
    double unused[kBatch];
    for (int n; count > 0; count -= n, first += n) {
        n = count < kBatch ? count : kBatch;
        across.split(first, n, x, unused);
        down.split(first, n, y, unused);
        for (int i = 0; i < n; ++i, dst += pixelBytes)
            movePixel<pixelBytes>(dst, nearestPixel<pixelBytes>(source, x[i], y[i]));
    }
}

}  // namespace

template <int pixelBytes>
WarpKernels nearestKernels() {
    constexpr int32_t behind = pixelBytes <= 8 ? (kWordOf<pixelBytes> - 1) / pixelBytes : 0;
    return {nearestRun<pixelBytes, Reads::inside>,
            nearestRun<pixelBytes, Reads::anywhere>,
            nearestFar<pixelBytes>,
            0,
            0,
            behind,
            0,
            nearestRun<pixelBytes, Reads::fixed>};
}

template WarpKernels nearestKernels<1>();
template WarpKernels nearestKernels<2>();
template WarpKernels nearestKernels<3>();
template WarpKernels nearestKernels<4>();
template WarpKernels nearestKernels<6>();
template WarpKernels nearestKernels<8>();
template WarpKernels nearestKernels<12>();
template WarpKernels nearestKernels<16>();
template WarpKernels nearestKernels<24>();
template WarpKernels nearestKernels<32>();

}  // namespace qori::kernels
