// SPDX-License-Identifier: Apache-2.0
/// @file
/// `BindLoopback`, a TCP socket on a free port of loopback.

#pragma once

namespace Testing {

/// Returns a socket that is bound to a free port of 127.0.0.1, or with `v6` of ::1, and sets `port` to that port. The
/// caller closes the socket. @throws std::runtime_error
int BindLoopback(bool v6, int &port);

} // namespace Testing
