// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>

#include "unary_row.h"

namespace qori::bench {
namespace {

/// Functors, so that the plain loops see through them.
template <class D, class S>
D clamp(S x) {
    return static_cast<D>(
        std::clamp(x, static_cast<S>(std::numeric_limits<D>::min()), static_cast<S>(std::numeric_limits<D>::max())));
}

template <class D, class S>
struct Clamped {
    D operator()(S x) const { return clamp<D>(x); }
};

template <class S, class D>
struct Widened {
    D operator()(S x) const { return static_cast<D>(x); }
};

const Rows rows{{
    unaryRow<uint8_t, float>("convert 8u32f C1", 1, qoriConvert_8u32f_C1R, Widened<uint8_t, float>{}, 13'523, 5'319),
    unaryRow<uint8_t, float>("convert 8u32f C3", 3, qoriConvert_8u32f_C3R, Widened<uint8_t, float>{}),
    unaryRow<uint8_t, int16_t>("convert 8u16s C1", 1, qoriConvert_8u16s_C1R, Widened<uint8_t, int16_t>{}),
    unaryRow<uint16_t, int32_t>("convert 16u32s C1", 1, qoriConvert_16u32s_C1R, Widened<uint16_t, int32_t>{}),
    unaryRow<int16_t, float>("convert 16s32f C1", 1, qoriConvert_16s32f_C1R, Widened<int16_t, float>{}),
    unaryRow<uint32_t, float>("convert 32u32f C1", 1, qoriConvert_32u32f_C1R, Widened<uint32_t, float>{}),
    unaryRow<float, uint8_t>(
        "convert 32f8u C1", 1, [](auto... a) { return qoriConvert_32f8u_C1R(a..., roundNearestEven); },
        [](float x) { return clamp<uint8_t>(std::nearbyint(x)); }, 13'969, 5'693),
    unaryRow<float, uint8_t>(
        "convert 32f8u C1 half away", 1, [](auto... a) { return qoriConvert_32f8u_C1R(a..., roundHalfAway); },
        [](float x) { return clamp<uint8_t>(std::trunc(x + std::copysign(0.5f, x))); }),
    unaryRow<float, int16_t>(
        "convert 32f16s C3", 3, [](auto... a) { return qoriConvert_32f16s_C3R(a..., roundTowardZero); },
        [](float x) { return clamp<int16_t>(std::trunc(x)); }),
    unaryRow<float, uint32_t>(
        "convert 32f32u Sfs C1", 1, [](auto... a) { return qoriConvert_32f32u_C1RSfs(a..., roundNearestEven, 3); },
        [](float x) { return static_cast<uint32_t>(std::clamp(std::nearbyint(x * 0.125f), 0.0f, 4.29e9f)); }),
    unaryRow<int16_t, uint8_t>("convert 16s8u C1", 1, qoriConvert_16s8u_C1R, Clamped<uint8_t, int16_t>{}, 39'937,
                               9'877),
    unaryRow<int32_t, uint8_t>("convert 32s8u C1", 1, qoriConvert_32s8u_C1R, Clamped<uint8_t, int32_t>{}),
    unaryRow<int16_t, int8_t>(
        "convert 16s8s Sfs C1", 1, [](auto... a) { return qoriConvert_16s8s_C1RSfs(a..., roundNearestEven, 4); },
        [](int16_t x) { return clamp<int8_t>(static_cast<int16_t>((x + 7 + (x >> 4 & 1)) >> 4)); }),
    unaryRow<uint8_t, uint16_t>("scale 8u16u C1", 1, qoriScale_8u16u_C1R,
                                [](uint8_t x) { return static_cast<uint16_t>(x * 257); }),
    unaryRow<uint8_t, int32_t>("scale 8u32s C1", 1, qoriScale_8u32s_C1R,
                               [](uint8_t x) { return static_cast<int32_t>(x * 0x01010101u ^ 0x80000000u); }),
    unaryRow<uint8_t, float>(
        "scale 8u32f C1", 1, [](auto... a) { return qoriScale_8u32f_C1R(a..., 0.0f, 1.0f); },
        [](uint8_t x) { return static_cast<float>(x) * (1.0f / 255); }, 12'856, 5'238),
    unaryRow<float, uint8_t>(
        "scale 32f8u C1", 1, [](auto... a) { return qoriScale_32f8u_C1R(a..., 0.0f, 300.0f); },
        [](float x) { return clamp<uint8_t>(std::nearbyint(x * (255.0f / 300))); }, 16'318, 5'513),
    unaryRow<uint16_t, uint8_t>(
        "scale 16u8u C1 accurate", 1, [](auto... a) { return qoriScale_16u8u_C1R(a..., hintAccurate); },
        [](uint16_t x) { return static_cast<uint8_t>(std::nearbyint(static_cast<float>(x) * 0.00389105058f)); }, 8'330,
        7'147),
    unaryRow<uint16_t, uint8_t>(
        "scale 16u8u C1 fast", 1, [](auto... a) { return qoriScale_16u8u_C1R(a..., hintFast); },
        [](uint16_t x) {
            const int s = x - 32768;
            return static_cast<uint8_t>(((s - (s >> 8)) >> 8) + 128);
        }),
    unaryRow<int32_t, uint8_t>(
        "scale 32s8u C1 accurate", 1, [](auto... a) { return qoriScale_32s8u_C1R(a..., hintAccurate); },
        [](int32_t x) { return static_cast<uint8_t>(std::nearbyint(x * 5.937181414556033e-08 + 127.5000000296859)); }),
}};

}  // namespace
}  // namespace qori::bench
