// SPDX-License-Identifier: Apache-2.0
// Calls any export with arguments made from the input, hostile within their contract: null pointers, sizes below 1,
// negative and odd steps, misaligned and overlapping images, any scalar, plans of any kind and of other types. Nothing
// may crash, overflow or return a status that does not exist.
//
// Built with -DQORI_FUZZ=ON (clang) it is a libFuzzer target; else it runs a fixed number of random inputs, or writes
// to a file what calls of each export leave behind, for comparison with another build of the library.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <type_traits>
#include <utility>

#include "harness/guarded_memory.h"
#include "qorcore.h"
#include "qori.h"

namespace qori::test {
namespace {

constexpr int kArenas = 8;
/// Room for images, buffers and plans on either side of the middle, with all that windows may reach around them.
constexpr size_t kArenaBytes = 4 << 20;
/// What digests look at of an arena, around its middle.
constexpr size_t kSeenBefore = 32 << 10, kSeen = 128 << 10;
constexpr int kMostWidth = 70, kMostHeight = 6, kMostStep = 2000, kMostLevels = 300;

GuardedPages arenas[kArenas];

GuardedPages filledArena() {
    const GuardedPages arena = mapGuarded(kArenaBytes);
    for (size_t i = 0; i < arena.size; ++i) arena.begin[i] = static_cast<uint8_t>(i * 167 >> 3);
    return arena;
}

/// An arena as all of them begin.
const GuardedPages& pristine() {
    static const GuardedPages arena = filledArena();
    return arena;
}

/// Takes values off the input; zeros when it has run out.
class Input {
public:
    Input(const uint8_t* data, size_t size) : data_(data), size_(size) {}

    template <class T>
    T take() {
        T value{};
        const size_t n = size_ < sizeof(T) ? size_ : sizeof(T);
        if (n > 0) std::memcpy(&value, data_, n);
        data_ += n;
        size_ -= n;
        return value;
    }

    /// Memory for the next pointer argument, sometimes none, sometimes shared with another.
    uint8_t* memory() {
        const auto choice = take<uint8_t>();
        if (choice >= 250) return nullptr;
        last = choice < 8 && !apart ? choice : static_cast<unsigned>(next_++) % kArenas;
        GuardedPages& arena = arenas[last];
        used |= 1u << last;
        if (arena.begin == nullptr) arena = filledArena();
        return arena.begin + kArenaBytes / 2 + choice % 67;
    }

    int upTo(int most) { return take<uint8_t>() % (most + 1); }
    QorImageSize size() {
        const auto part = [&](int most) {
            const auto v = take<uint8_t>();
            return v >= 250 ? 250 - v : 1 + v % most;
        };
        const int width = part(kMostWidth);
        return {width, part(kMostHeight)};
    }

    /// Left by a pointer, so that the integer behind it is taken as a step or a count.
    bool stepFollows = false;
    bool countsBits = false;   ///< An integer says how far into the rows the export begins.
    bool countsReach = false;  ///< Integers say how far the export reads around the region.
    bool isOrder = false;      ///< Integers are exponents of sizes.
    bool releases = false;     ///< The export frees a plan.
    bool isAlgorithm = false;  ///< An integer is a QorCorrelation.
    bool apart = false;        ///< No two arguments share memory.
    unsigned used = 0;         ///< Arenas that arguments point into, as bits, and the last of them.
    unsigned last = 0;
    int channels = 1;      ///< Of the export that is called.
    int32_t dataType = 0;  ///< QorDataType of its first element type.

private:
    const uint8_t* data_;
    size_t size_;
    int next_ = 0;
};

/// Counts of levels, kernels and images of 32s: small numbers, negative ones among them.
const int32_t* smallIntegers(Input& in) {
    static int32_t numbers[kArenaBytes / 4];
    if (numbers[1] == 0)
        for (size_t i = 0; i < kArenaBytes / 4; ++i) numbers[i] = static_cast<int32_t>(i * 97 % (kMostLevels + 3)) - 2;
    const auto choice = in.take<uint8_t>();
    return choice >= 250 ? nullptr : numbers + kArenaBytes / 8 + choice;
}

uint8_t* planMemory() {
    static const GuardedPages pages = mapGuarded(kArenaBytes);
    return pages.begin;
}

using ResizeInit = QorResult (*)(QorImageSize, QorImageSize, QorResizePlan*, uint8_t*, Input&);
constexpr ResizeInit kResizeInits[] = {
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t*, Input&) {
        return qoriResizeNearestInit_8u(src, dst, plan);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t*, Input& in) {
        return (in.dataType == qor8u ? qoriResizeLinearInit_8u : qoriResizeLinearInit_32f)(src, dst, plan);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t* init, Input& in) {
        return qoriResizeCubicInit_8u(src, dst, in.take<float>(), in.take<float>(), plan, init);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t* init, Input& in) {
        return qoriResizeLanczosInit_8u(src, dst, 2 + in.take<uint8_t>() % 2u, plan, init);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t*, Input&) {
        return qoriResizeSuperInit_8u(src, dst, plan);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t* init, Input&) {
        return qoriResizeAntialiasingLinearInit(src, dst, plan, init);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t* init, Input& in) {
        return qoriResizeAntialiasingCubicInit(src, dst, in.take<float>(), in.take<float>(), plan, init);
    },
    [](QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t* init, Input& in) {
        return qoriResizeAntialiasingLanczosInit(src, dst, 2 + in.take<uint8_t>() % 2u, plan, init);
    },
};

/// A plan of any interpolation, or none where the sizes are refused. Its tag stays behind from an earlier plan then,
/// and so does the plan.
const QorResizePlan* resizePlan(Input& in) {
    static uint8_t init[1 << 16];
    auto* plan = reinterpret_cast<QorResizePlan*>(planMemory() + in.upTo(63));
    const QorImageSize src = in.size(), dst = in.size();
    std::memset(planMemory(), 0, 256);
    kResizeInits[in.take<uint8_t>() % std::size(kResizeInits)](src, dst, plan, init, in);
    return plan;
}

/// A plan for the type and channels of the export: these carry no tag.
const QorLinearFilterPlan* filterPlan(Input& in) {
    auto* plan = reinterpret_cast<QorLinearFilterPlan*>(planMemory() + in.upTo(63));
    const QorImageSize size{1 + in.upTo(8), 1 + in.upTo(4)};
    union {
        int16_t integers[64];
        float floats[64];
    } kernel{};
    for (int i = 0; i < 45; ++i) {
        if (in.dataType == qor32f)
            kernel.floats[i] = in.take<float>();
        else
            kernel.integers[i] = in.take<int16_t>();
    }
    const int32_t divisor = in.take<int16_t>() | 1, mode = in.upTo(2);
    const QorResult result =
        in.dataType == qor32f
            ? qoriFilterBorderInit_32f(kernel.floats, size, in.dataType, in.channels, mode, plan)
            : qoriFilterBorderInit_16s(kernel.integers, size, divisor, in.dataType, in.channels, mode, plan);
    return result == QOR_OK ? plan : nullptr;
}

const QorHistogramSpec* histogramSpec(Input& in) {
    auto* spec = reinterpret_cast<QorHistogramSpec*>(planMemory() + 4 * in.upTo(15));
    float lower[4], upper[4];
    int32_t counts[4];
    for (int c = 0; c < 4; ++c) {
        lower[c] = in.take<float>();
        upper[c] = in.take<float>();
        counts[c] = in.take<uint16_t>() % kMostLevels;
    }
    std::memset(planMemory(), 0, 256);
    qoriHistogramUniformInit(in.dataType, lower, upper, counts, in.channels, spec);
    return spec;
}

const QorAdaptiveGaussSpec* adaptiveSpec(Input& in) {
    auto* spec = reinterpret_cast<QorAdaptiveGaussSpec*>(planMemory() + in.upTo(63));
    const int side = 1 + 2 * in.upTo(4);
    std::memset(planMemory(), 0, 256);
    qoriThresholdAdaptiveGaussInit({1, 1}, {side, side}, in.dataType, 1, in.take<float>(), spec);
    return spec;
}

/// A plan of InitAlloc's, for the call or made by it; released after the call.
QorFft2DPlan* allocatedPlan;

using FourierInit = QorResult (*)(QorFft2DPlan**, QorImageSize, int32_t flag);
constexpr FourierInit kFourierInits[] = {
    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) { return qoriDFTInitAlloc_R_32f(plan, size, flag, 1); },
    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) { return qoriDFTInitAlloc_R_32s(plan, size, flag, 1); },
    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) { return qoriDFTInitAlloc_C_32fc(plan, size, flag, 1); },
    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
        return qoriFFTInitAlloc_R_32f(plan, size.width % 7, size.height % 4, flag, 1);
    },
    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
        return qoriFFTInitAlloc_R_32s(plan, size.width % 7, size.height % 4, flag, 1);
    },
    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
        return qoriFFTInitAlloc_C_32fc(plan, size.width % 7, size.height % 4, flag, 1);
    },
};

/// Of any kind, or none where the size is refused.
QorFft2DPlan* fourierPlan(Input& in) {
    const FourierInit init = kFourierInits[in.take<uint8_t>() % std::size(kFourierInits)];
    init(&allocatedPlan, in.size(), 1 << in.upTo(3));
    return allocatedPlan;
}

/// None where the size is refused: the tag is gone then.
QorDct2DPlan* cosinePlan(Input& in) {
    auto* plan = reinterpret_cast<QorDct2DPlan*>(planMemory() + in.upTo(63));
    static uint8_t init[1 << 18];
    std::memset(planMemory(), 0, 256);
    qoriDCTFwdInit_32f(in.size(), 0, plan, init);
    return plan;
}

/// Where a plan in memory of its own is stored; the plan before it is released.
QorDct2DPlan** newCosinePlan(Input& in) {
    static QorDct2DPlan* plan;
    if (plan != nullptr) qoriDCTFwdFree_32f(plan);
    plan = nullptr;
    return in.take<uint8_t>() >= 250 ? nullptr : &plan;
}

const QorHogConfig* hogConfig(Input& in) {
    static QorHogConfig config;
    const int cell = 1 + in.upTo(16);
    config = {in.upTo(1), cell, 2 * cell, cell * (1 + in.upTo(2)), 1 + in.upTo(16), in.take<float>(), 0.2f, {}};
    config.winSize = {2 * cell + config.blockStride * in.upTo(3), 2 * cell + config.blockStride * in.upTo(3)};
    if (in.upTo(9) == 0) (&config.blockOrder)[in.upTo(4)] = in.take<int32_t>();
    return in.take<uint8_t>() >= 250 ? nullptr : &config;
}

/// Of windows that fit the images here, which are low.
const QorHogPlan* hogPlan(Input& in) {
    auto* plan = reinterpret_cast<QorHogPlan*>(planMemory() + in.upTo(63));
    const int across = in.upTo(2), stride = 2 + 2 * in.upTo(2);
    const QorHogConfig config{in.upTo(1),
                              2,
                              4,
                              stride,
                              2 + in.upTo(14),
                              1.0f + in.take<uint8_t>(),
                              0.2f,
                              {4 + across * stride, stride == 2 ? 4 + 2 * in.upTo(1) : 4}};
    std::memset(planMemory(), 0, 256);
    qoriHOGInit(&config, plan);
    return plan;
}

/// As many as a step may say; every fourth lies in most images, so that their descriptors fit an arena.
const QorPoint2D* locations(Input& in) {
    static QorPoint2D points[kMostStep];
    if (points[0].x == 0)
        for (int i = 0; i < kMostStep; ++i) points[i] = {i % 4 == 3 ? i % 9 : i * 997, i % 4 == 3 ? i % 3 : -i};
    points[0].x = -1;
    return in.take<uint8_t>() >= 250 ? nullptr : points;
}

/// Turns, scales, shears and any doubles at all.
const double* coefficients(Input& in) {
    static double c[6];
    for (double& v : c)
        v = in.take<uint8_t>() % 8 == 0 ? in.take<double>() : static_cast<double>(in.take<int16_t>()) / 1024;
    if (in.take<uint8_t>() % 2 == 0) {
        c[0] = c[4] = 1;
        c[1] = c[3] = 0;
    }
    return c;
}

/// A plan of any interpolation that is mostly for the type and channels of the export, or none where it is refused. The
/// source is as large as the image may be.
const QorWarpPlan* warpPlan(Input& in) {
    static uint8_t init[64];
    auto* plan = reinterpret_cast<QorWarpPlan*>(planMemory() + in.upTo(63));
    const QorImageSize src{2 + in.upTo(kMostWidth), 2 + in.upTo(kMostHeight)}, dst = in.size();
    const double* c = coefficients(in);
    const double value[4] = {in.take<double>(), in.take<double>(), 3, 4};
    const int32_t kind = in.upTo(2), direction = in.upTo(1), border = in.upTo(2) == 0 ? 6 : in.upTo(1),
                  type = in.take<uint8_t>() % 16 == 0 ? qor8u : in.dataType,
                  channels = in.take<uint8_t>() % 16 == 0 ? 4 : in.channels;
    std::memset(planMemory(), 0, 1024);
    if (kind == 2)
        qoriWarpAffineCubicInit(src, dst, type, c, direction, channels, in.take<float>(), in.take<float>(), border,
                                value, 0, plan, init);
    else
        (kind == 0 ? qoriWarpAffineNearestInit : qoriWarpAffineLinearInit)(src, dst, type, c, direction, channels,
                                                                           border, value, 0, plan);
    return plan;
}

template <class T>
T argument(Input& in) {
    const bool isStep = std::exchange(in.stepFollows, false);
    if constexpr (std::is_same_v<T, const QorResizePlan*>) {
        return resizePlan(in);
    } else if constexpr (std::is_same_v<T, const QorLinearFilterPlan*>) {
        return filterPlan(in);
    } else if constexpr (std::is_same_v<T, const QorHistogramSpec*>) {
        return histogramSpec(in);
    } else if constexpr (std::is_same_v<T, const QorAdaptiveGaussSpec*>) {
        return adaptiveSpec(in);
    } else if constexpr (std::is_same_v<T, const QorFft2DPlan*>) {
        return fourierPlan(in);
    } else if constexpr (std::is_same_v<T, QorFft2DPlan**>) {
        return in.take<uint8_t>() >= 250 ? nullptr : &allocatedPlan;
    } else if constexpr (std::is_same_v<T, QorFft2DPlan*>) {
        return in.releases ? fourierPlan(in) : reinterpret_cast<T>(in.memory());
    } else if constexpr (std::is_same_v<T, const QorDct2DPlan*>) {
        return cosinePlan(in);
    } else if constexpr (std::is_same_v<T, QorDct2DPlan**>) {
        return newCosinePlan(in);
    } else if constexpr (std::is_same_v<T, const QorHogConfig*>) {
        return hogConfig(in);
    } else if constexpr (std::is_same_v<T, const QorHogPlan*>) {
        return hogPlan(in);
    } else if constexpr (std::is_same_v<T, const QorPoint2D*>) {
        in.stepFollows = true;
        return locations(in);
    } else if constexpr (std::is_same_v<T, const QorWarpPlan*>) {
        return warpPlan(in);
    } else if constexpr (std::is_pointer_v<T> && std::is_pointer_v<std::remove_pointer_t<T>>) {
        // As many as the next integer may say, of four kinds.
        static uint8_t* planes[kMostStep];
        for (int i = 0; i < kMostStep; ++i) planes[i] = i < 4 ? in.memory() : planes[i - 4];
        in.stepFollows = true;
        return in.take<uint8_t>() >= 250 ? nullptr : reinterpret_cast<T>(planes);
    } else if constexpr (std::is_same_v<T, const int32_t*>) {
        in.stepFollows = true;
        return smallIntegers(in);
    } else if constexpr (std::is_pointer_v<T>) {
        in.stepFollows = true;
        return reinterpret_cast<T>(in.memory());
    } else if constexpr (std::is_same_v<T, QorImageSize>) {
        return in.size();
    } else if constexpr (std::is_same_v<T, QorPoint2D>) {
        // Anchors inside small kernels, offsets inside and outside small images; not every one is checked.
        return {in.upTo(5) - (in.upTo(9) == 0), in.upTo(5)};
    } else if constexpr (std::is_same_v<T, int32_t>) {
        return isStep           ? in.take<int16_t>() % kMostStep
               : in.countsBits  ? in.take<int16_t>()
               : in.countsReach ? in.upTo(40) - 1
               : in.isOrder     ? in.upTo(9) - 1
               : in.isAlgorithm ? in.upTo(2) | in.upTo(2) << 8 | in.upTo(2) << 16 | (in.upTo(15) == 0 ? 3 : 0)
               : in.take<uint8_t>() % 4 == 0 ? in.take<int32_t>()
               : in.take<uint8_t>() % 2 == 0 ? in.upTo(5)  // codes and widths of frames
                                             : in.take<int8_t>();
    } else {
        return in.take<T>();
    }
}

bool isStatus(QorResult result) {
    return result == QOR_OK || result == QOR_WARN_DIV_BY_ZERO || result == QOR_WARN_LOG_ZERO ||
           result == QOR_WARN_LOG_NEGATIVE || result == QOR_WARN_NOTHING_TO_DO || result == QOR_WARN_ADJUSTED ||
           result == QOR_WARN_EVEN_WEIGHT || result == QOR_WARN_WARP_EMPTY ||
           (result <= QOR_ERR_BAD_ARG && result >= QOR_ERR_DIRECTION) || result == QOR_ERR_UNSUPPORTED_MODE;
}

template <class... Arguments>
QorResult callWith(Input& in, QorResult(QORI_CALL* function)(Arguments...)) {
    // Braces fix the order in which the arguments take from the input.
    struct Call {
        QorResult(QORI_CALL* function)(Arguments...);
        QorResult result;
        Call(QorResult(QORI_CALL* f)(Arguments...), Arguments... arguments) : function(f), result(f(arguments...)) {}
    };
    return Call{function, argument<Arguments>(in)...}.result;
}

/// Whatever returns no status is not called.
template <class Function>
QorResult callMember(Input& in, Function function) {
    if constexpr (requires { callWith(in, function); })
        return callWith(in, function);
    else
        return QOR_OK;
}

struct Target {
    const char* name;
    QorResult (*run)(Input&);
    int channels;
    int32_t dataType;
};

template <class T>
constexpr int32_t codeOf = std::is_same_v<T, uint16_t>  ? qor16u
                           : std::is_same_v<T, int16_t> ? qor16s
                           : std::is_same_v<T, float>   ? qor32f
                           : std::is_same_v<T, double>  ? qor64f
                                                        : qor8u;

enum Channels { C1 = 1, C2, C3, C4, AC4 = 4, P2 = 2, P3, P4, C3C = 3, C4C };

constexpr Target kTargets[] = {
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    {#name, [](Input& in) { return callMember(in, &name); }, SL, codeOf<S>},
#include "members/all.inc"
#undef QORI_MEMBER
};

bool succeeded[std::size(kTargets)];

QorResult runTarget(const Target& target, Input& in) {
    in.channels = target.channels;
    in.dataType = target.dataType;
    in.countsBits = std::strstr(target.name, "_1u") != nullptr;
    in.countsReach = std::strstr(target.name, "SumWindow") != nullptr;
    in.isOrder = std::strstr(target.name, "FFTInit") != nullptr;
    in.releases = std::strstr(target.name, "FTFree_") != nullptr;
    in.isAlgorithm = std::strstr(target.name, "CrossCorrNorm") != nullptr;
    const QorResult result = target.run(in);
    if (in.releases && result == QOR_OK) allocatedPlan = nullptr;
    qorFree(std::exchange(allocatedPlan, nullptr));
    succeeded[&target - kTargets] |= result >= 0;
    if (!isStatus(result)) {
        std::fprintf(stderr, "%s returned a status that it does not have\n", target.name);
        std::abort();
    }
    return result;
}

}  // namespace
}  // namespace qori::test

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace qori::test;
    Input in(data, size);
    const Target& target = kTargets[in.take<uint16_t>() % std::size(kTargets)];
    runTarget(target, in);
    return 0;
}

#ifndef QORI_LIBFUZZER
namespace qori::test {
namespace {

struct Bytes {
    uint8_t data[192];
    explicit Bytes(uint64_t& state) {
        for (uint8_t& byte : data)
            byte = static_cast<uint8_t>((state = state * 6364136223846793005u + 1442695040888963407u) >> 56);
    }
};

uint64_t join(uint64_t digest, uint64_t word) {
    digest = (digest ^ word) * 0x9E3779B97F4A7C15u;
    return digest ^ digest >> 29;
}

/// Whether the last argument is a work buffer, which may be left with addresses in it.
bool takesBuffer(const char* name) {
    struct Parameters {
        const char *name, *list;
    };
    static constexpr Parameters kParameters[] = {
#define QORI_CONTRACT(name, parameters, checks) {#name, parameters},
#include "contracts/all.inc"
#undef QORI_CONTRACT
    };
    for (const auto& [member, list] : kParameters) {
        if (std::strcmp(member, name) != 0) continue;
        const char* buffer = std::strstr(list, " pBuffer");
        return buffer != nullptr && buffer[std::strlen(" pBuffer")] == '\0';
    }
    return false;
}

/// Of the status of a call and of what its arguments point at, which begins and ends as it was filled.
uint64_t digestOfCall(const Target& target, bool hasBuffer, uint64_t& state) {
    const Bytes bytes(state);
    Input in(bytes.data, sizeof bytes.data);
    in.apart = true;
    auto digest = static_cast<uint64_t>(runTarget(target, in));
    constexpr size_t begin = kArenaBytes / 2 - kSeenBefore;
    for (unsigned i = 0; i < kArenas; ++i) {
        if ((in.used >> i & 1) == 0) continue;
        for (size_t at = begin; at < begin + kSeen && !(hasBuffer && i == in.last); at += sizeof(uint64_t)) {
            uint64_t word;
            std::memcpy(&word, arenas[i].begin + at, sizeof word);
            digest = join(digest, word);
        }
        std::memcpy(arenas[i].begin + begin, pristine().begin + begin, kSeen);
    }
    return digest;
}

/// Says how many exports did something, and fails where these are not more than the given percentage.
int reportSuccess(long runs, size_t percentage) {
    size_t exports = 0;
    for (const bool once : succeeded) exports += once;
    std::printf("%ld random calls over %zu exports, %zu of which succeeded at least once\n", runs, std::size(kTargets),
                exports);
    return exports >= std::size(kTargets) * percentage / 100 ? 0 : 1;
}

/// A line for each export: its name and the digest of `calls` calls, the same for every build that computes the same.
int writeDigests(const char* path, int calls) {
    std::FILE* file = std::fopen(path, "wb");
    if (file == nullptr) return 1;
    for (const Target& target : kTargets) {
        uint64_t state = static_cast<uint64_t>(&target - kTargets), digest = 0;
        const bool hasBuffer = takesBuffer(target.name);
        for (int i = 0; i < calls; ++i) digest = join(digest, digestOfCall(target, hasBuffer, state));
        std::fprintf(file, "%s %08x%08x\n", target.name, static_cast<unsigned>(digest >> 32),
                     static_cast<unsigned>(digest));
    }
    return std::fclose(file) == 0 ? reportSuccess(calls * static_cast<long>(std::size(kTargets)), 80) : 1;
}

}  // namespace
}  // namespace qori::test

/// fuzz [RUNS [SEED]], or fuzz --digests FILE [CALLS]
int main(int argc, char** argv) {
    using namespace qori::test;
    if (argc > 2 && std::strcmp(argv[1], "--digests") == 0)
        return writeDigests(argv[2], argc > 3 ? std::atoi(argv[3]) : 40);
    const long runs = argc > 1 ? std::atol(argv[1]) : 200'000;
    uint64_t state = argc > 2 ? std::strtoull(argv[2], nullptr, 10) : 1;
    for (long i = 0; i < runs; ++i) {
        const Bytes bytes(state);
        LLVMFuzzerTestOneInput(bytes.data, sizeof bytes.data);
    }
    return reportSuccess(runs, runs < 1'000'000 ? 0 : 90);
}
#endif
