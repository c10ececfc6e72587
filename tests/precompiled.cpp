// SPDX-License-Identifier: Apache-2.0
// CMake keeps a precompiled header with a target, and a target needs a source.
