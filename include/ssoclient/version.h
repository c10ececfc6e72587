// SPDX-License-Identifier: Apache-2.0
/// @file
/// The version of these headers, and of the library that the program runs with.

#pragma once

#include <ssoclient/export.h>

// CMake reads the next three lines: the project's version is written nowhere else.
#define SSOCLIENT_VERSION_MAJOR 0 ///< Before 1.0, a new minor version may change the interface.
#define SSOCLIENT_VERSION_MINOR 1 ///< Raised when something is added.
#define SSOCLIENT_VERSION_PATCH 0 ///< Raised when something is repaired, and nothing else changes.

/// The number of a version, to compare versions by: `#if SSOCLIENT_VERSION_NUMBER >= SSOCLIENT_MAKE_VERSION(0, 2, 0)`.
/// `minor` and `patch` are below 1000.
#define SSOCLIENT_MAKE_VERSION(major, minor, patch) ((major)*1000000 + (minor)*1000 + (patch))

/// The version of these headers as a number: 1000 for 0.1.0.
#define SSOCLIENT_VERSION_NUMBER                                                                                       \
  SSOCLIENT_MAKE_VERSION(SSOCLIENT_VERSION_MAJOR, SSOCLIENT_VERSION_MINOR, SSOCLIENT_VERSION_PATCH)

/// @cond INTERNAL
// Two steps, because an argument of `#` is not replaced by its value.
#define SSOCLIENT_QUOTE_VERSION(major, minor, patch) #major "." #minor "." #patch
#define SSOCLIENT_EXPAND_AND_QUOTE_VERSION(major, minor, patch) SSOCLIENT_QUOTE_VERSION(major, minor, patch)
/// @endcond

/// The version of these headers as a text: "0.1.0".
#define SSOCLIENT_VERSION_STRING                                                                                       \
  SSOCLIENT_EXPAND_AND_QUOTE_VERSION(SSOCLIENT_VERSION_MAJOR, SSOCLIENT_VERSION_MINOR, SSOCLIENT_VERSION_PATCH)

namespace SsoClient {

/// The version of the library that the program runs with, such as "0.1.0". The text is valid until the process ends. It
/// differs from `SSOCLIENT_VERSION_STRING` when the program was compiled with the headers of another version. Any
/// thread may call this, even before `main`.
SSOCLIENT_API const char *GetLibraryVersion() noexcept;

/// The same as a number, to compare with `SSOCLIENT_VERSION_NUMBER`. While the major version is 0, a program needs a library of the
/// minor version that it was compiled with.
SSOCLIENT_API int GetLibraryVersionNumber() noexcept;

} // namespace SsoClient
