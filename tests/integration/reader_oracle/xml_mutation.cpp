// SPDX-License-Identifier: Apache-2.0

#include "xml_mutation.h"

#include <algorithm>
#include <cstddef>
#include <vector>

namespace Testing {

namespace {

constexpr std::string_view OCTETS = "<>&;'\"=/!?-[]:# \n\rax1\x7F\x80\xC3\xEF\xFF";

char AnyOctet(RandomSource &random) {
  return random.OnceIn(3) ? static_cast<char>(random.Below(256)) : OCTETS[random.Below(OCTETS.size())];
}

struct Part {
  std::size_t begin;
  std::size_t length;
};

Part AnyPart(std::string_view text, RandomSource &random, std::size_t longest) {
  const std::size_t begin = random.Below(text.size());
  return {begin, std::min(1 + random.Below(longest), text.size() - begin)};
}

/// A range from one delimiter to the next.
Part AnyToken(std::string_view text, RandomSource &random) {
  const std::size_t begin = std::min(text.find_first_of("<>&;='\" ", random.Below(text.size())), text.size() - 1);
  const std::size_t end = std::min(text.find_first_of("<>&;='\" ", begin + 1), text.size());
  return {begin, end - begin};
}

void ExchangeTokens(std::string &text, RandomSource &random) {
  Part first = AnyToken(text, random);
  Part second = AnyToken(text, random);
  if (second.begin < first.begin) {
    std::swap(first, second);
  }
  if (first.begin + first.length > second.begin) {
    return;
  }
  const std::string former = text.substr(first.begin, first.length);
  const std::string latter = text.substr(second.begin, second.length);
  text.replace(second.begin, second.length, former);
  text.replace(first.begin, first.length, latter);
}

} // namespace

void Mutate(std::string &text, std::string_view other, RandomSource &random) {
  if (text.empty() || other.empty()) {
    return;
  }
  const Part part = AnyPart(text, random, random.OnceIn(3) ? 24 : 3);
  const std::string taken = text.substr(part.begin, part.length);
  switch (random.Below(9)) {
  case 0:
    text[part.begin] = static_cast<char>(static_cast<unsigned char>(text[part.begin]) ^ (1u << random.Below(8)));
    return;
  case 1:
    text[part.begin] = AnyOctet(random);
    return;
  case 2:
    text.insert(part.begin, 1, AnyOctet(random));
    return;
  case 3:
    text.erase(part.begin, part.length);
    return;
  case 4:
    text.insert(part.begin, taken);
    return;
  case 5:
    text.insert(random.Below(text.size()), taken);
    return;
  case 6:
    ExchangeTokens(text, random);
    return;
  case 7: {
    const Part theirs = AnyPart(other, random, 40);
    text.replace(part.begin, random.OnceIn(2) ? part.length : 0, other.substr(theirs.begin, theirs.length));
    return;
  }
  default:
    if (random.OnceIn(2)) {
      text.resize(part.begin);
    } else {
      text.replace(part.begin, std::string::npos, other.substr(random.Below(other.size())));
    }
  }
}

} // namespace Testing
