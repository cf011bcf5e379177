// SPDX-License-Identifier: Apache-2.0
// A picture, its lower edge painted, made a quarter as wide and high; then how bright it is.
#include <cstdio>
#include "qori.hpp"

int main() {
    using namespace qori;
    Image<uint8_t, C3> picture({640, 480}), small({160, 120});
    check(fill({255, 128, 0}, picture));
    check(fill({0, 0, 0}, picture.view().crop({0, 464, 640, 16})));
    const ResizePlan<uint8_t> quarter(picture.size(), small.size(), Interpolation::lanczos().antialiased());
    check(quarter(picture, small));
    check(multiply(in_place(small), {1, 2, 1}));
    double brightness[3];
    check(mean(small, brightness));
    std::printf("%.1f %.1f %.1f\n", brightness[0], brightness[1], brightness[2]);
}
