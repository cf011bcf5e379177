// SPDX-License-Identifier: Apache-2.0
// Resize of whole images; plans and buffers are made outside the timing. A peer resizes the planes of a packed image
// one by one and widens all filters but nearest on reductions, so it stands beside the antialiasing forms there.
#include "bench.h"

#ifdef QORI_BENCH_ZIMG
#include <zimg.h>
#endif

namespace qori::bench {
namespace {

struct Sizes {
    Size src, dst;
};
constexpr Sizes kDown{{1920, 1080}, {1280, 720}}, kHalf{{3840, 2160}, {1920, 1080}}, kUp{{960, 540}, {1920, 1080}};
constexpr Sizes kNotSimple{{1920, 1080}, {1366, 768}};  // weights that are no short binary fractions

using Block = std::shared_ptr<uint8_t>;

Block allocate(size_t bytes) {
    return {static_cast<uint8_t*>(std::aligned_alloc(64, (bytes + 63) / 64 * 64)), std::free};
}

/// The exports of one element type and layout.
template <class T, int channels>
struct Exports;
#define QORI_EXPORTS(T, t, n)                                                 \
    template <>                                                               \
    struct Exports<T, n> {                                                    \
        static constexpr auto getSize = qoriResizeGetSize_##t;                \
        static constexpr auto getBufferSize = qoriResizeGetBufferSize_##t;    \
        static constexpr auto nearestInit = qoriResizeNearestInit_##t;        \
        static constexpr auto linearInit = qoriResizeLinearInit_##t;          \
        static constexpr auto cubicInit = qoriResizeCubicInit_##t;            \
        static constexpr auto lanczosInit = qoriResizeLanczosInit_##t;        \
        static constexpr auto superInit = qoriResizeSuperInit_##t;            \
        static constexpr auto nearest = qoriResizeNearest_##t##_C##n##R;      \
        static constexpr auto linear = qoriResizeLinear_##t##_C##n##R;        \
        static constexpr auto cubic = qoriResizeCubic_##t##_C##n##R;          \
        static constexpr auto lanczos = qoriResizeLanczos_##t##_C##n##R;      \
        static constexpr auto super = qoriResizeSuper_##t##_C##n##R;          \
        static constexpr auto widened = qoriResizeAntialiasing_##t##_C##n##R; \
    };
QORI_EXPORTS(uint8_t, 8u, 1)
QORI_EXPORTS(uint8_t, 8u, 3)
QORI_EXPORTS(uint8_t, 8u, 4)
QORI_EXPORTS(uint16_t, 16u, 1)
QORI_EXPORTS(uint16_t, 16u, 3)
QORI_EXPORTS(uint16_t, 16u, 4)
QORI_EXPORTS(float, 32f, 1)
#undef QORI_EXPORTS

constexpr int kLobes = 3;

template <class T, int channels>
std::function<void()> oursOf(QorInterpolationKind kind, bool antialiasing, Image<T> src, Image<T> dst, Sizes sizes) {
    using E = Exports<T, channels>;
    const QorImageSize from = sizes.src.roi(), to = sizes.dst.roi();
    int32_t planBytes, initBytes, bufferBytes;
    E::getSize(from, to, kind, antialiasing, &planBytes, &initBytes);
    const Block memory = allocate(static_cast<size_t>(planBytes)), init = allocate(static_cast<size_t>(initBytes));
    auto* plan = reinterpret_cast<QorResizePlan*>(memory.get());
    uint8_t* scratch = init.get();
    switch (kind) {
        case interpNearest: E::nearestInit(from, to, plan); break;
        case interpSuper: E::superInit(from, to, plan); break;
        case interpLinear:
            if (antialiasing)
                qoriResizeAntialiasingLinearInit(from, to, plan, scratch);
            else
                E::linearInit(from, to, plan);
            break;
        case interpCubic:
            if (antialiasing)
                qoriResizeAntialiasingCubicInit(from, to, 0, 0.5f, plan, scratch);
            else
                E::cubicInit(from, to, 0, 0.5f, plan, scratch);
            break;
        case interpLanczos:
            if (antialiasing)
                qoriResizeAntialiasingLanczosInit(from, to, kLobes, plan, scratch);
            else
                E::lanczosInit(from, to, kLobes, plan, scratch);
            break;
    }
    E::getBufferSize(plan, to, channels, &bufferBytes);
    const Block buffer = allocate(static_cast<size_t>(bufferBytes));
    const auto inside = [=](auto function) -> std::function<void()> {
        return [=] {
            function(src.data(), src.step(), dst.data(), dst.step(), {0, 0}, to,
                     reinterpret_cast<QorResizePlan*>(memory.get()), buffer.get());
        };
    };
    const auto bordered = [=](auto function) -> std::function<void()> {
        return [=] {
            function(src.data(), src.step(), dst.data(), dst.step(), {0, 0}, to, borderReplicate, nullptr,
                     reinterpret_cast<QorResizePlan*>(memory.get()), buffer.get());
        };
    };
    if (antialiasing) return bordered(E::widened);
    switch (kind) {
        case interpNearest: return inside(E::nearest);
        case interpSuper: return inside(E::super);
        case interpLinear: return bordered(E::linear);
        case interpCubic: return bordered(E::cubic);
        default: return bordered(E::lanczos);
    }
}

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
        Contenders all{oursOf<T, channels>(kind, antialiasing, Image<T>(sizes.src, channels),
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
