// SPDX-License-Identifier: Apache-2.0

#include "generated_xml.h"

#include "document_writer.h"
#include "xml_mutation.h"
#include "xml_pieces.h"

#include <cstddef>
#include <string_view>

namespace Testing {

namespace {

std::string TokenSoup(RandomSource &random) {
  std::string text = random.OnceIn(2) ? "<a>" : "";
  for (std::size_t count = 1 + random.Below(12); count != 0; --count) {
    text += random.OneOf(TOKENS);
  }
  return text + (text.size() > 2 && random.OnceIn(2) ? "</a>" : "");
}

std::string Repeated(std::string_view text, std::size_t count) {
  std::string repeated;
  for (; count != 0; --count) {
    repeated += text;
  }
  return repeated;
}

/// At a limit of the platform, one below it or one above.
std::string AtLimit(RandomSource &random) {
  const std::size_t count = 255 + random.Below(3);
  switch (random.Below(4)) {
  case 0:
    return Repeated("<a>", count) + Repeated("</a>", count);
  case 1: {
    std::string tag = "<a";
    for (std::size_t i = 0; i < count; ++i) {
      tag += (random.OnceIn(2) ? " a" : " xmlns:a") + std::to_string(i) + "='x:'";
    }
    return tag + "/>";
  }
  case 2: {
    std::string tags;
    for (std::size_t i = 0; i < count; i += 16) {
      tags += "<a";
      for (std::size_t k = i; k < i + 16 && k < count; ++k) {
        tags += " xmlns:a" + std::to_string(k) + "='x:'";
      }
      tags += ">";
    }
    return tags + Repeated("</a>", (count + 15) / 16);
  }
  default: {
    const std::string name(4094 + random.Below(4), 'n');
    return random.OnceIn(2) ? "<" + name + "/>" : "<?" + name + "?><a " + name + "='" + name + "'/>";
  }
  }
}

/// For ASCII; each other octet becomes a separate character.
std::string ToUtf16(std::string_view text, RandomSource &random) {
  const bool isBigEndian = random.OnceIn(2);
  std::string recoded = random.OnceIn(3) ? "" : isBigEndian ? "\xFE\xFF" : "\xFF\xFE";
  for (const char octet : text) {
    recoded += isBigEndian ? '\0' : octet;
    recoded += isBigEndian ? octet : '\0';
  }
  return recoded;
}

} // namespace

std::string GenerateXml(std::uint64_t seed) {
  RandomSource random(seed);
  if (random.OnceIn(2000)) {
    return AtLimit(random);
  }
  std::string text = random.OnceIn(12) ? TokenSoup(random) : WriteDocument(random);
  if (random.OnceIn(400)) {
    text = random.OnceIn(8) ? std::string(EBCDIC) : ToUtf16(text, random);
  }
  if (random.OnceIn(3)) {
    const std::string other = random.OnceIn(4) ? WriteDocument(random) : TokenSoup(random);
    for (std::size_t count = 1 + random.Below(random.OnceIn(3) ? 4 : 1); count != 0; --count) {
      Mutate(text, other, random);
    }
  }
  return text;
}

} // namespace Testing
