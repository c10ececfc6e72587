// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Schemas`, the schemas of the standards, and validation with them.

#pragma once

#include <libxml/xmlschemas.h>

#include <memory>
#include <string>

namespace Testing {

/// The schemas of packages of Debian and of tests/data/schemas, loaded without the network.
class Schemas {
public:
  /// @throws std::runtime_error when the schemas do not load.
  Schemas();

  /// The errors in the document; empty when it is valid.
  /// @throws std::runtime_error when libxml2 does not parse the text, or an identifier occurs twice.
  std::string Judge(const std::string &xml) const;

private:
  std::unique_ptr<xmlSchema, decltype(&xmlSchemaFree)> m_schema{nullptr, &xmlSchemaFree};
};

} // namespace Testing
