// SPDX-License-Identifier: Apache-2.0
// Cosines of the 8-point transform, and its tangents. Both 8x8 transforms factor it alike: rotations by tangents, whose
// results want a cosine as a factor; those factors are left to what multiplies in any case.
#pragma once
#include <cstddef>
#include <cstdint>

namespace qori::kernels::dct8 {

/// cos(k pi / 16).
inline constexpr double kCosine[9] = {1,
                                      0.98078528040323044913,
                                      0.92387953251128675613,
                                      0.83146961230254523708,
                                      0.70710678118654752440,
                                      0.55557023301960222474,
                                      0.38268343236508977173,
                                      0.19509032201612826785,
                                      0};
inline constexpr double kTangent1 = 0.19891236737965800691;  ///< tan(pi / 16)
inline constexpr double kTangent2 = 0.41421356237309504880;  ///< tan(pi / 8)
inline constexpr double kTangent3 = 0.66817863791929891999;  ///< tan(3 pi / 16)

/// cos(n pi / 16) for any n >= 0.
constexpr double cosineOf(int n) {
    n %= 32;
    if (n > 16) n = 32 - n;
    return n <= 8 ? kCosine[n] : -kCosine[16 - n];
}

/// What frequency k of a factored transform is multiplied with: its own cosine or, of two that one rotation makes, the
/// larger; cos(pi / 4) at frequency 0.
constexpr double weightOf(int k) {
    constexpr int kOf[8] = {4, 1, 2, 3, 4, 3, 2, 1};
    return kCosine[kOf[k]];
}

}  // namespace qori::kernels::dct8
