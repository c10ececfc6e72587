// SPDX-License-Identifier: Apache-2.0

#include "message_changes.h"

#include "integration/token_report/token_changes.h"

#include <string_view>

namespace Messages {

namespace {

using Testing::RandomSource;

/// What a part begins with, and its end.
struct PartName {
  std::string_view begin;
  std::string_view end;
};

constexpr PartName PARTS[] = {
    {"<s:Body", "</s:Body>"},
    {"<wsu:Timestamp", "</wsu:Timestamp>"},
    {"<saml:Assertion", "</saml:Assertion>"},
    {"<wsse:Security ", "</wsse:Security>"},
    {"<s:Header", "</s:Header>"},
    {"<a:To", "</a:To>"},
    {"<ds:KeyInfo>", "</ds:KeyInfo>"},
    {"<wsse:SecurityTokenReference", "</wsse:SecurityTokenReference>"},
    {"<m:Pay", "</m:Pay>"},
};

/// Before these texts, or after the tags that they end, a part can be inserted.
constexpr std::string_view PLACES[] = {"<s:Header>",       "</s:Header>",     "<s:Body",          "</s:Body>",
                                       "</s:Envelope>",    "<wsse:Security",  "</wsse:Security>", "<saml:Assertion",
                                       "</saml:Advice>",   "</ds:Signature>", "</ds:KeyInfo>",    "<wsu:Timestamp",
                                       "</wsu:Timestamp>", "</m:Pay>"};

constexpr std::string_view WRAPPERS[] = {"", "x", "s:Header", "s:Body", "s:Envelope", "wsse:Security", "ds:Object"};

constexpr std::string_view FORGERIES[][2] = {
    {">alice<", ">mallory<"}, {">10<", ">9999<"}, {"03:09:00", "04:09:00"}, {"urn:service", "urn:other"}};

constexpr std::string_view IDENTIFIERS[] = {"", " wsu:Id=\"forged\"", " ID=\"body\"", " Id=\"time\"",
                                            " xml:id=\"body\""};

/// Replaces the identifier in the start tag of `part` with another one, or removes it.
void ChangeIdentifier(std::string &part, RandomSource &random) {
  const std::size_t tagEnd = part.find('>');
  const std::size_t begin = part.find(" wsu:Id=\"");
  if (begin < tagEnd) {
    const std::size_t end = part.find('"', begin + 9) + 1;
    part.replace(begin, end - begin, random.OneOf(IDENTIFIERS));
  }
}

std::string Forge(std::string part, RandomSource &random) {
  for (const auto &[genuine, forged] : FORGERIES) {
    if (const std::size_t at = part.find(genuine); at != std::string::npos) {
      part.replace(at, genuine.size(), forged);
    }
  }
  if (random.OnceIn(2)) {
    ChangeIdentifier(part, random);
  }
  return part;
}

void InsertAnywhere(std::string &xml, const std::string &part, RandomSource &random) {
  const std::size_t at = xml.find(random.OneOf(PLACES));
  if (at == std::string::npos) {
    return;
  }
  const std::string wrapper(random.OneOf(WRAPPERS));
  const std::string inserted = wrapper.empty() ? part : "<" + wrapper + ">" + part + "</" + wrapper + ">";
  xml.insert(random.OnceIn(2) ? at : xml.find('>', at) + 1, inserted);
}

/// Puts a forged part, or one of another message, in the place of a genuine one, which is kept elsewhere.
void WrapPart(std::string &xml, const std::string &other, RandomSource &random) {
  const PartName &name = PARTS[random.Below(std::size(PARTS))];
  const std::size_t begin = xml.find(name.begin);
  const std::size_t last = begin == std::string::npos ? begin : xml.find(name.end, begin);
  if (last == std::string::npos) {
    return;
  }
  const std::size_t size = last + name.end.size() - begin;
  const std::string genuine = xml.substr(begin, size);
  std::string replacement = Forge(genuine, random);
  const std::size_t otherBegin = other.find(name.begin);
  const std::size_t otherLast = otherBegin == std::string::npos ? otherBegin : other.find(name.end, otherBegin);
  if (otherLast != std::string::npos && random.OnceIn(2)) {
    replacement = other.substr(otherBegin, otherLast + name.end.size() - otherBegin);
  }
  xml.replace(begin, size, random.OnceIn(6) ? std::string() : replacement);
  InsertAnywhere(xml, random.OnceIn(4) ? replacement : genuine, random);
}

} // namespace

std::string ChangeMessage(const std::string &xml, const std::string &other, RandomSource &random) {
  if (!random.OnceIn(3)) {
    return Reports::ChangeToken(xml, other, random);
  }
  std::string changed = xml;
  for (std::size_t changes = random.OnceIn(3) ? 2 : 1; changes > 0; --changes) {
    WrapPart(changed, other, random);
  }
  return changed;
}

} // namespace Messages
