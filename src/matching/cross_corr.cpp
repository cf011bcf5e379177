// SPDX-License-Identifier: Apache-2.0
// Cross-correlation of an image with a template.
#include "direct.h"
#include "frame/checks.h"
#include "frame/float_control.h"

namespace qori::matching {
namespace {

constexpr Shape full = Shape::full, valid = Shape::valid, same = Shape::same;
constexpr Kind plain = Kind::plain, norm = Kind::norm, normLevel = Kind::normLevel;

QorResult templateCheck(QorImageSize src, QorImageSize tpl) {
    return tpl.width > src.width || tpl.height > src.height ? QOR_ERR_SIZE : QOR_OK;
}

QorResult sizesCheck(QorImageSize src, QorImageSize tpl) {
    return firstOf(sizeCheck(src), sizeCheck(tpl), templateCheck(src, tpl));
}

/// The fields of an algorithm argument, of which none has a value beyond 2.
QorResult algorithmCheck(int32_t algorithm) {
    const auto fields = static_cast<uint32_t>(algorithm);
    const bool known = (fields & 0xFF) <= 2 && (fields >> 8 & 0xFF) <= 2 && fields >> 16 <= 2;
    return known ? QOR_OK : QOR_ERR_ALGORITHM;
}

Problem problemOf(QorImageSize src, QorImageSize tpl, int32_t algorithm) {
    constexpr Kind kinds[] = {plain, norm, normLevel};
    constexpr Hint hints[] = {Hint::none, Hint::transform, Hint::direct};
    constexpr Shape shapes[] = {full, valid, same};
    return {src, tpl, shapes[algorithm >> 16 & 3], kinds[algorithm & 3], hints[algorithm >> 8 & 3]};
}

/// Bytes of work memory for elements of a kind, slack for its alignment included.
template <class T>
int64_t workBytes(const Problem& problem) {
    if (sizeof(T) == 1 && problem.area() < kernels::correlation::kMostPairTaps)
        return DirectWork<CellOf<T>>(problem, kIsExact<T>, WorkBuffer(nullptr)).bytes();
    return DirectWork<double>(problem, kIsExact<T>, WorkBuffer(nullptr)).bytes();
}

template <class Cell, class T, class D>
void runDirect(Channel<T, D> channel, int processed, uint8_t* memory) {
    DirectWork<Cell> work(channel.problem, kIsExact<T>, WorkBuffer(memory));
    for (int c = 0; c < processed; ++c) {
        Direct<T, D, Cell>(channel, work).run();
        ++channel.src.data;
        ++channel.tpl.data;
        ++channel.dst.data;
    }
}

template <class T, class D>
QORI_NOINLINE QorResult correlate(const Channel<T, D>& channel, int processed, uint8_t* memory) {
    return underDefaultControl([&] {
        if (sizeof(T) == 1 && channel.problem.area() < kernels::correlation::kMostPairTaps)
            runDirect<CellOf<T>>(channel, processed, memory);
        else
            runDirect<double>(channel, processed, memory);
        return QOR_OK;
    });
}

template <class T, class D, Layout layout>
QorResult crossCorr(Shape shape, Kind kind, Image<const T> src, QorImageSize srcRoi, Image<const T> tpl,
                    QorImageSize tplRoi, Image<D> dst, int32_t scale = 0) {
    if (QorResult r = firstOf(nullCheck(src, tpl, dst), sizesCheck(srcRoi, tplRoi), stepCheck(src, tpl, dst))) return r;
    const Problem problem{srcRoi, tplRoi, shape, kind};
    const WorkMemory memory(workBytes<T>(problem));
    if (QorResult r = memory.check()) return r;
    return correlate<T, D>({problem, src, tpl, dst, channels(layout), scale}, processedChannels(layout),
                           memory.begin<uint8_t>(1));
}

template <class T, class D>
QorResult crossCorrNorm(Image<const T> src, QorImageSize srcRoi, Image<const T> tpl, QorImageSize tplRoi, Image<D> dst,
                        int32_t scale, int32_t algorithm, uint8_t* buffer) {
    if (QorResult r = firstOf(nullCheck(src, tpl, dst), sizesCheck(srcRoi, tplRoi), stepCheck(src, tpl, dst),
                              nullCheck(buffer), algorithmCheck(algorithm)))
        return r;
    const Problem problem = problemOf(srcRoi, tplRoi, algorithm);
    return correlate<T, D>({problem, src, tpl, dst, 1, scale}, 1, buffer);
}

QorResult crossCorrNormGetBufferSize(QorImageSize srcRoi, QorImageSize tplRoi, int32_t algorithm, int32_t* bufferSize) {
    if (QorResult r = firstOf(nullCheck(bufferSize), sizesCheck(srcRoi, tplRoi), algorithmCheck(algorithm))) return r;
    const Problem problem = problemOf(srcRoi, tplRoi, algorithm);
    const int64_t bytes =
        std::max({workBytes<uint8_t>(problem), workBytes<uint16_t>(problem), workBytes<float>(problem)});
    return reportSize(bytes, bufferSize);
}

}  // namespace
}  // namespace qori::matching

#include "entries/crosscorr.inc"
