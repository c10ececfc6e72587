// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Advice`, additional statements about the subject: in a token, or requested for one.

#pragma once

#include <string>
#include <vector>

namespace SsoClient {

/// One attribute of an advice.
struct AdviceAttribute {
  std::string name;                ///< the name of the attribute
  std::vector<std::string> values; ///< in order
};

/// The attributes that one source states.
struct Advice {
  std::string source;                      ///< the name of the source
  std::vector<AdviceAttribute> attributes; ///< in order
};

} // namespace SsoClient
