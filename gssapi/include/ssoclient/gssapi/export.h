// SPDX-License-Identifier: Apache-2.0
/// @file
/// Marks what `libssoclient-gssapi` exports; everything else stays hidden in the shared library.

#pragma once

#define SSOCLIENT_GSSAPI_API __attribute__((visibility("default")))
