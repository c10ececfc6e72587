// SPDX-License-Identifier: Apache-2.0
/// @file
/// Protects the three standard streams.

#pragma once

namespace SsoClient::Tool {

/// Occupies the descriptors of those standard streams that are closed, so that no file or connection gets one of them,
/// and with it the data that is meant for the stream. Reads and writes there fail as on a closed stream. Call it before
/// anything is opened.
void KeepStandardStreamsApart() noexcept;

} // namespace SsoClient::Tool
