// SPDX-License-Identifier: Apache-2.0
#include "qori.h"

namespace qori::frame {
namespace {

constexpr QorLibraryVersion kVersion = {
    8, 2, 1, 44077, {'k', '5', 0, 0}, "qorIP AVX2 (k5)", "8.2.1 (r44077)", "Oct  9 2014",
};

const QorLibraryVersion* libraryVersion() { return &kVersion; }

}  // namespace
}  // namespace qori::frame

#include "entries/version.inc"
