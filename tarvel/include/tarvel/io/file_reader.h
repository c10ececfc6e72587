// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers over a file and over an open file descriptor.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/io/reader.h>

#include <string>

namespace Tarvel {

/// A reader over the file at `path`, which is opened now and closed when the reader is destroyed. `Read` blocks when
/// reading the file does.
/// @throws IOException when the file cannot be opened; the message contains the path and the system's reason.
TARVEL_API Ref<Reader> OpenFile(const std::string &path);

/// A reader over `descriptor`, from its current position. The caller still owns the descriptor, and closes it only when
/// the reader is no longer used.
TARVEL_API Ref<Reader> CreateDescriptorReader(int descriptor);

} // namespace Tarvel
