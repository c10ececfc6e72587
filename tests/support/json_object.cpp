// SPDX-License-Identifier: Apache-2.0
// The only source of the tests that includes nlohmann/json.hpp, which takes seconds to compile.

#include "support/json_object.h"

#include <nlohmann/json.hpp>

#include <stdexcept>

namespace Testing {

JsonObject ReadJsonObject(const std::string &json) {
  const nlohmann::json read = nlohmann::json::parse(json);
  if (!read.is_object()) {
    throw std::runtime_error("not an object: " + json);
  }
  JsonObject object;
  for (const auto &member : read.items()) {
    if (member.value().is_string()) {
      object.texts[member.key()] = member.value();
    } else if (member.value().is_number_integer()) {
      object.numbers[member.key()] = member.value();
    } else {
      throw std::runtime_error("neither a text nor a whole number: " + member.key());
    }
  }
  return object;
}

} // namespace Testing
