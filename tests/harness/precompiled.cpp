// SPDX-License-Identifier: Apache-2.0
// Owns the precompiled header of the tests.
int main() { return 0; }
