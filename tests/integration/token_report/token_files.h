// SPDX-License-Identifier: Apache-2.0
/// @file
/// The documents under tests/data that are tokens, were tokens or contain tokens.

#pragma once

#include <string>
#include <vector>

namespace Reports {

struct TokenFile {
  std::string name; ///< the path below tests/data, such as "tokens/full.xml"
  std::string xml;
};

/// All XML files of a folder, such as "tokens", sorted by name.
std::vector<TokenFile> ReadTokenFiles(const std::string &folder);

/// The files of the folders tokens, attacks, saml2 and requests.
const std::vector<TokenFile> &AllTokenFiles();

} // namespace Reports
