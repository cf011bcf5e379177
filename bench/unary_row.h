// SPDX-License-Identifier: Apache-2.0
// Rows of operations from one image to another, element by element.
#pragma once
#include <utility>

#include "bench.h"

namespace qori::bench {

/// ours(src, srcStep, dst, dstStep, roi); plain(x) gives one element. Sources hold noise from 0 to 255, through
/// `prepare` where there is one.
template <class S, class D, class Ours, class Plain>
Row unaryRow(std::string name, int channels, Ours ours, Plain plain, double bestAtL2 = 0, double bestAtFrame = 0,
             S (*prepare)(S) = nullptr) {
    const auto make = [=](Size size) {
        const Image<S> src(size, channels);
        const Image<D> dst(size, channels);
        for (int y = 0; prepare != nullptr && y < size.height; ++y)
            for (int i = 0; i < src.elements(); ++i) src.row(y)[i] = prepare(src.row(y)[i]);
        return Contenders{[=] { ours(src.data(), src.step(), dst.data(), dst.step(), size.roi()); },
                          [=] {
                              for (int y = 0; y < size.height; ++y) {
                                  const S* s = src.row(y);
                                  D* d = dst.row(y);
                                  for (int i = 0; i < src.elements(); ++i) d[i] = plain(s[i]);
                                  keep(d);
                              }
                          },
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(channels * (sizeof(S) + sizeof(D))),
            .sizes = kSizes,
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

}  // namespace qori::bench
