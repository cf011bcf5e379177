// SPDX-License-Identifier: Apache-2.0
#include <cstring>

#include "bench.h"

namespace qori::bench {
namespace {

template <class T>
using Unary = QorResult(QORI_CALL*)(const T*, int32_t, T*, int32_t, QorImageSize);

/// Columns in padded rows, where the cost of a row shows.
std::vector<Size> withColumns() {
    std::vector<Size> sizes = kSizes;
    for (int width : {1, 3, 8}) sizes.push_back({width, 4096});
    return sizes;
}

/// Copies between packed images; plain(src, dst, pixels) is the loop over one row.
template <class T, class Plain>
Row copyRow(std::string name, Unary<T> function, int from, int to, int bytesRead, int bytesWritten, Plain plain,
            std::vector<Size> sizes = kSizes, double bestAtL2 = 0, double bestAtFrame = 0, bool packed = false) {
    const auto make = [=](Size size) {
        Image<T> src(size, from, packed), dst(size, to, packed);
        return Contenders{[=] { must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi())); },
                          [=] {
                              for (int y = 0; y < size.height; ++y) {
                                  plain(src.row(y), dst.row(y), size.width);
                                  keep(dst.row(y));
                              }
                          },
                          {},
                          outputOf(dst)};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(bytesRead + bytesWritten),
            .sizes = std::move(sizes),
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

template <int n, class T>
void plainCopy(const T* s, T* d, int width) {
    for (int i = 0; i < width * n; ++i) d[i] = s[i];
}

template <int from, int to, int count, class T>
void plainChannels(const T* s, T* d, int width) {
    for (int x = 0; x < width; ++x)
        for (int c = 0; c < count; ++c) d[x * to + c] = s[x * from + c];
}

template <int to, class T>
void plainDuplicate(const T* s, T* d, int width) {
    for (int x = 0; x < width; ++x)
        for (int c = 0; c < to; ++c) d[x * to + c] = s[x];
}

template <class T, int n>
Row splitRow(std::string name, QorResult(QORI_CALL* function)(const T*, int32_t, T* const*, int32_t, QorImageSize),
             double bestAtL2 = 0, double bestAtFrame = 0) {
    const auto make = [=](Size size) {
        Image<T> src(size, n);
        std::vector<Image<T>> planes(n, Image<T>({1, 1}, 1));
        for (auto& plane : planes) plane = Image<T>(size, 1);
        return Contenders{[=] {
                              T* pointers[n];
                              for (size_t c = 0; c < n; ++c) pointers[c] = planes[c].data();
                              must(function(src.data(), src.step(), pointers, planes[0].step(), size.roi()));
                          },
                          [=] {
                              for (int y = 0; y < size.height; ++y) {
                                  const T* s = src.row(y);
                                  T* d[n];
                                  for (size_t c = 0; c < n; ++c) d[c] = planes[c].row(y);
                                  for (int x = 0; x < size.width; ++x)
                                      for (int c = 0; c < n; ++c) d[c][x] = s[x * n + c];
                                  keep(d[0]);
                              }
                          },
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * n * sizeof(T),
            .sizes = kSizes,
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

template <class T, int n>
Row mergeRow(std::string name, QorResult(QORI_CALL* function)(const T* const*, int32_t, T*, int32_t, QorImageSize)) {
    const auto make = [=](Size size) {
        Image<T> dst(size, n);
        std::vector<Image<T>> planes(n, Image<T>({1, 1}, 1));
        for (auto& plane : planes) plane = Image<T>(size, 1);
        return Contenders{[=] {
                              const T* pointers[n];
                              for (size_t c = 0; c < n; ++c) pointers[c] = planes[c].data();
                              must(function(pointers, planes[0].step(), dst.data(), dst.step(), size.roi()));
                          },
                          [=] {
                              for (int y = 0; y < size.height; ++y) {
                                  T* d = dst.row(y);
                                  const T* s[n];
                                  for (size_t c = 0; c < n; ++c) s[c] = planes[c].row(y);
                                  for (int x = 0; x < size.width; ++x)
                                      for (int c = 0; c < n; ++c) d[x * n + c] = s[c][x];
                                  keep(d);
                              }
                          },
                          {},
                          outputOf(dst)};
    };
    return {.operation = std::move(name), .bytesPerPixel = 2.0 * n * sizeof(T), .sizes = kSizes, .make = make};
}

template <class T, int n>
Row maskedRow(std::string name,
              QorResult(QORI_CALL* function)(const T*, int32_t, T*, int32_t, QorImageSize, const uint8_t*, int32_t),
              double bestAtL2 = 0, double bestAtFrame = 0) {
    const auto make = [=](Size size) {
        Image<T> src(size, n), dst(size, n);
        Image<uint8_t> mask(size, 1);
        // Half of the pixels, in random places: the costly case.
        for (int y = 0; y < size.height; ++y)
            for (int x = 0; x < size.width; ++x) mask.row(y)[x] = mask.row(y)[x] & 1;
        return Contenders{
            [=] {
                must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mask.data(), mask.step()));
            },
            [=] {
                for (int y = 0; y < size.height; ++y) {
                    for (int x = 0; x < size.width; ++x)
                        if (mask.row(y)[x])
                            for (int c = 0; c < n; ++c) dst.row(y)[x * n + c] = src.row(y)[x * n + c];
                    keep(dst.row(y));
                }
            },
            {},
            outputOf(dst)};
    };
    // Source and destination are read, the destination is written.
    return {.operation = std::move(name),
            .bytesPerPixel = 3.0 * n * sizeof(T) + 1,
            .sizes = withColumns(),
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

template <class T, int n, class Function>
Row fillRow(std::string name, Function function, std::vector<Size> sizes = kSizes, double bestAtL2 = 0,
            double bestAtFrame = 0, bool packed = false) {
    const auto make = [=](Size size) {
        Image<T> dst(size, n, packed);
        return Contenders{[=] {
                              const T values[4] = {1, 2, 3, 4};
                              if constexpr (n == 1)
                                  must(function(values[0], dst.data(), dst.step(), size.roi()));
                              else
                                  must(function(values, dst.data(), dst.step(), size.roi()));
                          },
                          [=] {
                              for (int y = 0; y < size.height; ++y) {
                                  T* d = dst.row(y);
                                  for (int x = 0; x < size.width; ++x)
                                      for (int c = 0; c < n; ++c) d[x * n + c] = static_cast<T>(c + 1);
                                  keep(d);
                              }
                          },
                          {},
                          outputOf(dst)};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(n * sizeof(T)),
            .sizes = std::move(sizes),
            .make = make,
            .roofline = Roofline::set,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

std::vector<Size> withSmall() {
    std::vector<Size> sizes = kSizes;
    sizes.push_back(kSmall);
    return sizes;
}

/// Packed 8u C1 from 256 KiB to 256 MiB in steps of two: from the second-level cache to where stores stream.
std::vector<Size> ladder() {
    std::vector<Size> sizes = kContiguous;
    for (int width = 512, height = 512; height <= 8192; height < width ? height *= 2 : width *= 2)
        if (width != 2048 || height != 2048) sizes.push_back({width, height});
    return sizes;
}

const Rows rows{{
    copyRow<uint8_t>("copy 8u C1", qoriCopy_8u_C1R, 1, 1, 1, 1, plainCopy<1, uint8_t>, withSmall(), 52'604, 15'345),
    copyRow<uint8_t>("copy 8u C3", qoriCopy_8u_C3R, 3, 3, 3, 3, plainCopy<3, uint8_t>, withSmall(), 14'798, 4'770),
    copyRow<uint8_t>("copy 8u C4", qoriCopy_8u_C4R, 4, 4, 4, 4, plainCopy<4, uint8_t>, withColumns(), 7'484, 3'516),
    copyRow<uint8_t>("copy packed 8u C1", qoriCopy_8u_C1R, 1, 1, 1, 1, plainCopy<1, uint8_t>, ladder(), 0, 0, true),
    copyRow<float>("copy 32f C3", qoriCopy_32f_C3R, 3, 3, 12, 12, plainCopy<3, float>),
    copyRow<uint8_t>("copy 8u AC4", qoriCopy_8u_AC4R, 4, 4, 4, 8, plainChannels<4, 4, 3, uint8_t>, withSmall()),
    copyRow<float>("copy 32f AC4", qoriCopy_32f_AC4R, 4, 4, 16, 32, plainChannels<4, 4, 3, float>),
    maskedRow<uint8_t, 1>("copy masked 8u C1", qoriCopy_8u_C1MR, 26'482, 9'883),
    maskedRow<uint8_t, 3>("copy masked 8u C3", qoriCopy_8u_C3MR, 1'928, 1'706),
    maskedRow<uint8_t, 4>("copy masked 8u C4", qoriCopy_8u_C4MR),
    maskedRow<float, 3>("copy masked 32f C3", qoriCopy_32f_C3MR),
    copyRow<uint8_t>("extract 8u C3C1", qoriCopy_8u_C3C1R, 3, 1, 3, 1, plainChannels<3, 1, 1, uint8_t>, withSmall()),
    copyRow<uint8_t>("extract 8u C4C1", qoriCopy_8u_C4C1R, 4, 1, 4, 1, plainChannels<4, 1, 1, uint8_t>),
    copyRow<float>("extract 32f C3C1", qoriCopy_32f_C3C1R, 3, 1, 12, 4, plainChannels<3, 1, 1, float>),
    copyRow<uint8_t>("insert 8u C1C3", qoriCopy_8u_C1C3R, 1, 3, 1, 6, plainChannels<1, 3, 1, uint8_t>, withSmall()),
    copyRow<uint8_t>("insert 8u C1C4", qoriCopy_8u_C1C4R, 1, 4, 1, 8, plainChannels<1, 4, 1, uint8_t>),
    copyRow<uint8_t>("channel 8u C3C", qoriCopy_8u_C3CR, 3, 3, 3, 6, plainChannels<3, 3, 1, uint8_t>),
    copyRow<uint8_t>("drop alpha 8u AC4C3", qoriCopy_8u_AC4C3R, 4, 3, 4, 3, plainChannels<4, 3, 3, uint8_t>),
    copyRow<uint8_t>("fill colour 8u C3AC4", qoriCopy_8u_C3AC4R, 3, 4, 3, 8, plainChannels<3, 4, 3, uint8_t>),
    copyRow<uint8_t>("duplicate 8u C1C3", qoriDup_8u_C1C3R, 1, 3, 1, 3, plainDuplicate<3, uint8_t>),
    copyRow<uint8_t>("duplicate 8u C1C4", qoriDup_8u_C1C4R, 1, 4, 1, 4, plainDuplicate<4, uint8_t>),
    splitRow<uint8_t, 3>("split 8u C3P3", qoriCopy_8u_C3P3R, 12'973, 4'600),
    splitRow<uint8_t, 4>("split 8u C4P4", qoriCopy_8u_C4P4R),
    splitRow<int16_t, 3>("split 16s C3P3", qoriCopy_16s_C3P3R),
    splitRow<float, 3>("split 32f C3P3", qoriCopy_32f_C3P3R),
    splitRow<float, 4>("split 32f C4P4", qoriCopy_32f_C4P4R),
    mergeRow<uint8_t, 3>("merge 8u P3C3", qoriCopy_8u_P3C3R),
    mergeRow<uint8_t, 4>("merge 8u P4C4", qoriCopy_8u_P4C4R),
    mergeRow<float, 3>("merge 32f P3C3", qoriCopy_32f_P3C3R),
    mergeRow<float, 4>("merge 32f P4C4", qoriCopy_32f_P4C4R),
    fillRow<uint8_t, 1>("set 8u C1", qoriSet_8u_C1R, withSmall(), 58'424, 26'894),
    fillRow<uint8_t, 3>("set 8u C3", qoriSet_8u_C3R, withSmall(), 19'138, 8'463),
    fillRow<uint8_t, 1>("set packed 8u C1", qoriSet_8u_C1R, ladder(), 0, 0, true),
    fillRow<float, 3>("set 32f C3", qoriSet_32f_C3R),
    fillRow<float, 4>("set 32f C4", qoriSet_32f_C4R),
}};

}  // namespace
}  // namespace qori::bench
