// SPDX-License-Identifier: Apache-2.0
#include "bench.h"

#include <benchmark/benchmark.h>
#include <immintrin.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <ctime>

namespace qori::bench {
namespace {

std::vector<Row>& allRows() {
    static std::vector<Row> rows;
    return rows;
}

std::vector<Ladder>& allLadders() {
    static std::vector<Ladder> ladders;
    return ladders;
}

/// Time that this thread has had on a processor: other work of a shared machine counts only by the caches it takes.
double now() {
    timespec time{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + 1e-9 * static_cast<double>(time.tv_nsec);
}

/// Contenders run in turn and find the caches as the others leave them: what only the last level could hold is not
/// there.
double secondsOf(const std::function<void()>& work, int repeats) {
    const double begin = now();
    for (int i = 0; i < repeats; ++i) {
        work();
        benchmark::ClobberMemory();
    }
    return (now() - begin) / repeats;
}

void readAll(const uint8_t* p, int64_t bytes) {
    __m256i a = _mm256_setzero_si256(), b = a, c = a, d = a;
    int64_t i = 0;
    for (; i + 128 <= bytes; i += 128) {
        const auto* v = reinterpret_cast<const __m256i*>(p + i);
        a = _mm256_or_si256(a, _mm256_loadu_si256(v));
        b = _mm256_or_si256(b, _mm256_loadu_si256(v + 1));
        c = _mm256_or_si256(c, _mm256_loadu_si256(v + 2));
        d = _mm256_or_si256(d, _mm256_loadu_si256(v + 3));
    }
    benchmark::DoNotOptimize(_mm256_or_si256(_mm256_or_si256(a, b), _mm256_or_si256(c, d)));
}

/// The roofline over its own buffers.
std::function<void()> rooflineOf(Roofline kind, int64_t bytes) {
    const auto allocate = [](int64_t n) {
        auto* p = static_cast<uint8_t*>(std::aligned_alloc(64, static_cast<size_t>((n + 63) / 64 * 64)));
        std::memset(p, 1, static_cast<size_t>(n));
        return std::shared_ptr<uint8_t>(p, std::free);
    };
    if (kind == Roofline::read) {
        auto source = allocate(bytes);
        return [=] { readAll(source.get(), bytes); };
    }
    if (kind == Roofline::set) {
        auto target = allocate(bytes);
        return [=] { std::memset(target.get(), 3, static_cast<size_t>(bytes)); };
    }
    auto source = allocate(bytes / 2), target = allocate(bytes / 2);
    return [=] { std::memcpy(target.get(), source.get(), static_cast<size_t>(bytes / 2)); };
}

struct Timed {
    std::function<void()> work;
    int repeats = 1;
    std::vector<double> seconds = {};

    double median() {
        std::sort(seconds.begin(), seconds.end());
        return seconds[seconds.size() / 2];
    }
    /// Between the quartiles, as a share of the median.
    double spread() {
        const double middle = median();
        return (seconds[seconds.size() * 3 / 4] - seconds[seconds.size() / 4]) / middle;
    }
};

/// Enough calls for a fifth of a millisecond, so that the clock does not matter.
Timed prepare(std::function<void()> work) {
    Timed timed{std::move(work)};
    secondsOf(timed.work, 1);
    const double once = secondsOf(timed.work, 3);
    timed.repeats = static_cast<int>(std::clamp(2e-4 / std::max(once, 1e-9), 1.0, 1e6));
    return timed;
}

/// Whether ours writes what the plain loop writes.
bool agrees(const Contenders& contenders) {
    if (!contenders.plain || !contenders.output.elements) return true;
    contenders.output.spoil();
    contenders.plain();
    const std::vector<double> wanted = contenders.output.elements();
    contenders.output.spoil();
    contenders.ours();
    const std::vector<double> got = contenders.output.elements();
    const double within = contenders.output.within;
    return std::equal(got.begin(), got.end(), wanted.begin(), wanted.end(), [=](double a, double b) {
        return a == b || std::abs(a - b) <= within * std::max(1.0, std::abs(b));
    });
}

void run(benchmark::State& state, const Row& row, Size size) {
    const Contenders contenders = row.make(size);
    if (!agrees(contenders)) {
        std::fprintf(stderr, "%s: not what the plain loop gives\n", row.operation.c_str());
        std::exit(1);
    }
    const auto bytes = static_cast<int64_t>(row.bytesPerPixel * static_cast<double>(size.pixels()));
    Timed ours = prepare(contenders.ours), roof = prepare(rooflineOf(row.roofline, bytes));
    const int64_t copied = row.best > 0 ? kFrame.pixels() : size.pixels();
    Timed copy = prepare(rooflineOf(Roofline::copy, 2 * copied));
    std::vector<Timed*> all = {&ours, &roof, &copy};
    Timed plain, peer;
    if (contenders.plain) {
        plain = prepare(contenders.plain);
        all.push_back(&plain);
    }
    if (contenders.peer) {
        peer = prepare(contenders.peer);
        all.push_back(&peer);
    }
    for (auto _ : state) {
        for (Timed* timed : all) timed->seconds.push_back(secondsOf(timed->work, timed->repeats));
        state.SetIterationTime(ours.seconds.back());
    }
    const double seconds = ours.median(), pixels = static_cast<double>(size.pixels());
    auto& out = state.counters;
    out["Mpix/s"] = pixels / seconds * 1e-6;
    out["GB/s"] = row.bytesPerPixel * pixels / seconds * 1e-9;
    out["ns"] = seconds * 1e9;
    out["roof"] = roof.median() / seconds;
    out["spread"] = ours.spread();
    if (contenders.plain) out["vs_plain"] = plain.median() / seconds;
    if (contenders.peer) out["vs_peer"] = peer.median() / seconds;
    constexpr double kCopyAtL2 = 51'853, kCopyAtFrame = 15'345;
    const bool isFrame = size.width == kFrame.width, isL2 = size.width == kL2.width;
    const double best = row.best > 0 ? row.best / kCopyAtFrame
                        : isFrame    ? row.bestAtFrame / kCopyAtFrame
                        : isL2       ? row.bestAtL2 / kCopyAtL2
                                     : 0;
    if (best > 0) out["vs_best"] = pixels / seconds / (static_cast<double>(copied) / copy.median()) / best;
}

/// By how much two neighbours of a ladder are out of proportion; 1 where they are not.
double stepBetween(const Step& a, double secondsA, const Step& b, double secondsB) {
    const bool aIsSmaller = a.units <= b.units;
    const double growth = aIsSmaller ? b.units / a.units : a.units / b.units;
    const double ratio = aIsSmaller ? secondsB / secondsA : secondsA / secondsB;
    return std::max({1.0, ratio / growth, 1 / ratio});
}

void climb(benchmark::State& state, const Ladder& ladder) {
    const std::vector<Step> steps = ladder.make();
    std::vector<Timed> all;
    for (const Step& step : steps) all.push_back(prepare(step.work));
    for (auto _ : state) {
        for (Timed& timed : all) timed.seconds.push_back(secondsOf(timed.work, timed.repeats));
        state.SetIterationTime(all.front().seconds.back());
    }
    double largest = 1;
    std::string where = "none";
    for (size_t i = 1; i < steps.size(); ++i) {
        const double size = stepBetween(steps[i - 1], all[i - 1].median(), steps[i], all[i].median());
        if (size <= largest) continue;
        largest = size;
        where = steps[i - 1].name + " to " + steps[i].name;
    }
    state.counters["step"] = largest;
    state.SetLabel(where + (largest > 2 && !ladder.reason.empty() ? "; " + ladder.reason : ""));
    if (std::getenv("QORI_BENCH_STEPS") == nullptr) return;
    for (size_t i = 0; i < steps.size(); ++i)
        std::fprintf(stderr, "%-40s %-24s %12.0f ns %10.4f ns a unit\n", ladder.operation.c_str(),
                     steps[i].name.c_str(), all[i].median() * 1e9, all[i].median() * 1e9 / steps[i].units);
}

void registerAll() {
    for (const Ladder& ladder : allLadders())
        benchmark::RegisterBenchmark(("ladder " + ladder.operation + "/steps").c_str(),
                                     [&ladder](benchmark::State& state) { climb(state, ladder); })
            ->UseManualTime()
            ->Iterations(15)
            ->Unit(benchmark::kMicrosecond);
    for (const Row& row : allRows())
        for (Size size : row.sizes)
            benchmark::RegisterBenchmark(
                (row.operation + "/" + std::to_string(size.width) + "x" + std::to_string(size.height)).c_str(),
                [&row, size](benchmark::State& state) { run(state, row, size); })
                ->UseManualTime()
                ->Iterations(size.pixels() > 20'000'000 ? 7 : 41)
                ->Unit(benchmark::kMicrosecond);
}

}  // namespace

Rows::Rows(std::vector<Row> rows) {
    for (Row& row : rows) allRows().push_back(std::move(row));
}

Ladders::Ladders(std::vector<Ladder> ladders) {
    for (Ladder& ladder : ladders) allLadders().push_back(std::move(ladder));
}

}  // namespace qori::bench

int main(int argc, char** argv) {
    qori::bench::registerAll();
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
