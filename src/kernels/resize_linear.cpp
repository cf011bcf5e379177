// SPDX-License-Identifier: Apache-2.0
#include "resize_linear.h"

namespace qori::kernels {
namespace {

/// With a = 64 (p0 - p1), the product a * -2w is 128 w (p1 - p0), below 2^29, and the rounding high multiply gives
/// (w (p1 - p0) + 128) >> 8. -2w reaches -32768, a never does.
QORI_INLINE __m256i interpolatePairs(Bytes pairs, __m256i weights) {
    const __m256i difference = _mm256_maddubs_epi16(pairs.v, _mm256_set1_epi16(static_cast<int16_t>(0xC040)));
    const __m256i first = _mm256_maddubs_epi16(pairs.v, _mm256_set1_epi16(0x0040));
    return _mm256_add_epi16(first, _mm256_mulhrs_epi16(difference, weights));
}

template <int windows>
QORI_INLINE void linearGroups(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out,
                              ptrdiff_t g, ptrdiff_t end) {
    const int32_t* base = gather.bases + 2 * windows * g;
    const uint8_t* mask = gather.masks + 32 * windows * g;
    for (; g < end; ++g)
        store(out + 16 * g,
              Vec<int16_t>{interpolatePairs(gatherGroup<windows>(row, base, mask), load(weights + 16 * g).v)});
}

template <int windows>
QORI_NOINLINE void linearRowOf(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    linearGroups<windows>(gather, row, weights, out, 0, gather.groups);
}

/// Masks and weights of alike groups stay in registers.
QORI_NOINLINE void linearRowAlike(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    constexpr ptrdiff_t kFirst = 2;
    linearGroups<1>(gather, row, weights, out, 0, kFirst);
    const Bytes masks[2] = {load(gather.masks + 32 * kFirst), load(gather.masks + 32 * kFirst + 32)};
    const __m256i factors[2] = {load(weights + 16 * kFirst).v, load(weights + 16 * kFirst + 16).v};
    const int32_t* base = gather.bases + 2 * kFirst;
    ptrdiff_t g = kFirst;
    for (; g + 2 <= gather.alikeEnd; g += 2, row += gather.stride)
        for (int i = 0; i < 2; ++i) {
            const Bytes pairs = shuffleHalves(loadHalves(row + base[2 * i], row + base[2 * i + 1]), masks[i]);
            store(out + 16 * (g + i), Vec<int16_t>{interpolatePairs(pairs, factors[i])});
        }
    linearGroups<1>(gather, row - (g - kFirst) / 2 * gather.stride, weights, out, g, gather.groups);
}

QORI_NOINLINE void linearRowByElements(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    for (ptrdiff_t i = 0; i < 16 * gather.groups; ++i) {
        const int p0 = row[gather.offsets[2 * i]], p1 = row[gather.offsets[2 * i + 1]], w = -weights[i] >> 1;
        out[i] = static_cast<int16_t>((p0 << 6) + (((p1 - p0) * w + 128) >> 8));
    }
}

}  // namespace

void linearRow8u(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    if (gather.alikeEnd > 4) return linearRowAlike(gather, row, weights, out);
    switch (gather.windows) {
        case 1: return linearRowOf<1>(gather, row, weights, out);
        case 2: return linearRowOf<2>(gather, row, weights, out);
        case 3: return linearRowOf<3>(gather, row, weights, out);
        case 4: return linearRowOf<4>(gather, row, weights, out);
        default: return linearRowByElements(gather, row, weights, out);
    }
}

void linearColumn8u(const int16_t* h0, const int16_t* h1, int32_t w, uint8_t* dst, ptrdiff_t elements) {
    // (h0 * 2^14 + (h1 - h0) w + 2^19) >> 20 is (h0 + ((h1 - h0) 4w >> 16) + 32) >> 6: the parts dropped early are
    // below the last bit that counts. 4w must be a signed factor, so from 2^15 on the sum starts at h1 with 4w - 2^16.
    const bool nearFirst = w < 8192;
    const int16_t* origin = nearFirst ? h0 : h1;
    const __m256i factor = _mm256_set1_epi16(static_cast<int16_t>(nearFirst ? 4 * w : 4 * w - 65536));
    const auto half = [&](ptrdiff_t i) {
        const __m256i difference = _mm256_sub_epi16(load(h1 + i).v, load(h0 + i).v);
        const __m256i sum = _mm256_add_epi16(load(origin + i).v, _mm256_mulhi_epi16(difference, factor));
        return _mm256_srai_epi16(_mm256_add_epi16(sum, _mm256_set1_epi16(32)), 6);
    };
    for (ptrdiff_t i = 0; i < elements; i += 32)
        storeUpTo(dst + i, Bytes{_mm256_packus_epi16(half(i), half(i + 16))}, elements - i);
}

}  // namespace qori::kernels
