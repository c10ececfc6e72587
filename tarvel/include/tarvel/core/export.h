// SPDX-License-Identifier: Apache-2.0
/// @file
/// Marks what `libtarvel` exports; everything else stays hidden in the shared library.

#pragma once

#define TARVEL_API __attribute__((visibility("default")))
