// SPDX-License-Identifier: Apache-2.0
// What is known of a template beforehand.
#pragma once
#include <bit>
#include <cmath>

#include "problem.h"

namespace qori::matching {

/// Sums of integers are exact as they are; those of floats are kept small by offsets.
template <class T>
constexpr bool kIsExact = std::is_integral_v<T>;

/// The template's sums; `offset` is what its taps are made less by: its mean where sums of floats are to be centred,
/// else 0. `row` holds one row of doubles.
struct TemplateSums {
    kernels::correlation::Finish finish;
    double offset;
};

template <class T, class D, class Use>
void forTaps(const Channel<T, D>& channel, double offset, double* row, Use use) {
    const ptrdiff_t width = channel.problem.tpl.width;
    for (int32_t j = 0; j < channel.problem.tpl.height; ++j) {
        kernels::correlation::readCells(channel.tpl.row(j), channel.channels, {0, width, 0}, offset, row);
        for (ptrdiff_t i = 0; i < width; ++i) use(row[i]);
    }
}

template <class T, class D>
TemplateSums sumTemplate(const Channel<T, D>& channel, double* row) {
    const Problem& problem = channel.problem;
    TemplateSums sums{{problem.kind, static_cast<double>(problem.area()), 0, 0, 0, !std::is_same_v<D, double>}, 0};
    if (problem.kind == Kind::plain) return sums;
    kernels::correlation::Finish& finish = sums.finish;
    double mean = 0, squares = 0;
    if (problem.kind == Kind::normLevel) {
        forTaps(channel, 0, row, [&](double tap) { finish.tapSum += tap; });
        mean = finish.tapSum / finish.area;
        if (!kIsExact<T>) {
            sums.offset = mean;
            finish.tapSum = 0;
            forTaps(channel, mean, row, [&](double tap) { finish.tapSum += tap; });
            // Each column of a window is up to its height of additions, then twice the logarithm of its width of them
            // along the row; a sum of values enters squared.
            const double depth =
                3.0 + problem.tpl.height + 2 * std::bit_width(static_cast<uint32_t>(problem.tpl.width));
            finish.roundings = 3 * depth * 0x1p-53;
        }
    }
    forTaps(channel, mean, row, [&](double tap) { squares += tap * tap; });
    if (problem.kind == Kind::normLevel && squares < 0x1p-23) squares = 0x1p-23;
    finish.norm = std::sqrt(squares);
    return sums;
}

/// What the elements of a patch are made less by wherever centring undoes it, so that a window's energy is the
/// difference of small numbers: the median of some of them. It is one of them, so that constant areas become zeros, and
/// a few that are huge or not finite do not move it. 0 where there is nothing finite.
template <class T, class D>
double sourceOffset(const Channel<T, D>& channel, const Tile& tile) {
    if (kIsExact<T> || channel.problem.kind != Kind::normLevel) return 0;
    constexpr int kAcross = 8;
    const QorImageSize tpl = channel.problem.tpl;
    double samples[kAcross * kAcross];
    int count = 0;
    for (int i = 0; i < kAcross; ++i) {
        auto span = channel.span(tile, tile.width + tpl.width - 1);
        const T* const from = channel.patchRow(tile, (tile.height + tpl.height - 2) * i / (kAcross - 1), span);
        for (int j = 0; j < kAcross && span.inside > 0; ++j) {
            const T sample = from[(span.inside - 1) * j / (kAcross - 1) * channel.channels];
            if (std::isfinite(sample)) samples[count++] = static_cast<double>(sample);
        }
    }
    if (count == 0) return 0;
    std::nth_element(samples, samples + count / 2, samples + count);
    return samples[count / 2];
}

}  // namespace qori::matching
