// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ShapeList`, to which hostile shapes are added.

#pragma once

#include "hostile_documents.h"
#include "hostile_pieces.h"

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace Bench {

class ShapeList {
public:
  /// @param token must outlive the list
  explicit ShapeList(const std::string &token) : m_token(token) {}

  /// A document of pieces in a document element; `begin` is its start tag.
  void AddDocument(std::string name, Piece piece, std::string begin = "<r>", std::string end = "</r>");

  /// The token with pieces between `before` and `after`, in place of the first occurrence of the text `replaced`.
  /// @throws std::runtime_error if the token does not contain `replaced`
  void AddToken(std::string name, std::string_view replaced, std::string before, Piece piece, std::string after);

  std::vector<HostileShape> Take() { return std::move(m_shapes); }

private:
  const std::string &m_token;
  std::vector<HostileShape> m_shapes;
};

} // namespace Bench
