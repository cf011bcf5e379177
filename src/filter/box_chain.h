// SPDX-License-Identifier: Apache-2.0
// How a wide window of floats is added up from narrower ones: a chain of passes of a few terms each, every term a row
// of sums moved by some pixels. No term is ever taken away, so that errors depend on the window's own elements only,
// and the additions per pixel grow with the logarithm of the width.
#pragma once
#include <algorithm>
#include <cstdint>

#include "kernels/box/columns.h"

namespace qori::filter {

struct ChainTerm {
    int32_t level;   ///< Whose windows are added; -1 for single columns.
    int32_t offset;  ///< In pixels.
};

struct ChainLevel {
    int32_t window;  ///< Columns of the windows that it makes.
    int terms;
    ChainTerm term[kernels::kMostTerms];
};

class Chain {
public:
    explicit Chain(int32_t window) { add(window, true); }

    int levels() const { return levels_; }
    const ChainLevel& level(int index) const { return level_[index]; }
    const ChainLevel& last() const { return level_[levels_ - 1]; }

private:
    static constexpr int kMostLevels = 16;  ///< Each divides by four at least, but for the small ones.

    /// The number of equal windows that make one of this width: with what remains in single columns, the fewest terms
    /// of this pass and those below it.
    static int32_t parts(int32_t window, bool isLast) {
        if (window > 512) return 4;
        int32_t best = 2;
        for (int32_t count = 3; count <= kernels::kMostTerms; ++count)
            if (terms(window, count) <= kernels::kMostTerms && cost(window, count, isLast) < cost(window, best, isLast))
                best = count;
        return best;
    }
    static int32_t terms(int32_t window, int32_t count) { return count + window % count; }
    /// In halves of a term. Those of the last pass are half hidden by its divisions.
    static int32_t cost(int32_t window, int32_t count, bool isLast) {
        constexpr int32_t kPass = 4, kTerm = 2;  // a pass: a store and the loop
        const int32_t own = terms(window, count) * (isLast ? 1 : kTerm) + kPass, below = window / count;
        if (below <= kernels::kMostTerms) return own + below * kTerm;
        return own + cost(below, below <= 64 ? parts(below, false) : 4, false);
    }
    /// Returns the level's index.
    int32_t add(int32_t window, bool isLast) {
        ChainLevel made{window, 0, {}};
        const auto repeat = [&](int32_t level, int32_t from, int32_t width, int32_t count) {
            for (int32_t k = 0; k < count; ++k) made.term[made.terms++] = {level, from + k * width};
        };
        if (window <= kernels::kMostTerms) {
            repeat(-1, 0, 1, window);
        } else {
            const int32_t count = parts(window, isLast), width = window / count;
            repeat(add(width, false), 0, width, count);
            repeat(-1, count * width, 1, window - count * width);
        }
        level_[levels_] = made;
        return levels_++;
    }

    ChainLevel level_[kMostLevels];
    int levels_ = 0;
};

}  // namespace qori::filter
