// SPDX-License-Identifier: Apache-2.0
#include "spectrum_elements.h"

namespace qori::kernels {
namespace {

/// atan t for 0 <= t <= 1: from the nearest eighth c, atan c + atan r, r = (t - c) / (1 + c t), |r| <= 1/16; the
/// series' terms left out are below 2^-60.
double arctangent(double t) {
    static constexpr double eighths[9] = {0,
                                          0.12435499454676143503,
                                          0.24497866312686415417,
                                          0.35877067027057222040,
                                          0.46364760900080611621,
                                          0.55859931534356243597,
                                          0.64350110879328438680,
                                          0.71882999962162450542,
                                          0.78539816339744830962};
    const int eighth = static_cast<int>(t * 8 + 0.5);
    const double c = eighth * 0.125, r = (t - c) / (1 + c * t), square = r * r;
    double sum = 1.0 / 13;
    for (int k = 11; k >= 1; k -= 2) sum = 1.0 / k - sum * square;
    return eighths[eighth] + r * sum;
}

}  // namespace

double phaseOf(double re, double im) {
    constexpr double kPi = 3.14159265358979323846;
    const double x = __builtin_fabs(re), y = __builtin_fabs(im);
    if (!(x <= y) && !(y <= x)) return x + y;  // no number
    const bool isSteep = y > x;
    const double least = isSteep ? x : y, most = isSteep ? y : x;
    double angle = arctangent(least == most ? (most == 0 ? 0 : 1) : least / most);
    if (isSteep) angle = kPi / 2 - angle;
    if (re < 0) angle = kPi - angle;
    return im < 0 ? -angle : angle;
}

}  // namespace qori::kernels
