// SPDX-License-Identifier: Apache-2.0
/// @file
/// The guard of the three standard streams.

#pragma once

namespace SsoClient::Tool {

/// Takes the descriptors of standard input, output and error that the process was started without, so that no file or
/// connection gets one of them, and with it what is meant for the stream. Reading, or writing, there fails as on a closed
/// one. To be called before anything is opened.
void KeepStandardStreamsApart() noexcept;

} // namespace SsoClient::Tool
