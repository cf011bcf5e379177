// SPDX-License-Identifier: Apache-2.0
// Calls exports the way an awkward caller would: from a stack aligned no better than the system asks (4 bytes, 16 on
// 64-bit Windows) and under every rounding mode, with subnormals flushed and exceptions trapping in turn, and checks
// that the control register and, on 64-bit Windows, the vector registers of the caller come back as they were.
#pragma once
#include <gtest/gtest.h>

/// GoogleTest's, without a class for each: a program has some hundreds of tests, and a class takes a compiler 12 ms.
#undef TEST
#define TEST(suite, name)                                                                   \
    static void suite##_##name##_body();                                                    \
    [[maybe_unused]] static const testing::TestInfo* const suite##_##name##_info =          \
        qori::test::registerTest(#suite, #name, __FILE__, __LINE__, suite##_##name##_body); \
    static void suite##_##name##_body()

namespace qori::test {

const testing::TestInfo* registerTest(const char* suite, const char* name, const char* file, int line, void (*body)());

/// What bodies of tests name without a class.
inline bool HasFailure() { return testing::Test::HasFailure(); }
inline bool HasFatalFailure() { return testing::Test::HasFatalFailure(); }

/// Notes that an export has been compared with its reference; what was never noted fails the run's last check.
void markSwept(const char* exportName);

/// Calls body(context) under the next of the awkward circumstances.
void callAwkwardly(void (*body)(void*), void* context);

template <class Function, class... Arguments>
auto call(Function function, Arguments... arguments) {
    decltype(function(arguments...)) result{};
    auto body = [&] { result = function(arguments...); };
    callAwkwardly([](void* context) { (*static_cast<decltype(body)*>(context))(); }, &body);
    return result;
}

}  // namespace qori::test
