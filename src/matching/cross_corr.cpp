// SPDX-License-Identifier: Apache-2.0
// Cross-correlation of an image with a template.
#include "direct.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "transform.h"

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

enum class Way { pairs, doubles, transform };

/// Nanoseconds, about, of one multiplication.
constexpr double kPairCost = 0.02, kDoubleCost = 0.06;

/// Templates whose width and height leave direct sums a chance, for those who ask for them.
bool isSmall(const Problem& problem) {
    const QorImageSize tpl = problem.tpl;
    return tpl.width <= 27 || !((tpl.height >= 11 && problem.src.width > 44) || tpl.width > 64);
}

template <class T>
Way wayOf(const Problem& problem) {
    const bool fitsPairs = problem.area() < kernels::correlation::kMostPairTaps;
    const Way direct = sizeof(T) == 1 && fitsPairs ? Way::pairs : Way::doubles;
    if (problem.hint != Hint::none)
        return problem.hint == Hint::direct && fitsPairs && isSmall(problem) ? direct : Way::transform;
    const double results = static_cast<double>(problem.width()) * static_cast<double>(problem.height());
    const double cost =
        results * static_cast<double>(problem.area()) * (direct == Way::pairs ? kPairCost : kDoubleCost);
    // Plans take some microseconds themselves.
    constexpr int64_t kSurelyDirect = 64;
    constexpr double kSoon = 10'000;
    if (problem.area() <= kSurelyDirect || cost < kSoon) return direct;
    return cost < TransformPlan(problem).cost ? direct : Way::transform;
}

/// Bytes of work memory for elements of a kind, slack for its alignment included.
template <class T>
int64_t workBytes(const Problem& problem) {
    // Taps alone are beyond 31 bits, and products of lengths stay within 63.
    constexpr int64_t kTooMany = int64_t{1} << 31;
    if (problem.area() >= kTooMany) return problem.area();
    switch (wayOf<T>(problem)) {
        case Way::pairs: return DirectWork<Pair>(problem, kIsExact<T>, WorkBuffer(nullptr)).bytes();
        case Way::doubles: return DirectWork<double>(problem, kIsExact<T>, WorkBuffer(nullptr)).bytes();
        default: return TransformWork(problem, kIsExact<T>, WorkBuffer(nullptr)).bytes();
    }
}

/// Runs the channels of a call one after the other; runOne takes the channel.
template <class T, class D, class RunOne>
void forChannels(Channel<T, D> channel, int processed, RunOne runOne) {
    for (int c = 0; c < processed; ++c) {
        runOne(channel);
        ++channel.src.data;
        ++channel.tpl.data;
        ++channel.dst.data;
    }
}

template <class Cell, class T, class D>
void runDirect(const Channel<T, D>& all, int processed, uint8_t* memory) {
    DirectWork<Cell> work(all.problem, kIsExact<T>, WorkBuffer(memory));
    forChannels(all, processed, [&](const Channel<T, D>& channel) { Direct<T, D, Cell>(channel, work).run(); });
}

template <class T, class D>
void runTransform(const Channel<T, D>& all, int processed, uint8_t* memory) {
    TransformWork work(all.problem, kIsExact<T>, WorkBuffer(memory));
    work.makeTables();
    forChannels(all, processed, [&](const Channel<T, D>& channel) { Transform<T, D>(channel, work).run(); });
}

template <class T, class D>
QORI_NOINLINE void correlate(const Channel<T, D>& channel, int processed, uint8_t* memory) {
    const Way way = wayOf<T>(channel.problem);
    if constexpr (sizeof(T) == 1)
        if (way == Way::pairs) return runDirect<Pair>(channel, processed, memory);
    if (way == Way::doubles)
        runDirect<double>(channel, processed, memory);
    else
        runTransform(channel, processed, memory);
}

template <class T, class D, Layout layout>
QorResult crossCorr(Shape shape, Kind kind, Image<const T> src, QorImageSize srcRoi, Image<const T> tpl,
                    QorImageSize tplRoi, Image<D> dst, int32_t scale = 0) {
    if (QorResult r = firstOf(nullCheck(src, tpl, dst), sizesCheck(srcRoi, tplRoi), stepCheck(src, tpl, dst))) return r;
    const Problem problem{srcRoi, tplRoi, shape, kind};
    return underDefaultControl([&]() -> QorResult {
        const WorkMemory memory(workBytes<T>(problem));
        if (QorResult r = memory.check()) return r;
        correlate<T, D>({problem, src, tpl, dst, channels(layout), scale}, processedChannels(layout),
                        memory.begin<uint8_t>(1));
        return QOR_OK;
    });
}

template <class T, class D>
QorResult crossCorrNorm(Image<const T> src, QorImageSize srcRoi, Image<const T> tpl, QorImageSize tplRoi, Image<D> dst,
                        int32_t scale, int32_t algorithm, uint8_t* buffer) {
    if (QorResult r = firstOf(nullCheck(src, tpl, dst), sizesCheck(srcRoi, tplRoi), stepCheck(src, tpl, dst),
                              nullCheck(buffer), algorithmCheck(algorithm)))
        return r;
    const Problem problem = problemOf(srcRoi, tplRoi, algorithm);
    return underDefaultControl([&]() -> QorResult {
        // No buffer was reported for these.
        if (workBytes<T>(problem) > INT32_MAX) return QOR_ERR_SIZE;
        correlate<T, D>({problem, src, tpl, dst, 1, scale}, 1, buffer);
        return QOR_OK;
    });
}

QorResult crossCorrNormGetBufferSize(QorImageSize srcRoi, QorImageSize tplRoi, int32_t algorithm, int32_t* bufferSize) {
    if (QorResult r = firstOf(nullCheck(bufferSize), sizesCheck(srcRoi, tplRoi), algorithmCheck(algorithm))) return r;
    const Problem problem = problemOf(srcRoi, tplRoi, algorithm);
    return underDefaultControl([&]() -> QorResult {
        const int64_t bytes =
            std::max({workBytes<uint8_t>(problem), workBytes<uint16_t>(problem), workBytes<float>(problem)});
        return reportSize(bytes, bufferSize);
    });
}

}  // namespace
}  // namespace qori::matching

#include "entries/crosscorr.inc"
