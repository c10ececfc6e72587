// SPDX-License-Identifier: Apache-2.0
/// @file
/// JSON arrays of items.

#pragma once

#include <nlohmann/json.hpp>

namespace SsoClient::Tool {

/// The array of `items`, each written by `toJson`.
template <typename Items, typename ToJson>
nlohmann::ordered_json JsonArrayOf(const Items &items, const ToJson &toJson) {
  nlohmann::ordered_json array = nlohmann::ordered_json::array();
  for (const auto &item : items) {
    array.push_back(toJson(item));
  }
  return array;
}

} // namespace SsoClient::Tool
