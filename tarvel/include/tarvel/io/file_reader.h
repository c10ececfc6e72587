// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers over a file and over an open file descriptor.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/io/reader.h>

#include <string>

namespace Tarvel {

/// A reader over the file at `path`, which is opened now and closed when the reader is destroyed. `Read` blocks when
/// reading the file blocks.
/// @throws IOException when the file cannot be opened; the message contains the path and the system's reason.
TARVEL_API Ref<Reader> OpenFile(const std::string &path);

/// A reader over `descriptor`, from its current position. The caller still owns the descriptor, and must not close it
/// while the reader is used.
TARVEL_API Ref<Reader> CreateDescriptorReader(int descriptor);

} // namespace Tarvel
