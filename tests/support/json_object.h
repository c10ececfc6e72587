// SPDX-License-Identifier: Apache-2.0
/// @file
/// `JsonObject`, the members of an object in JSON.

#pragma once

#include <cstdint>
#include <map>
#include <string>

namespace Testing {

/// The members by name, in one map for each type.
struct JsonObject {
  std::map<std::string, std::string> texts;
  std::map<std::string, std::int64_t> numbers;
};

/// @throws std::exception when `json` is not an object, or has a member that is neither a text nor a whole number
JsonObject ReadJsonObject(const std::string &json);

} // namespace Testing
