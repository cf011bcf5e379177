// SPDX-License-Identifier: Apache-2.0
// The scalar truth of copy and set: which element goes where.
#pragma once
#include <vector>

#include "harness/image.h"

namespace qori::test::reference {

struct Route {
    int from, to;  // channels
};

/// Channels that a copy moves. Channel-of-interest images are addressed from their element, which is channel 0 there.
inline std::vector<Route> routes(Layout source, Layout target) {
    if (isChannelOfInterest(source)) return {{0, 0}};
    if (source == Layout::C1 && target != Layout::C1) return {{0, 0}};
    if (target == Layout::C1) return {{0, 0}};
    const bool threeOnly = source == Layout::AC4 || target == Layout::AC4 || channels(source) == 3;
    std::vector<Route> all;
    for (int c = 0; c < (threeOnly ? 3 : channels(source)); ++c) all.push_back({c, c});
    return all;
}

/// Whether pixel (x, y) is selected; no mask selects all.
inline bool selected(const View<uint8_t>* mask, int x, int y) { return mask == nullptr || mask->get(x, y) != 0; }

template <class T>
void copy(View<T> src, View<T> dst, QorImageSize roi, const std::vector<Route>& all, const View<uint8_t>* mask) {
    for (int y = 0; y < roi.height; ++y)
        for (int x = 0; x < roi.width; ++x)
            if (selected(mask, x, y))
                for (const Route& route : all) dst.set(x, y, route.to, src.get(x, y, route.from));
}

template <class T>
void set(const T* values, int count, View<T> dst, QorImageSize roi, const View<uint8_t>* mask) {
    for (int y = 0; y < roi.height; ++y)
        for (int x = 0; x < roi.width; ++x)
            if (selected(mask, x, y))
                for (int c = 0; c < count; ++c) dst.set(x, y, c, values[c]);
}

}  // namespace qori::test::reference
