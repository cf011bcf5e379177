// SPDX-License-Identifier: Apache-2.0
// How means of rectangular windows are made: which sums hold them, which kernels make them, and how much memory that
// takes. Only the files that instantiate it include this.
#pragma once
#include "box_chain.h"
#include "box_job.h"
#include "box_sums.h"
#include "kernels/box/across.h"
#include "kernels/box/halves.h"
#include "strips.h"

namespace qori::filter {

/// Column sums of type S, then windows along them. Memory begins with what the RowWindow takes.
template <class S, class T, Layout layout, class Rule>
class BoxRun {
public:
    static constexpr int n = channels(layout);
    static constexpr bool keepAlpha = layout == Layout::AC4;
    static constexpr bool isFloat = std::is_floating_point_v<T>;
    /// Windows up to this width are added up element by element, wider ones run.
    static constexpr int32_t kAdded = sizeof(S) == 2 ? 7 : 3;
    static constexpr bool hasChain = std::is_floating_point_v<S>;

    /// With `unit` for what every piece of memory is a multiple of; `chained` in passes that need memory of their own.
    BoxRun(const BoxJob<T, layout>& job, Rule rule, int64_t unit, bool chained, uint8_t* memory)
        : job_(job),
          rule_(rule),
          layout_(behindWindow(job, unit)),
          window_(job.src, needs(job), memory),
          sums_(window_, job.reach, layout_),
          chain_(chained ? job.mask.width : 1),
          isChained_(chained) {
        for (int k = 0; chained && k + 1 < chain_.levels(); ++k) {
            const int64_t columns = widest() + (job.mask.width - chain_.level(k).window);
            chainRow_[k] = layout_.add(columns * n * static_cast<int64_t>(sizeof(S)));
        }
        memory_ = memory;
        sums_.bind(memory);
    }
    int64_t bytes() const { return layout_.bytes(); }

    void run() {
        window_.forEach([this](const WindowPart& part, int32_t y, int32_t) {
            const S* const sums = sums_.makeRow(part, y);
            T* const to = job_.dst.row(y) + ptrdiff_t{part.x} * n;
            const ptrdiff_t elements = ptrdiff_t{part.width} * n;
            if constexpr (hasChain)
                across(sums, to, elements);
            else
                acrossIntegers(sums, to, elements);
        });
    }

private:
    static WindowNeeds needs(const BoxJob<T, layout>& job) {
        return {.reach = job.reach,
                .rowsLeft = ColumnSums<S, T, n>::rowsLeft(job.reach),
                .place = job.inPlace() ? Place::inOrder : Place::apart};
    }
    static BlockLayout behindWindow(const BoxJob<T, layout>& job, int64_t unit) {
        BlockLayout pieces(unit);
        pieces.add(RowWindow::bytes(job.src, needs(job)));
        return pieces;
    }
    int64_t widest() const {
        int64_t most = 0;
        for (int32_t i = 0; i < window_.parts(); ++i) most = std::max<int64_t>(most, window_.part(i).width);
        return most;
    }

    template <int terms>
    void added(const S* sums, T* to, ptrdiff_t elements) const {
        kernels::acrossTerms<terms, keepAlpha>(sums, n, job_.mask.width, to, elements, rule_);
    }
    void acrossIntegers(const S* sums, T* to, ptrdiff_t elements) const {
        const int32_t width = job_.mask.width;
        // Windows of 16-bit columns are added up in 16 bits.
        const bool fits = sizeof(S) != 2 || job_.area() * 255 <= UINT16_MAX;
        if (width <= kAdded && fits) {
            if (width == 1) return added<1>(sums, to, elements);
            if (width == 2) return added<2>(sums, to, elements);
            if (width == 3) return added<3>(sums, to, elements);
            if constexpr (kAdded > 3) {
                if (width == 4) return added<4>(sums, to, elements);
                if (width == 5) return added<5>(sums, to, elements);
                if (width == 6) return added<6>(sums, to, elements);
                return added<7>(sums, to, elements);
            }
        }
        runsAlong(sums, to, elements);
    }
    void runsAlong(const S* sums, T* to, ptrdiff_t elements) const {
        if constexpr (sizeof(S) == 2 && n == 3)
            if (job_.mask.height <= kernels::kRowsInHalves && elements >= kernels::kLeastForHalves &&
                int64_t{job_.src.size.height} * elements <= kernels::kMostBytesInHalves)
                return kernels::acrossHalves(sums, job_.mask.width, job_.area(), to, elements);
        if constexpr (sizeof(S) == 2 && n == 1)
            kernels::acrossPairs(sums, job_.mask.width, to, elements, job_.area());
        else
            kernels::acrossRunning<n, keepAlpha>(sums, job_.mask.width, to, elements, rule_);
    }

    /// Where a term of the chain begins.
    const S* termOf(const S* sums, const ChainTerm& term) const {
        const S* const from =
            term.level < 0 ? sums : reinterpret_cast<const S*>(memory_ + static_cast<ptrdiff_t>(chainRow_[term.level]));
        return from + ptrdiff_t{term.offset} * n;
    }
    void across(const S* sums, T* to, ptrdiff_t elements) const {
        if (!isChained_) return added<0>(sums, to, elements);
        const S* term[kernels::kMostTerms];
        for (int k = 0; k < chain_.levels(); ++k) {
            const ChainLevel& level = chain_.level(k);
            for (int i = 0; i < level.terms; ++i) term[i] = termOf(sums, level.term[i]);
            if (k + 1 == chain_.levels()) break;
            const ptrdiff_t more = ptrdiff_t{job_.mask.width - level.window} * n;
            auto* const made = reinterpret_cast<S*>(memory_ + static_cast<ptrdiff_t>(chainRow_[k]));
            kernels::sumTerms(term, level.terms, made, elements + more);
        }
        lastOfChain(term, to, elements);
    }
    void lastOfChain(const S* const* term, T* to, ptrdiff_t elements) const {
        const auto make = [&](auto terms) {
            kernels::acrossChain<decltype(terms)::value, keepAlpha>(term, chain_.last().terms, to, elements, rule_);
        };
        // Integers in doubles, of areas of 65,538 and more, are not worth eight loops of each kind.
        if constexpr (!isFloat) return make(std::integral_constant<int, 0>{});
        switch (chain_.last().terms) {
            case 1: return make(std::integral_constant<int, 1>{});
            case 2: return make(std::integral_constant<int, 2>{});
            case 3: return make(std::integral_constant<int, 3>{});
            case 4: return make(std::integral_constant<int, 4>{});
            case 5: return make(std::integral_constant<int, 5>{});
            case 6: return make(std::integral_constant<int, 6>{});
            case 7: return make(std::integral_constant<int, 7>{});
            default: return make(std::integral_constant<int, 8>{});
        }
    }

    BoxJob<T, layout> job_;
    Rule rule_;
    BlockLayout layout_;
    RowWindow window_;
    ColumnSums<S, T, n> sums_;
    Chain chain_;
    bool isChained_;
    uint8_t* memory_;
    int64_t chainRow_[32];
};

/// Runs in the roomiest of its forms that the memory holds: pieces aligned or not, with the chain's rows or without.
template <class S, class T, Layout layout, class Rule>
void runStrip(const BoxJob<T, layout>& job, Rule rule, BoxBuffer buffer) {
    using Run = BoxRun<S, T, layout, Rule>;
    const auto bytesOf = [&](int64_t unit, bool chained) { return Run(job, rule, unit, chained, nullptr).bytes(); };
    uint8_t* const start = blockStart(buffer.memory);
    if (bytesOf(kBlockAlignment, Run::hasChain) <= buffer.bytes - (start - buffer.memory))
        Run(job, rule, kBlockAlignment, Run::hasChain, start).run();
    else
        Run(job, rule, 1, Run::hasChain && bytesOf(1, true) <= buffer.bytes, buffer.memory).run();
}

template <class S, class T, Layout layout, class Rule>
QorResult runBox(const BoxJob<T, layout>& job, Rule rule, const BoxBuffer* buffer) {
    using Run = BoxRun<S, T, layout, Rule>;
    const auto runAll = [&](BoxBuffer memory) {
        if (job.inPlace()) return runStrip<S>(job, rule, memory);
        forStrips(job.src, job.dst, [&](const BorderedImage& src, Image<T> dst) {
            runStrip<S>(BoxJob<T, layout>{src, dst, job.mask, job.reach}, rule, memory);
        });
    };
    if (buffer != nullptr) {
        runAll(*buffer);
        return QOR_OK;
    }
    // As for the whole width, which no strip exceeds.
    const int64_t bytes = Run(job, rule, kBlockAlignment, Run::hasChain, nullptr).bytes() + kBlockAlignment;
    const WorkMemory memory(bytes);
    if (QorResult r = memory.check()) return r;
    runAll({memory.template begin<uint8_t>(), bytes - kBlockAlignment});
    return QOR_OK;
}

/// 16 bits for the columns of bytes where differences have a sign, 32 where they hold a window, integers in doubles
/// beyond that.
template <class T, Layout layout>
QorResult box(const BoxJob<T, layout>& job, const BoxBuffer* buffer) {
    using namespace kernels;
    const int64_t area = job.area();
    if constexpr (std::is_floating_point_v<T>) {
        return runBox<T>(job, Quotient<T>(area), buffer);
    } else if constexpr (sizeof(T) == 1) {
        constexpr int32_t kSigned = INT16_MAX / 255;  // 128 rows
        if (area > INT32_MAX / 255) return runBox<double>(job, FloatMean(area), buffer);
        if (job.mask.height > kSigned) return runBox<uint32_t>(job, FloatMean(area), buffer);
        return runBox<uint16_t>(job, FloatMean(area), buffer);
    } else {
        if (area <= UINT32_MAX / UINT16_MAX) return runBox<uint32_t>(job, WordMean<T>(area), buffer);
        return runBox<double>(job, WordMean<T>(area), buffer);
    }
}

}  // namespace qori::filter
