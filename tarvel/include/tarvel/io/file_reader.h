// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers over a file and over an open file descriptor.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/io/reader.h>

#include <string>

namespace Tarvel {

/// A reader over the file at `path`, opened now and closed with the reader. Reading blocks as the file does.
/// @throws IOException when the file cannot be opened; the message names it and the system's reason.
TARVEL_API Ref<Reader> OpenFile(const std::string &path);

/// A reader over `descriptor`, from where it stands. The descriptor stays the caller's, is never closed here and must
/// stay open as long as the reader is read.
TARVEL_API Ref<Reader> CreateDescriptorReader(int descriptor);

} // namespace Tarvel
