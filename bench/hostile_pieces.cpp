// SPDX-License-Identifier: Apache-2.0

#include "hostile_pieces.h"

#include <algorithm>
#include <cstdint>
#include <utility>
#include <vector>

namespace Bench {

Piece Always(std::string text) {
  return [text = std::move(text)](std::size_t) { return text; };
}

std::string Name(std::size_t index) {
  std::string name = "n";
  for (; index > 0; index /= 36) {
    name += "0123456789abcdefghijklmnopqrstuvwxyz"[index % 36];
  }
  return name;
}

std::string Repeat(std::size_t count, const Piece &piece) {
  std::string text;
  for (std::size_t index = 0; index < count; ++index) {
    text += piece(index);
  }
  return text;
}

Piece Thin(std::string piece, std::size_t nodes) {
  constexpr std::size_t OCTETS_A_NODE = 17;
  const std::size_t blanks = nodes * OCTETS_A_NODE - std::min(piece.size(), nodes * OCTETS_A_NODE);
  piece.replace(piece.find('~'), 1, blanks + 1, ' ');
  return Always(std::move(piece));
}

std::string CollidingPrefix(std::size_t index) {
  static const std::vector<std::string> prefixes = [] {
    constexpr std::uint32_t BUCKETS = 128;
    std::vector<std::string> colliding;
    for (std::size_t candidate = 0; colliding.size() < MANY; ++candidate) {
      const std::string name = Name(candidate);
      std::uint32_t hash = 2166136261U;
      for (const char character : name) {
        hash = (hash ^ static_cast<unsigned char>(character)) * 16777619U;
      }
      if (((hash ^ (hash >> 16)) & (BUCKETS - 1)) == 0) {
        colliding.push_back(name);
      }
    }
    return colliding;
  }();
  return prefixes[index % prefixes.size()];
}

Piece Declaring(const Piece &prefix, const Piece &uri) {
  return [=](std::size_t index) { return " xmlns:" + prefix(index) + "=\"" + uri(index) + '"'; };
}

} // namespace Bench
