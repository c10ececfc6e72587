// SPDX-License-Identifier: Apache-2.0
/// @file
/// Writing a file whole or not at all.

#pragma once

#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// Checks, before any work is done for the file, that `WriteFileWhole` would not refuse it.
/// @throws Tarvel::IOException when the file exists and `replace` is not set, when it exists and is not a regular file,
///         and when its folder cannot be written to.
void RequireWritableFile(const std::string &path, bool replace);

/// Makes `path` a file of mode 0600 that contains `content`. At every moment, `path` is as it was before, or it has the
/// whole content, even when a signal ends the process. A file that already exists is an error unless
/// `replace` is set.
/// @throws Tarvel::IOException naming the path.
void WriteFileWhole(const std::string &path, std::string_view content, bool replace);

} // namespace SsoClient::Tool
