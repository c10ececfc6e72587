// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Advice`, what a token carries, or a request asks the service to put into a token, beside its statements.

#pragma once

#include <string>
#include <vector>

namespace SsoClient {

/// One attribute of an advice.
struct AdviceAttribute {
  std::string name;
  std::vector<std::string> values; ///< in order
};

/// Advice from one source.
struct Advice {
  std::string source;
  std::vector<AdviceAttribute> attributes; ///< in order
};

} // namespace SsoClient
