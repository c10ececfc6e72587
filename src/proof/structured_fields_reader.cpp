// SPDX-License-Identifier: Apache-2.0

#include "proof/base64_form.h"
#include "proof/structured_fields.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <charconv>
#include <utility>

namespace SsoClient {

namespace {

constexpr std::size_t MAX_INTEGER_DIGITS = 15;
constexpr std::size_t MAX_WHOLE_DIGITS = 12; // of a decimal
constexpr std::size_t MAX_FRACTION_DIGITS = 3;
constexpr std::string_view BLANK = " ";
constexpr std::string_view BLANKS_AND_TABS = " \t";
constexpr std::string_view TOKEN_SPECIALS = "!#$%&'*+-.^_`|~:/";

bool IsDigit(char c) noexcept {
  return c >= '0' && c <= '9';
}

bool IsLower(char c) noexcept {
  return c >= 'a' && c <= 'z';
}

bool IsLetter(char c) noexcept {
  return IsLower(c) || (c >= 'A' && c <= 'Z');
}

bool IsKeyStart(char c) noexcept {
  return IsLower(c) || c == '*';
}

bool IsKeyCharacter(char c) noexcept {
  return IsKeyStart(c) || IsDigit(c) || c == '_' || c == '-' || c == '.';
}

bool IsTokenCharacter(char c) noexcept {
  return IsLetter(c) || IsDigit(c) || TOKEN_SPECIALS.find(c) != std::string_view::npos;
}

bool IsPrintable(char c) noexcept {
  return c >= ' ' && c <= '~';
}

std::int64_t NumberOf(std::string_view digits) noexcept {
  std::int64_t number = 0;
  std::from_chars(digits.data(), digits.data() + digits.size(), number);
  return number;
}

/// Reads one field from its beginning to its end. No function calls itself, and no octet is read more than a few times.
class FieldReader {
public:
  FieldReader(std::string_view field, std::string_view text) noexcept : m_field(field), m_text(text) {}

  std::vector<StructuredMember> ReadMembers();

private:
  bool IsAtEnd() const noexcept { return m_position == m_text.size(); }
  /// The next character, or NUL, which no rule allows.
  char Peek() const noexcept { return IsAtEnd() ? '\0' : m_text[m_position]; }
  bool Skip(char c) noexcept;
  void SkipAll(std::string_view characters) noexcept;
  template <typename Predicate>
  std::string_view TakeWhile(const Predicate &isTaken) noexcept;
  [[noreturn]] void Refuse(const std::string &reason) const;
  void RequireFewer(std::size_t count, std::size_t limit, const char *things) const;

  std::string ReadKey();
  StructuredMember ReadMember();
  StructuredInnerList ReadInnerList();
  StructuredItem ReadItem();
  std::vector<StructuredParameter> ReadParameters();
  StructuredBareItem ReadBareItem();
  StructuredBareItem ReadNumber();
  std::string ReadString();
  std::vector<std::uint8_t> ReadOctets();
  bool ReadBoolean();

  const std::string_view m_field;
  const std::string_view m_text;
  std::size_t m_position = 0;
};

bool FieldReader::Skip(char c) noexcept {
  const bool isThere = !IsAtEnd() && Peek() == c;
  m_position += isThere ? 1 : 0;
  return isThere;
}

void FieldReader::SkipAll(std::string_view characters) noexcept {
  TakeWhile([characters](char c) { return characters.find(c) != std::string_view::npos; });
}

template <typename Predicate>
std::string_view FieldReader::TakeWhile(const Predicate &isTaken) noexcept {
  const std::size_t begin = m_position;
  while (!IsAtEnd() && isTaken(Peek())) {
    ++m_position;
  }
  return m_text.substr(begin, m_position - begin);
}

void FieldReader::Refuse(const std::string &reason) const {
  throw InvalidMessageException("The header field " + std::string(m_field) + " is malformed at character " +
                                std::to_string(m_position + 1) + ": " + reason);
}

void FieldReader::RequireFewer(std::size_t count, std::size_t limit, const char *things) const {
  if (count >= limit) {
    Refuse("there are more than " + std::to_string(limit) + " " + things);
  }
}

std::string FieldReader::ReadKey() {
  if (!IsKeyStart(Peek())) {
    Refuse("a key was expected");
  }
  return std::string(TakeWhile(IsKeyCharacter));
}

std::vector<StructuredMember> FieldReader::ReadMembers() {
  std::vector<StructuredMember> members;
  SkipAll(BLANK);
  while (!IsAtEnd()) {
    RequireFewer(members.size(), MAX_DICTIONARY_MEMBERS, "members");
    StructuredMember member = ReadMember();
    for (const StructuredMember &earlier : members) {
      if (earlier.key == member.key) {
        Refuse("the key " + Tarvel::StringUtil::Shorten(member.key) + " appears twice");
      }
    }
    members.push_back(std::move(member));
    SkipAll(BLANKS_AND_TABS);
    if (IsAtEnd()) {
      break;
    }
    if (!Skip(',')) {
      Refuse("a comma was expected");
    }
    SkipAll(BLANKS_AND_TABS);
    if (IsAtEnd()) {
      Refuse("a member was expected after the comma");
    }
  }
  return members;
}

StructuredMember FieldReader::ReadMember() {
  StructuredMember member{ReadKey(), {}};
  if (!Skip('=')) {
    member.value = StructuredItem{true, ReadParameters()};
  } else if (Peek() == '(') {
    member.value = ReadInnerList();
  } else {
    member.value = ReadItem();
  }
  return member;
}

StructuredInnerList FieldReader::ReadInnerList() {
  StructuredInnerList list;
  Skip('(');
  for (;;) {
    SkipAll(BLANK);
    if (Skip(')')) {
      list.parameters = ReadParameters();
      return list;
    }
    RequireFewer(list.items.size(), MAX_INNER_LIST_ITEMS, "items in a list");
    list.items.push_back(ReadItem());
    if (Peek() != ' ' && Peek() != ')') {
      Refuse("a blank or a closing parenthesis was expected");
    }
  }
}

StructuredItem FieldReader::ReadItem() {
  StructuredItem item{ReadBareItem(), {}};
  item.parameters = ReadParameters();
  return item;
}

std::vector<StructuredParameter> FieldReader::ReadParameters() {
  std::vector<StructuredParameter> parameters;
  while (Skip(';')) {
    RequireFewer(parameters.size(), MAX_PARAMETERS, "parameters");
    SkipAll(BLANK);
    StructuredParameter parameter{ReadKey(), true};
    if (FindParameter(parameters, parameter.key)) {
      Refuse("the parameter " + Tarvel::StringUtil::Shorten(parameter.key) + " appears twice");
    }
    if (Skip('=')) {
      parameter.value = ReadBareItem();
    }
    parameters.push_back(std::move(parameter));
  }
  return parameters;
}

StructuredBareItem FieldReader::ReadBareItem() {
  const char first = Peek();
  if (first == '-' || IsDigit(first)) {
    return ReadNumber();
  }
  if (IsLetter(first) || first == '*') {
    return StructuredToken{std::string(TakeWhile(IsTokenCharacter))};
  }
  if (Skip('"')) {
    return ReadString();
  }
  if (Skip(':')) {
    return ReadOctets();
  }
  if (Skip('?')) {
    return ReadBoolean();
  }
  Refuse("a value was expected");
}

StructuredBareItem FieldReader::ReadNumber() {
  const std::int64_t sign = Skip('-') ? -1 : 1;
  const std::string_view whole = TakeWhile(IsDigit);
  if (whole.empty()) {
    Refuse("a digit was expected");
  }
  if (!Skip('.')) {
    if (whole.size() > MAX_INTEGER_DIGITS) {
      Refuse("an integer has more than 15 digits");
    }
    return sign * NumberOf(whole);
  }
  std::string fraction(TakeWhile(IsDigit));
  if (whole.size() > MAX_WHOLE_DIGITS || fraction.empty() || fraction.size() > MAX_FRACTION_DIGITS) {
    Refuse("a decimal must have at most 12 digits before the point, and one to three after it");
  }
  fraction.resize(MAX_FRACTION_DIGITS, '0');
  return StructuredDecimal{sign * (NumberOf(whole) * 1000 + NumberOf(fraction))};
}

std::string FieldReader::ReadString() {
  std::string text;
  for (;;) {
    text += TakeWhile([](char c) { return IsPrintable(c) && c != '"' && c != '\\'; });
    if (Skip('"')) {
      return text;
    }
    if (!Skip('\\')) {
      Refuse(IsAtEnd() ? "a string does not end" : "a string contains a character that is not printable ASCII");
    }
    if (Peek() != '"' && Peek() != '\\') {
      Refuse("a string has a backslash before another character than a quote or a backslash");
    }
    text += Peek();
    ++m_position;
  }
}

std::vector<std::uint8_t> FieldReader::ReadOctets() {
  const std::string_view text = TakeWhile([](char c) { return c != ':'; });
  if (!Skip(':')) {
    Refuse("octets do not end with a colon");
  }
  auto octets = DecodeBase64(text, TokenHeader::Encoding::BASE64);
  if (!octets) {
    Refuse("octets are not in canonical Base64");
  }
  return *std::move(octets);
}

bool FieldReader::ReadBoolean() {
  const bool isTrue = Peek() == '1';
  if (!Skip('0') && !Skip('1')) {
    Refuse("0 or 1 was expected");
  }
  return isTrue;
}

} // namespace

std::vector<StructuredMember> ReadDictionary(std::string_view field, std::string_view text) {
  return FieldReader(field, text).ReadMembers();
}

const StructuredBareItem *FindParameter(const std::vector<StructuredParameter> &parameters,
                                        std::string_view key) noexcept {
  const auto found = std::find_if(parameters.begin(), parameters.end(),
                                  [key](const StructuredParameter &parameter) { return parameter.key == key; });
  return found != parameters.end() ? &found->value : nullptr;
}

bool IsStructuredKey(std::string_view text) noexcept {
  return !text.empty() && IsKeyStart(text.front()) && std::all_of(text.begin(), text.end(), IsKeyCharacter);
}

bool IsStructuredString(std::string_view text) noexcept {
  return std::all_of(text.begin(), text.end(), IsPrintable);
}

} // namespace SsoClient
