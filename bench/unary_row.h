// SPDX-License-Identifier: Apache-2.0
// Rows of operations from one image to another, element by element.
#pragma once
#include <utility>

#include "bench.h"

namespace qori::bench {

/// ours(src, srcStep, dst, dstStep, roi); plain(x) gives one element. Sources hold noise from 0 to 255, through
/// `prepare` where there is one; results agree `within`. Of AC4, every fourth element stays.
template <class S, class D, class Ours, class Plain>
Row unaryRow(std::string name, int channels, Ours ours, Plain plain, double bestAtL2 = 0, double bestAtFrame = 0,
             S (*prepare)(S) = nullptr, double within = 0) {
    const bool keepsAlpha = name.ends_with("AC4");
    const auto make = [=](Size size) {
        const Image<S> src(size, channels);
        const Image<D> dst(size, channels);
        for (int y = 0; prepare != nullptr && y < size.height; ++y)
            for (int i = 0; i < src.elements(); ++i) src.row(y)[i] = prepare(src.row(y)[i]);
        return Contenders{[=] { must(ours(src.data(), src.step(), dst.data(), dst.step(), size.roi())); },
                          [=] {
                              for (int y = 0; y < size.height; ++y) {
                                  const S* s = src.row(y);
                                  D* d = dst.row(y);
                                  if (keepsAlpha)
                                      for (int x = 0; x < src.elements(); x += 4)
                                          for (int i = x; i < x + 3; ++i) d[i] = plain(s[i]);
                                  else
                                      for (int i = 0; i < src.elements(); ++i) d[i] = plain(s[i]);
                                  keep(d);
                              }
                          },
                          {},
                          outputOf(dst, within)};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(channels * (sizeof(S) + sizeof(D))),
            .sizes = kSizes,
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

}  // namespace qori::bench
