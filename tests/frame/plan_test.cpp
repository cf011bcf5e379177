// SPDX-License-Identifier: Apache-2.0
// Blocks that outlive a call: all of them or none, whichever allocation fails.
#include "frame/plan.h"

#include "harness/sweep.h"

namespace qori::test {
namespace {

TEST(OwnedBlocks, AreAllThereOrNone) {
    constexpr int kBlocks = 3;
    for (int failing = 0; failing <= kBlocks; ++failing) {
        qorTestFailAllocation(failing);
        void* kept[kBlocks] = {};
        {
            OwnedBlocks<kBlocks> blocks;
            for (void*& block : kept) block = blocks.add(100);
            EXPECT_EQ(failing == 0 ? QOR_OK : QOR_ERR_NO_MEMORY, blocks.check());
            EXPECT_EQ(failing == 0 ? kBlocks : failing - 1, qorTestLiveBlocks());
            if (failing == 0) blocks.release();
        }
        EXPECT_EQ(failing == 0 ? kBlocks : 0, qorTestLiveBlocks());
        if (failing == 0)
            for (void* block : kept) qorFree(block);
    }
    qorTestFailAllocation(0);
    OwnedBlocks<1> blocks;
    EXPECT_EQ(nullptr, blocks.add(int64_t{1} << 31));
    EXPECT_EQ(QOR_ERR_NO_MEMORY, blocks.check());
}

TEST(WorkMemory, IsTheCallersOrAllocatedForTheCall) {
    alignas(64) uint8_t callers[128];
    EXPECT_EQ(callers + 64, WorkMemory(callers + 1).begin<uint8_t>());
    EXPECT_EQ(callers + 16, WorkMemory(callers + 1).begin<uint8_t>(16));
    {
        const WorkMemory own(int64_t{100});
        EXPECT_EQ(QOR_OK, own.check());
        EXPECT_EQ(1, qorTestLiveBlocks());
    }
    EXPECT_EQ(0, qorTestLiveBlocks());
    EXPECT_EQ(QOR_ERR_NO_MEMORY, WorkMemory(int64_t{INT32_MAX} + 1).check());
}

}  // namespace
}  // namespace qori::test
