// SPDX-License-Identifier: Apache-2.0
/// @file
/// The documents under tests/data that are tokens, were tokens or contain tokens.

#pragma once

#include <string>
#include <vector>

namespace Reports {

struct TokenFile {
  std::string name; ///< from tests/data on, such as "tokens/full.xml"
  std::string xml;
};

/// All XML files of a folder, such as "tokens", by their names.
std::vector<TokenFile> ReadTokenFiles(const std::string &folder);

/// All of tokens, attacks and requests.
const std::vector<TokenFile> &AllTokenFiles();

} // namespace Reports
