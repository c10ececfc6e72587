// SPDX-License-Identifier: Apache-2.0
/// @file
/// The names and values that the switches of a `ServiceDialect` have in files and on the command line.

#pragma once

#include <ssoclient/service_dialect.h>

#include <span>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// One switch. On the command line every value is a text.
struct DialectSwitch {
  enum class JsonType {
    TEXT,
    BOOLEAN, ///< the texts are "true" and "false"
    FAULTS   ///< an array of objects with the keys "namespace" and "name"
  };

  std::string_view name;
  JsonType jsonType;
  /// The possible values, as messages show them after "must be".
  std::string (*values)();
  /// Returns false for a text that is not a value. Do not use the dialect then.
  bool (*set)(ServiceDialect &dialect, const std::string &text);
  std::string (*get)(const ServiceDialect &dialect);
};

/// All switches, in the order in which a dialect is written.
std::span<const DialectSwitch> DialectSwitches();

/// Null for an unknown name.
const DialectSwitch *FindDialectSwitch(std::string_view name);

/// The names of all switches, separated by commas.
std::string DialectSwitchNames();

/// The names of all dialects that the library knows, separated by commas.
std::string DialectNames();

/// Whether the library knows a dialect of that name.
bool IsDialectName(const std::string &name);

} // namespace SsoClient::Tool
