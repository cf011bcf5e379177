// SPDX-License-Identifier: Apache-2.0
// Runs one export over many shapes against its scalar reference.
#pragma once
#include "call.h"
#include "companion/qorcore_instrumented.h"
#include "function_ref.h"
#include "image.h"

namespace qori::test {

/// What a sweep does with each shape; stops a member's sweep at its first failure, which is the one worth reading.
void forShapes(const std::vector<Shape>& shapes, FunctionRef<void(const Shape&)> check);

/// Regions above a streaming bound, with a cache that makes the call stream, one that does not, and none that answers.
void forStreamingChoices(int bytesPerPixel, int trafficBytes, FunctionRef<void(const Shape&)> check);

void expectUnchanged(const TestImage& image, const Snapshot& expected, const char* file, int line);
void expectStatus(QorResult expected, QorResult status, const char* text, const char* file, int line);

/// Every byte of an image and around it is the snapshot's.
#define QORI_EXPECT_UNCHANGED(image, snapshot) expectUnchanged(image, snapshot, __FILE__, __LINE__)

/// A status expected of a call that must leave `output` alone.
#define QORI_EXPECT_STATUS(expected, output, callExpression)                         \
    do {                                                                             \
        const auto before_ = (output).snapshot();                                    \
        expectStatus(expected, callExpression, #callExpression, __FILE__, __LINE__); \
        QORI_EXPECT_UNCHANGED(output, before_);                                      \
    } while (false)

}  // namespace qori::test
