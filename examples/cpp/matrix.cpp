// SPDX-License-Identifier: Apache-2.0
// Pixels of a cv::Mat without a copy, and without this header knowing of it: a part of a picture, smoothed in grey.
#include <cstdio>
#include <opencv2/core.hpp>
#include "qori.hpp"

int main() {
    using namespace qori;
    cv::Mat picture(480, 640, CV_8UC3, cv::Scalar(10, 200, 30)), green(480, 640, CV_8UC1), smooth(480, 640, CV_8UC1);
    picture(cv::Rect(100, 100, 50, 50)) = cv::Scalar(0, 0, 0);
    const View<uint8_t, C3> pixels(picture);
    check(copy(pixels.channel(1), View<uint8_t>(green)));
    check(filter_box_border(View<uint8_t>(green), View<uint8_t>(smooth), {21, 21}));
    std::printf("%d %d %d\n", smooth.at<uint8_t>(125, 125), smooth.at<uint8_t>(125, 100), smooth.at<uint8_t>(10, 10));
    return View<float>(picture) ? 1 : 0;  // of other elements: no view
}
