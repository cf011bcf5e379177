// SPDX-License-Identifier: Apache-2.0
// Curves through any number of levels without memory that grows with it: polynomials are solved when an element needs
// them, and kept until another interval needs their room.
#pragma once
#include "curve.h"

namespace qori::kernels {

/// Room for some of a channel's polynomials.
struct PolynomialRoom {
    static constexpr int32_t kNobody = -1;

    double* c[3];
    int32_t* interval;  ///< Whose polynomial is there.
    uint32_t last;

    /// The polynomials of `n` elements, one after the other; those of elements outside all intervals stay as they are.
    template <bool isCubic>
    void solve(const Curve<int32_t>& curve, const uint32_t* places, int n, double* const (&own)[3]) const {
        for (int x = 0; x < n; ++x) {
            const uint32_t k = places[x] - 1;
            if (k >= static_cast<uint32_t>(curve.count - 1)) continue;
            const uint32_t at = k & last;
            if (interval[at] != static_cast<int32_t>(k)) keep(curve, static_cast<int32_t>(k), at);
            for (int power = 0; power < (isCubic ? 3 : 1); ++power) own[power][x] = c[power][at];
        }
    }

private:
    QORI_NOINLINE void keep(const Curve<int32_t>& curve, int32_t k, uint32_t at) const {
        const Polynomial p = polynomial(curve, k);
        for (int power = 0; power < 3; ++power) c[power][at] = p.c[power];
        interval[at] = k;
    }
};

/// Of a few channels of integers.
template <int channels>
class KeptPolynomials {
public:
    /// A channel's intervals that need not share their room: interval k has room k modulo that.
    static constexpr int32_t kMost = channels == 1 ? 1'024 : 256;

    /// All of a channel at once, for mapByCurve.
    void solveAll(int channel, Curve<int32_t>& curve) {
        for (int power = 0; power < 3; ++power) curve.c[power] = c_[channel][power];
        fillPolynomials(curve);
    }
    /// None of a channel yet.
    PolynomialRoom forget(int channel) {
        std::fill_n(interval_[channel], kMost, PolynomialRoom::kNobody);
        auto& c = c_[channel];
        return {{c[0], c[1], c[2]}, interval_[channel], kMost - 1};
    }

private:
    double c_[channels][3][kMost];
    int32_t interval_[channels][kMost];
};

/// As mapByCurve, with the polynomials that the elements need.
template <bool isCubic, class T>
QORI_NOINLINE void mapBySolving(T* block, int n, const uint32_t* places, Curve<int32_t> curve,
                                const PolynomialRoom& room) {
    constexpr int piece = 64;
    double own[3][piece] = {};
    for (int power = 0; power < 3; ++power) curve.c[power] = own[power];
    for (int x = 0; x < n; x += piece) {
        const int count = std::min(piece, n - x);
        room.solve<isCubic>(curve, places + x, count, curve.c);
        mapByCurve<isCubic, Solved::byElement>(block + x, count, places + x, curve);
    }
}

}  // namespace qori::kernels
