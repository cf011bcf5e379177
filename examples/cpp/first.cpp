// A picture made a quarter as wide and high, and brighter.
#include <cstdio>
#include "qori.hpp"

int main() {
    using namespace qori;
    Image<uint8_t, C3> picture({640, 480}), small({160, 120});
    check(fill({255, 128, 0}, picture));
    const ResizePlan<uint8_t> quarter(picture.size(), small.size(), Interpolation::lanczos().antialiased());
    check(quarter(picture, small));
    check(multiply(in_place(small), {1, 2, 1}));
    std::printf("green: %d\n", small.at(9, 9)[1]);
}
