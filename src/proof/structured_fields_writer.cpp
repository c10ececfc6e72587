// SPDX-License-Identifier: Apache-2.0

#include "proof/base64_form.h"
#include "proof/structured_fields.h"

#include <cstdlib>

namespace SsoClient {

namespace {

/// Appends a bare item to a text.
class ItemWriter {
public:
  explicit ItemWriter(std::string &text) noexcept : m_text(text) {}

  void operator()(std::int64_t number) const { m_text += std::to_string(number); }
  void operator()(const StructuredDecimal &decimal) const;
  void operator()(const std::string &string) const;
  void operator()(const StructuredToken &token) const { m_text += token.text; }
  void operator()(const std::vector<std::uint8_t> &octets) const;
  void operator()(bool value) const { m_text += value ? "?1" : "?0"; }

private:
  std::string &m_text;
};

void ItemWriter::operator()(const StructuredDecimal &decimal) const {
  constexpr std::int64_t ONE = 1000;
  const std::int64_t magnitude = std::abs(decimal.thousandths);
  std::string fraction = std::to_string(ONE + magnitude % ONE).substr(1); // three digits
  fraction.erase(fraction.find_last_not_of('0') + 1);
  m_text += decimal.thousandths < 0 ? "-" : "";
  m_text += std::to_string(magnitude / ONE) + '.' + (fraction.empty() ? "0" : fraction);
}

void ItemWriter::operator()(const std::string &string) const {
  m_text += '"';
  for (const char c : string) {
    if (c == '"' || c == '\\') {
      m_text += '\\';
    }
    m_text += c;
  }
  m_text += '"';
}

void ItemWriter::operator()(const std::vector<std::uint8_t> &octets) const {
  const std::string_view view(reinterpret_cast<const char *>(octets.data()), octets.size());
  m_text += ':' + EncodeBase64(view, TokenHeader::Encoding::BASE64) + ':';
}

void AppendParameters(const std::vector<StructuredParameter> &parameters, std::string &text) {
  for (const StructuredParameter &parameter : parameters) {
    text += ';' + parameter.key;
    const bool *const flag = std::get_if<bool>(&parameter.value);
    if (!flag || !*flag) {
      text += '=';
      std::visit(ItemWriter(text), parameter.value);
    }
  }
}

} // namespace

std::string WriteStructured(const StructuredInnerList &list) {
  std::string text = "(";
  for (const StructuredItem &item : list.items) {
    text += text.size() > 1 ? " " : "";
    std::visit(ItemWriter(text), item.value);
    AppendParameters(item.parameters, text);
  }
  text += ')';
  AppendParameters(list.parameters, text);
  return text;
}

std::string WriteStructured(const StructuredBareItem &item) {
  std::string text;
  std::visit(ItemWriter(text), item);
  return text;
}

} // namespace SsoClient
