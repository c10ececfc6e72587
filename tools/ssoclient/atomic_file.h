// SPDX-License-Identifier: Apache-2.0
/// @file
/// Writing a file whole or not at all.

#pragma once

#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// Refuses, before any work is done for it, a file that `WriteFileWhole` would refuse.
/// @throws Tarvel::IOException when there is such a file and `replace` is not set, when what is there is no regular file,
///         and when its folder cannot be written to.
void RequireWritableFile(const std::string &path, bool replace);

/// Makes `path` a file of mode 0600 that holds `content`. At every moment there is either what was there before, or the
/// whole content; also when the process is told to end meanwhile. A file that is there already is an error unless
/// `replace` is set. Main thread only.
/// @throws Tarvel::IOException naming the path.
void WriteFileWhole(const std::string &path, std::string_view content, bool replace);

} // namespace SsoClient::Tool
