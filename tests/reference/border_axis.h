// SPDX-License-Identifier: Apache-2.0
// What windows see along one axis of a region: pixels of it, of memory on open sides, or stand-ins on closed ones.
#pragma once
#include <algorithm>

namespace qori::test::reference {

struct BorderAxis {
    int count;
    bool openBefore, openBehind;

    bool isMissing(int at) const { return (at < 0 && !openBefore) || (at >= count && !openBehind); }
    /// The coordinate that stands for one: its mirror image, which may be missing again, or the nearest.
    int seen(int at, bool mirrors) const {
        if (!isMissing(at)) return at;
        if (!mirrors) return std::clamp(at, 0, count - 1);
        if (count == 1 && !openBefore && !openBehind) return 0;
        return seen(at < 0 ? -at : 2 * (count - 1) - at, mirrors);
    }
};

}  // namespace qori::test::reference
