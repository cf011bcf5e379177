// SPDX-License-Identifier: Apache-2.0
// Resize of whole images; plans and buffers are made outside the timing. A peer resizes the planes of a packed image
// one by one and widens all filters but nearest on reductions, so it stands beside the antialiasing forms there.
#include "resize_job.h"

#ifdef QORI_BENCH_ZIMG
#include <zimg.h>
#endif

namespace qori::bench {
namespace {

constexpr Sizes kDown{{1920, 1080}, {1280, 720}}, kHalf{{3840, 2160}, {1920, 1080}}, kUp{{960, 540}, {1920, 1080}};
constexpr Sizes kNotSimple{{1920, 1080}, {1366, 768}};  // weights that are no short binary fractions

#ifdef QORI_BENCH_ZIMG
template <class T>
std::function<void()> peerOf(QorInterpolationKind kind, int planes, Sizes sizes) {
    const auto format = [](Size size) {
        zimg_image_format f;
        zimg_image_format_default(&f, ZIMG_API_VERSION);
        f.width = static_cast<unsigned>(size.width);
        f.height = static_cast<unsigned>(size.height);
        f.pixel_type = sizeof(T) == 1 ? ZIMG_PIXEL_BYTE : sizeof(T) == 2 ? ZIMG_PIXEL_WORD : ZIMG_PIXEL_FLOAT;
        f.depth = 8 * sizeof(T);
        f.pixel_range = ZIMG_RANGE_FULL;
        return f;
    };
    zimg_graph_builder_params params;
    zimg_graph_builder_params_default(&params, ZIMG_API_VERSION);
    params.cpu_type = ZIMG_CPU_AUTO_64B;
    params.resample_filter = kind == interpNearest  ? ZIMG_RESIZE_POINT
                             : kind == interpLinear ? ZIMG_RESIZE_BILINEAR
                             : kind == interpCubic  ? ZIMG_RESIZE_BICUBIC
                                                    : ZIMG_RESIZE_LANCZOS;
    params.filter_param_a = kind == interpCubic ? 0 : kLobes;
    params.filter_param_b = 0.5;
    const zimg_image_format from = format(sizes.src), to = format(sizes.dst);
    const std::shared_ptr<zimg_filter_graph> graph(zimg_filter_graph_build(&from, &to, &params),
                                                   zimg_filter_graph_free);
    size_t bytes = 0;
    zimg_filter_graph_get_tmp_size(graph.get(), &bytes);
    const Block buffer = allocate(bytes);
    std::vector<std::pair<Image<T>, Image<T>>> images;
    for (int i = 0; i < planes; ++i) images.emplace_back(Image<T>(sizes.src, 1), Image<T>(sizes.dst, 1));
    return [=] {
        zimg_image_buffer_const in{};
        zimg_image_buffer out{};
        in.version = out.version = ZIMG_API_VERSION;
        for (const auto& [src, dst] : images) {
            in.plane[0] = {src.data(), src.step(), ZIMG_BUFFER_MAX};
            out.plane[0] = {dst.data(), dst.step(), ZIMG_BUFFER_MAX};
            zimg_filter_graph_process(graph.get(), &in, &out, buffer.get(), nullptr, nullptr, nullptr, nullptr);
        }
    };
}
#endif

const char* nameOf(QorInterpolationKind kind) {
    switch (kind) {
        case interpNearest: return "nearest";
        case interpLinear: return "linear";
        case interpCubic: return "cubic";
        case interpSuper: return "super";
        default: return "lanczos3";
    }
}

template <class T>
constexpr const char* kTypeName = sizeof(T) == 1   ? "8u"
                                  : sizeof(T) == 2 ? "16u"
                                                   : "32f";

template <class T, int channels>
Row row(QorInterpolationKind kind, bool antialiasing, Sizes sizes, double best) {
    const double ratio = static_cast<double>(sizes.src.pixels()) / static_cast<double>(sizes.dst.pixels());
    const auto make = [=](Size) {
        Contenders all{resizeJob<T, channels>(kind, antialiasing, Image<T>(sizes.src, channels),
                                              Image<T>(sizes.dst, channels), sizes),
                       {},
                       {}};
#ifdef QORI_BENCH_ZIMG
        if (kind == interpNearest || (kind != interpSuper && (antialiasing || ratio < 1)))
            all.peer = peerOf<T>(kind, channels, sizes);
#endif
        return all;
    };
    return {.operation = std::string("resize ") + (antialiasing ? "antialias " : "") + nameOf(kind) + " " +
                         kTypeName<T> + " C" + std::to_string(channels) + " from " + std::to_string(sizes.src.width) +
                         "x" + std::to_string(sizes.src.height),
            .bytesPerPixel = channels * sizeof(T) * (1 + ratio),
            .sizes = {sizes.dst},
            .make = make,
            .peerName = "zimg",
            .best = best};
}

/// Best known rates of 8u C1, 8u C3 and 32f C1 per pair of sizes.
struct Best {
    double c1, c3, floats;
};

std::vector<Row> rowsOf(QorInterpolationKind kind, bool antialiasing, Best down, Best half, Best up) {
    std::vector<Row> rows;
    const auto add = [&](Sizes sizes, Best best) {
        rows.push_back(row<uint8_t, 1>(kind, antialiasing, sizes, best.c1));
        rows.push_back(row<uint8_t, 3>(kind, antialiasing, sizes, best.c3));
        rows.push_back(row<uint16_t, 1>(kind, antialiasing, sizes, 0));
        rows.push_back(row<float, 1>(kind, antialiasing, sizes, best.floats));
    };
    add(kDown, down);
    add(kHalf, half);
    if (!antialiasing && kind != interpSuper) add(kUp, up);
    return rows;
}

const Rows nearest{rowsOf(interpNearest, false, {9'460, 3'115, 2'508}, {7'825, 2'540, 1'952}, {16'971, 5'362, 4'482})};
const Rows nearestOfFour{{row<uint8_t, 4>(interpNearest, false, kDown, 0),
                          row<uint8_t, 4>(interpNearest, false, kHalf, 0),
                          row<uint8_t, 4>(interpNearest, false, kUp, 0)}};

/// Packed pixels that go other ways than one channel does.
std::vector<Row> packedRows(QorInterpolationKind kind) {
    std::vector<Row> rows;
    for (const Sizes& sizes : {kDown, kUp, kNotSimple}) {
        rows.push_back(row<uint8_t, 4>(kind, false, sizes, 0));
        rows.push_back(row<uint16_t, 3>(kind, false, sizes, 0));
        rows.push_back(row<uint16_t, 4>(kind, false, sizes, 0));
    }
    rows.push_back(row<uint8_t, 1>(kind, false, kNotSimple, 0));
    rows.push_back(row<uint8_t, 3>(kind, false, kNotSimple, 0));
    return rows;
}
const Rows packedLinear{packedRows(interpLinear)}, packedCubic{packedRows(interpCubic)};

const Rows linear{rowsOf(interpLinear, false, {6'077, 755, 1'240}, {5'835, 872, 1'411}, {13'581, 2'049, 4'137})};
const Rows cubic{rowsOf(interpCubic, false, {2'051, 597, 460}, {1'355, 502, 349}, {3'133, 915, 3'357})};
const Rows lanczos{rowsOf(interpLanczos, false, {208, 82, 190}, {156, 57, 145}, {2'457, 158, 2'405})};
const Rows super{rowsOf(interpSuper, false, {1'034, 420, 796}, {5'568, 1'880, 1'436}, {})};
const Rows widenedLinear{rowsOf(interpLinear, true, {1'733, 377, 1'272}, {1'295, 259, 863}, {})};
const Rows widenedCubic{rowsOf(interpCubic, true, {1'275, 279, 1'000}, {923, 170, 744}, {})};
const Rows widenedLanczos{rowsOf(interpLanczos, true, {907, 50, 781}, {694, 32, 502}, {})};

}  // namespace
}  // namespace qori::bench
