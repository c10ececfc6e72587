// SPDX-License-Identifier: Apache-2.0

#include "operation/secret_mask.h"

#include "exchange/soap_fault.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::SecretText;
using Tarvel::StringUtil;

constexpr std::string_view MASK = "***";
constexpr std::string_view WHITE_SPACE = " \t\r\n";
constexpr std::string_view END_OF_NAME = " \t\r\n/<>&";

/// A service may cut what it repeats. So the beginning of a secret is masked at the end of a text, too, if it has at
/// least this number of bytes.
constexpr std::size_t MIN_BEGINNING = 8;

/// The length of overlapping secrets after which the rest of the text is masked, too.
constexpr std::size_t MAX_OVERLAP_BYTES = std::size_t{1} << 20;

/// The text and some secrets are the service's, which may be hostile: after so many comparisons and equal bytes, the
/// rest of the text is masked.
constexpr std::size_t MAX_COMPARISONS = std::size_t{1} << 26;

/// After a tag with a longer name, the rest of the text is masked.
constexpr std::size_t MAX_NAME_BYTES = 256;

/// With more secrets, each text is masked as a whole.
constexpr std::size_t MAX_SECRETS = 100;

SecretText WithoutWhiteSpace(std::string_view text) {
  SecretText result;
  std::size_t begin = text.find_first_not_of(WHITE_SPACE);
  while (begin != std::string_view::npos) {
    const std::size_t end = std::min(text.find_first_of(WHITE_SPACE, begin), text.size());
    result.Append(text.substr(begin, end - begin));
    begin = text.find_first_not_of(WHITE_SPACE, end);
  }
  return result;
}

SecretText Trimmed(std::string_view text) {
  const std::size_t first = text.find_first_not_of(WHITE_SPACE);
  return first == std::string_view::npos
             ? SecretText()
             : SecretText(text.substr(first, text.find_last_not_of(WHITE_SPACE) - first + 1));
}

SecretText Base64(const void *data, std::size_t length) {
  return SecretText(StringUtil::Base64Encode(static_cast<const std::uint8_t *>(data), length));
}

/// The forms that services write for each of the two quotes, in any combination.
constexpr std::string_view QUOTES[] = {"\"", "&quot;", "&#34;", "&#x22;"};
constexpr std::string_view APOSTROPHES[] = {"'", "&apos;", "&#39;", "&#x27;"};

SecretText Escaped(std::string_view text, std::string_view quote, std::string_view apostrophe) {
  SecretText result;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    result.Append(c == '&'    ? "&amp;"
                  : c == '<'  ? "&lt;"
                  : c == '>'  ? "&gt;"
                  : c == '"'  ? quote
                  : c == '\'' ? apostrophe
                              : text.substr(i, 1));
  }
  return result;
}

/// The length of the UTF-8 character at the beginning of `text`; 1 for an octet that does not begin one.
std::size_t CharacterLength(std::string_view text) noexcept {
  const auto lead = static_cast<unsigned char>(text.front());
  const std::size_t length = lead < 0xC2 ? 1 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : lead < 0xF5 ? 4 : 1;
  for (std::size_t i = 1; i < length; ++i) {
    if (i == text.size() || (static_cast<unsigned char>(text[i]) & 0xC0u) != 0x80u) {
      return 1;
    }
  }
  return length;
}

/// The length of "<", as it is or escaped any number of times, at the beginning of `text`; 0 if there is none.
std::size_t MarkupBeginLength(std::string_view text) noexcept {
  constexpr std::string_view AMP = "amp;";
  constexpr std::string_view LT = "lt;";
  if (text.starts_with('<')) {
    return 1;
  }
  std::size_t length = text.starts_with('&') ? 1 : 0;
  while (length > 0 && text.substr(length).starts_with(AMP)) {
    length += AMP.size();
  }
  return length > 0 && text.substr(length).starts_with(LT) ? length + LT.size() : 0;
}

/// The name of the element whose start tag is at the beginning of `text`; empty if no tag is there.
std::string_view TagName(std::string_view text) noexcept {
  const std::size_t begin = MarkupBeginLength(text);
  return begin == 0 ? std::string_view() : text.substr(begin, text.find_first_of(END_OF_NAME, begin) - begin);
}

std::string_view LocalNameOf(std::string_view name) noexcept {
  const std::size_t colon = name.rfind(':');
  return colon == std::string_view::npos ? name : name.substr(colon + 1);
}

/// Where the element that begins at `begin` ends, if its content is secret: after the name in its end tag, or at the
/// end of the text; otherwise `begin`.
std::size_t FindSecretElementEnd(std::string_view text, std::size_t begin) noexcept {
  const std::string_view name = TagName(text.substr(begin));
  if (name.size() > MAX_NAME_BYTES) {
    return text.size();
  }
  if (name.empty() || !IsSecretElement(LocalNameOf(name))) {
    return begin;
  }
  int depth = 1;
  std::size_t end = begin + MarkupBeginLength(text.substr(begin)) + name.size();
  while (depth > 0) {
    const std::size_t next = text.find(name, end);
    if (next == std::string_view::npos) {
      return text.size();
    }
    end = next + name.size();
    const bool isWholeName = end == text.size() || END_OF_NAME.find(text[end]) != std::string_view::npos;
    const char before = text[next - 1];
    depth += !isWholeName ? 0 : before == '/' ? -1 : before == '<' || before == ';' ? 1 : 0;
  }
  return end;
}

/// How many bytes at the beginnings of the two texts are equal.
std::size_t CommonLength(std::string_view one, std::string_view other) noexcept {
  const std::size_t most = std::min(one.size(), other.size());
  return static_cast<std::size_t>(std::mismatch(one.begin(), one.begin() + most, other.begin()).first - one.begin());
}

std::string MissingBytes(std::size_t count) {
  return "... (" + std::to_string(count) + " more bytes)";
}

} // namespace

void SecretMask::AddPassword(const std::string &password) noexcept {
  Guard([&] {
    for (const SecretText &form : {SecretText(password), Trimmed(password)}) {
      AddText(form.Get());
      AddSecret(Base64(form.Get().data(), form.Get().size()));
    }
  });
}

void SecretMask::AddLeg(const std::vector<std::uint8_t> &leg) noexcept {
  Guard([&] { AddSecret(Base64(leg.data(), leg.size())); });
}

void SecretMask::AddToken(const SamlToken &token) noexcept {
  Guard([&] { AddToken(token.ToXml()); });
}

void SecretMask::AddToken(const std::string &tokenXml) noexcept {
  Guard([&] {
    AddSecret(SecretText(tokenXml)); // an escaped token is masked because of its markup
    AddValues(tokenXml);
  });
}

void SecretMask::AddRequest(const std::string &envelope) noexcept {
  Guard([&] { AddValues(envelope); });
}

void SecretMask::AddPrefixOf(std::string_view qualifiedName, std::string_view masked) noexcept {
  const std::size_t colon = qualifiedName.find(':');
  if (colon != std::string_view::npos && !masked.starts_with(qualifiedName.substr(0, colon + 1))) {
    Guard([&] { AddSecret(SecretText(qualifiedName.substr(0, colon))); });
  }
}

std::string SecretMask::Apply(std::string_view text) const {
  if (m_isIncomplete) {
    return std::string(text.empty() ? "" : MASK);
  }
  std::string shown;
  std::size_t comparisons = 0;
  std::size_t at = 0;
  while (at < text.size()) {
    const std::size_t maskedEnd = FindMaskedEnd(text, at, comparisons);
    const std::size_t end = maskedEnd > at ? maskedEnd : at + CharacterLength(text.substr(at));
    const std::string next = maskedEnd > at ? std::string(MASK) : StringUtil::Printable(text.substr(at, end - at));
    if (shown.size() + next.size() > StringUtil::MAX_VALUE_BYTES) {
      return shown + MissingBytes(text.size() - at);
    }
    shown += next;
    at = end;
  }
  return shown;
}

template <typename AddAll>
void SecretMask::Guard(const AddAll &addAll) noexcept {
  try {
    addAll();
  } catch (...) {
    m_isIncomplete = true;
  }
}

void SecretMask::AddText(std::string_view text) {
  AddSecret(SecretText(text));
  for (const std::string_view quote : QUOTES) {
    for (const std::string_view apostrophe : APOSTROPHES) {
      const SecretText escaped = Escaped(text, quote, apostrophe);
      AddSecret(Escaped(escaped.Get(), quote, apostrophe)); // a service may put one message into another
      AddSecret(SecretText(escaped));
    }
  }
}

void SecretMask::AddSecret(SecretText &&secret) {
  const auto isSame = [&](const SecretText &known) { return known.Get() == secret.Get(); };
  if (m_isIncomplete || secret.Get().empty() || std::any_of(m_secrets.begin(), m_secrets.end(), isSame)) {
    return;
  }
  if (m_secrets.size() == MAX_SECRETS) {
    m_isIncomplete = true;
    return;
  }
  m_secrets.push_back(std::move(secret));
}

/// Adds the values of signatures and negotiations in `xml`, as they are and without line breaks.
void SecretMask::AddValues(std::string_view xml) {
  for (std::size_t at = xml.find('<'); at != std::string_view::npos && !m_isIncomplete;) {
    const std::size_t next = xml.find('<', at + 1);
    const std::string_view tagAndText = xml.substr(at, next - at);
    const std::string_view name = LocalNameOf(TagName(tagAndText));
    if (name == "SignatureValue" || name == "DigestValue" || name == "BinaryExchange") {
      const std::string_view value = tagAndText.substr(std::min(tagAndText.find('>'), tagAndText.size() - 1) + 1);
      AddSecret(SecretText(value));
      AddSecret(WithoutWhiteSpace(value));
    }
    at = next;
  }
}

/// Where a secret that begins at `begin` ends; `begin` if none begins there.
std::size_t SecretMask::FindSecretEnd(std::string_view text, std::size_t begin,
                                      std::size_t &comparisons) const noexcept {
  const std::string_view rest = text.substr(begin);
  std::size_t length = 0;
  for (const SecretText &secret : m_secrets) {
    const std::size_t common = CommonLength(rest, secret.Get());
    comparisons += common + 1;
    const bool isBeginning = rest.size() >= MIN_BEGINNING && common == rest.size();
    if (isBeginning || common == secret.Get().size()) {
      length = std::max(length, common);
    }
  }
  return begin + length;
}

/// Where the secrets end that begin at `begin` or overlap with one that does; `begin` if none begins there.
std::size_t SecretMask::FindMaskedEnd(std::string_view text, std::size_t begin,
                                      std::size_t &comparisons) const noexcept {
  std::size_t end = std::max(FindSecretEnd(text, begin, comparisons), FindSecretElementEnd(text, begin));
  for (std::size_t inside = begin + 1; inside < end && end < text.size(); ++inside) {
    if (inside - begin > MAX_OVERLAP_BYTES || comparisons > MAX_COMPARISONS) {
      return text.size();
    }
    end = std::max(end, FindSecretEnd(text, inside, comparisons));
  }
  return comparisons > MAX_COMPARISONS ? text.size() : end;
}

} // namespace SsoClient
