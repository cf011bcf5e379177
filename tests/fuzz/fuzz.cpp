// SPDX-License-Identifier: Apache-2.0
// Calls any export of the stateless families with arguments made from the input, hostile within their contract: null
// pointers, sizes below 1, negative and odd steps, misaligned and overlapping images, any scalar. Nothing may crash,
// overflow or return a status that does not exist.
//
// Built with -DQORI_FUZZ=ON (clang) it is a libFuzzer target; else it runs a fixed number of random inputs.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <type_traits>
#include <utility>

#include "harness/guarded_memory.h"
#include "qori.h"

namespace qori::test {
namespace {

constexpr int kArenas = 8;
constexpr size_t kArenaBytes = 1 << 16;
constexpr int kMostWidth = 70, kMostHeight = 6, kMostStep = 2000;  // stays within half an arena

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
        static GuardedPages arenas[kArenas];
        const auto choice = take<uint8_t>();
        if (choice >= 250) return nullptr;
        GuardedPages& arena = arenas[choice < 8 ? choice : static_cast<unsigned>(next_++) % kArenas];
        if (arena.begin == nullptr) {
            arena = mapGuarded(kArenaBytes);
            for (size_t i = 0; i < arena.size; ++i) arena.begin[i] = static_cast<uint8_t>(i * 167 >> 3);
        }
        return arena.begin + kArenaBytes / 2 + choice % 67;
    }

    /// Left by a pointer, so that the integer behind it is taken as a step.
    bool stepFollows = false;

private:
    const uint8_t* data_;
    size_t size_;
    int next_ = 0;
};

template <class T>
T argument(Input& in) {
    const bool isStep = std::exchange(in.stepFollows, false);
    if constexpr (std::is_pointer_v<T> && std::is_pointer_v<std::remove_pointer_t<T>>) {
        // As many as the next integer may say, of four kinds.
        static uint8_t* planes[kMostStep];
        for (int i = 0; i < kMostStep; ++i) planes[i] = i < 4 ? in.memory() : planes[i - 4];
        in.stepFollows = true;
        return in.take<uint8_t>() >= 250 ? nullptr : reinterpret_cast<T>(planes);
    } else if constexpr (std::is_pointer_v<T>) {
        in.stepFollows = true;
        return reinterpret_cast<T>(in.memory());
    } else if constexpr (std::is_same_v<T, QorImageSize>) {
        const auto part = [&](int most) {
            const auto v = in.take<uint8_t>();
            return v >= 250 ? 250 - v : 1 + v % most;
        };
        const int width = part(kMostWidth);
        return {width, part(kMostHeight)};
    } else if constexpr (std::is_same_v<T, int32_t>) {
        return isStep                        ? in.take<int16_t>() % kMostStep
               : in.take<uint8_t>() % 4 == 0 ? in.take<int32_t>()
                                             : in.take<int8_t>();
    } else {
        return in.take<T>();
    }
}

bool isStatus(QorResult result) {
    return result == QOR_OK || result == QOR_WARN_DIV_BY_ZERO || result == QOR_WARN_LOG_ZERO ||
           result == QOR_WARN_LOG_NEGATIVE || (result <= QOR_ERR_BAD_ARG && result >= QOR_ERR_DIRECTION);
}

template <class... Arguments>
bool callWith(Input& in, QorResult(QORI_CALL* function)(Arguments...)) {
    // Braces fix the order in which the arguments take from the input.
    struct Call {
        QorResult(QORI_CALL* function)(Arguments...);
        QorResult result;
        Call(QorResult(QORI_CALL* f)(Arguments...), Arguments... arguments) : function(f), result(f(arguments...)) {}
    };
    return isStatus(Call{function, argument<Arguments>(in)...}.result);
}

struct Target {
    const char* name;
    bool (*run)(Input&);
};

constexpr Target kTargets[] = {
#define QORI_MEMBER(name, ...) {#name, [](Input& in) { return callWith(in, &name); }},
#include "fuzz/families.inc"
#undef QORI_MEMBER
};

}  // namespace
}  // namespace qori::test

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace qori::test;
    Input in(data, size);
    const Target& target = kTargets[in.take<uint16_t>() % std::size(kTargets)];
    if (!target.run(in)) {
        std::fprintf(stderr, "%s returned a status that it does not have\n", target.name);
        std::abort();
    }
    return 0;
}

#ifndef QORI_LIBFUZZER
int main(int argc, char** argv) {
    const long runs = argc > 1 ? std::atol(argv[1]) : 200'000;
    uint64_t state = argc > 2 ? std::strtoull(argv[2], nullptr, 10) : 1;
    for (long i = 0; i < runs; ++i) {
        uint8_t data[96];
        for (uint8_t& byte : data)
            byte = static_cast<uint8_t>((state = state * 6364136223846793005u + 1442695040888963407u) >> 56);
        LLVMFuzzerTestOneInput(data, sizeof data);
    }
    std::printf("%ld random calls over %zu exports\n", runs, std::size(qori::test::kTargets));
    return runs > 0 ? 0 : 1;
}
#endif
