// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <set>
#include <string>

#include "call.h"
#include "companion/qorcore_instrumented.h"
#include "random.h"

namespace qori::test {
namespace {

uint64_t seed = 20141009;
Random generator{0};
std::set<std::string> swept;

/// Seeds each test by its name, and expects every test to give back what it allocated.
class Listener : public testing::EmptyTestEventListener {
    void OnTestStart(const testing::TestInfo& info) override {
        generator = Random{seed ^ std::hash<std::string>{}(info.name())};
        qorTestSetCacheSize(0);
        qorTestFailAllocation(0);
    }
    void OnTestEnd(const testing::TestInfo&) override {
        EXPECT_EQ(0, qorTestLiveBlocks()) << "memory leaked";
        EXPECT_EQ(0, qorTestDamagedBlocks()) << "a block was written beyond its end, or freed twice";
    }
};

/// A stray access or a floating-point exception ends the run; say which test it was.
[[maybe_unused]] void reportFault(int signal) {
    const testing::TestInfo* info = testing::UnitTest::GetInstance()->current_test_info();
    std::printf("%s in %s\n", signal == SIGFPE ? "trapped exception" : "access outside the allowed memory",
                info != nullptr ? info->name() : "no test");
    std::fflush(stdout);
    std::_Exit(3);
}

}  // namespace

Random& random() { return generator; }
void markSwept(const char* exportName) { swept.insert(exportName); }

}  // namespace qori::test

int main(int argc, char** argv) {
    using namespace qori::test;
    testing::InitGoogleTest(&argc, argv);
    if (const char* text = std::getenv("QORI_SEED")) seed = std::strtoull(text, nullptr, 10);
    std::printf("seed %llu (set QORI_SEED to choose)\n", static_cast<unsigned long long>(seed));
    testing::UnitTest::GetInstance()->listeners().Append(new Listener);
#ifndef __SANITIZE_ADDRESS__
    std::signal(SIGSEGV, reportFault);
#endif
    std::signal(SIGFPE, reportFault);
    const int result = RUN_ALL_TESTS();
    if (testing::UnitTest::GetInstance()->test_to_run_count() == 0) {
        std::printf("no test was run\n");
        return 1;
    }
    // One file per binary, joined by the check that every export has been swept.
    if (const char* file = std::getenv("QORI_SWEPT")) {
        std::ofstream out(file);
        for (const std::string& name : swept) out << name << '\n';
    }
    return result;
}
