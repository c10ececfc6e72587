// SPDX-License-Identifier: Apache-2.0

#include "shape_list.h"

#include <cstddef>
#include <stdexcept>

namespace Bench {

namespace {

/// Returns `begin`, as many pieces as fit into `octets`, and `end`.
std::string Fill(std::size_t octets, const std::string &begin, const Piece &piece, const std::string &end) {
  std::string text;
  text.reserve(octets);
  text = begin;
  for (std::size_t index = 0;; ++index) {
    const std::string next = piece(index);
    if (text.size() + next.size() + end.size() > octets) {
      break;
    }
    text += next;
  }
  return text += end;
}

} // namespace

void ShapeList::AddDocument(std::string name, Piece piece, std::string begin, std::string end) {
  m_shapes.push_back({std::move(name), [begin = std::move(begin), piece = std::move(piece), end = std::move(end)](
                                           std::size_t octets) { return Fill(octets, begin, piece, end); }});
}

void ShapeList::AddToken(std::string name, std::string_view replaced, std::string before, Piece piece,
                         std::string after) {
  const std::size_t at = m_token.find(replaced);
  if (at == std::string::npos) {
    throw std::runtime_error("the token has no " + std::string(replaced));
  }
  AddDocument(std::move(name), std::move(piece), m_token.substr(0, at) + before,
              after + m_token.substr(at + replaced.size()));
}

} // namespace Bench
