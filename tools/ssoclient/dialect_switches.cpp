// SPDX-License-Identifier: Apache-2.0

#include "dialect_switches.h"

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

namespace SsoClient::Tool {
namespace {

constexpr std::string_view SAML_2_TOKEN = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr std::string_view NONE = "none";

using Statement = ServiceDialect::Statement;
using UseKey = ServiceDialect::UseKey;
using Delegation = ServiceDialect::Delegation;

/// A value of a switch that has a fixed set of values.
template <typename Value>
struct Choice {
  std::string_view text;
  Value value;
};

constexpr Choice<bool> CHARSETS[] = {{NONE, false}, {"utf-8", true}};
constexpr Choice<bool> BOOLEANS[] = {{"true", true}, {"false", false}};
constexpr Choice<Statement> STATEMENTS[] = {
    {"always", Statement::ALWAYS}, {"when-true", Statement::WHEN_TRUE}, {"never", Statement::NEVER}};
constexpr Choice<UseKey> USE_KEYS[] = {
    {"reference", UseKey::REFERENCE}, {"certificate", UseKey::CERTIFICATE}, {"never", UseKey::NEVER}};
constexpr Choice<Delegation> DELEGATIONS[] = {{"delegate-to", Delegation::DELEGATE_TO},
                                              {"on-behalf-of", Delegation::ON_BEHALF_OF},
                                              {"act-as", Delegation::ACT_AS}};
constexpr Choice<bool> REFERENCES[] = {{"established", false}, {"standard", true}};

/// The texts, with commas and a final "or".
template <typename Texts>
std::string ListChoices(const Texts &texts) {
  std::string list;
  for (std::size_t i = 0; i < std::size(texts); ++i) {
    list += i == 0 ? "" : i + 1 < std::size(texts) ? ", " : " or ";
    list += texts[i].text;
  }
  return list;
}

template <auto MEMBER, const auto &CHOICES>
bool SetChoice(ServiceDialect &dialect, const std::string &text) {
  const auto *const found =
      std::find_if(std::begin(CHOICES), std::end(CHOICES), [&](const auto &choice) { return choice.text == text; });
  if (found == std::end(CHOICES)) {
    return false;
  }
  dialect.*MEMBER = found->value;
  return true;
}

template <auto MEMBER, const auto &CHOICES>
std::string GetChoice(const ServiceDialect &dialect) {
  const auto *const found = std::find_if(std::begin(CHOICES), std::end(CHOICES),
                                         [&](const auto &choice) { return choice.value == dialect.*MEMBER; });
  return std::string(found->text); // the tool sets only values that are in the table
}

template <auto MEMBER, const auto &CHOICES>
constexpr DialectSwitch ChoiceSwitch(std::string_view name, DialectSwitch::JsonType type) {
  return {name, type, [] { return ListChoices(CHOICES); }, SetChoice<MEMBER, CHOICES>, GetChoice<MEMBER, CHOICES>};
}

bool SetAppliesTo(ServiceDialect &dialect, const std::string &text) {
  dialect.appliesTo = text == NONE ? boost::optional<std::string>() : text;
  return true; // `CheckServiceDialect` refuses what is not a URI
}

std::string GetAppliesTo(const ServiceDialect &dialect) {
  return dialect.appliesTo.value_or(std::string(NONE));
}

bool SetTokenType(ServiceDialect &dialect, const std::string &text) {
  dialect.tokenType = text;
  return !text.empty();
}

std::string GetTokenType(const ServiceDialect &dialect) {
  return dialect.tokenType.empty() ? std::string(SAML_2_TOKEN) : dialect.tokenType;
}

/// The name in a text of the form {NAMESPACE}NAME. The local name is empty if the text does not have this form.
FaultName ReadFaultName(const std::string &text) {
  const std::size_t end = text.rfind('}');
  if (text.empty() || text.front() != '{' || end == std::string::npos) {
    return {};
  }
  return {text.substr(1, end - 1), text.substr(end + 1)};
}

bool SetFaults(ServiceDialect &dialect, const std::string &text) {
  std::vector<FaultName> faults;
  if (text != NONE) {
    for (std::size_t begin = 0; begin <= text.size();) {
      const std::size_t end = std::min(text.find(' ', begin), text.size());
      faults.push_back(ReadFaultName(text.substr(begin, end - begin)));
      if (faults.back().localName.empty()) {
        return false;
      }
      begin = end + 1;
    }
  }
  dialect.credentialFaults = std::move(faults);
  return true;
}

std::string GetFaults(const ServiceDialect &dialect) {
  std::string text;
  for (const FaultName &fault : dialect.credentialFaults) {
    text += (text.empty() ? "{" : " {") + fault.namespaceUri + "}" + fault.localName;
  }
  return text.empty() ? std::string(NONE) : text;
}

using JsonType = DialectSwitch::JsonType;

constexpr DialectSwitch SWITCHES[] = {
    ChoiceSwitch<&ServiceDialect::declaresCharset, CHARSETS>("charset", JsonType::TEXT),
    {"applies-to", JsonType::TEXT, [] { return std::string("a URI or none"); }, SetAppliesTo, GetAppliesTo},
    ChoiceSwitch<&ServiceDialect::addressing, BOOLEANS>("addressing", JsonType::BOOLEAN),
    ChoiceSwitch<&ServiceDialect::delegatable, STATEMENTS>("delegatable", JsonType::TEXT),
    ChoiceSwitch<&ServiceDialect::renewing, STATEMENTS>("renewing", JsonType::TEXT),
    ChoiceSwitch<&ServiceDialect::useKey, USE_KEYS>("use-key", JsonType::TEXT),
    ChoiceSwitch<&ServiceDialect::delegation, DELEGATIONS>("delegation", JsonType::TEXT),
    {"token-type", JsonType::TEXT, [] { return std::string("a URI"); }, SetTokenType, GetTokenType},
    ChoiceSwitch<&ServiceDialect::standardTokenTypeReference, REFERENCES>("token-type-reference", JsonType::TEXT),
    {"credential-faults", JsonType::FAULTS,
     [] { return std::string("none, or {NAMESPACE}NAME once or more, separated by blanks"); }, SetFaults, GetFaults},
    ChoiceSwitch<&ServiceDialect::acceptsAnyResponse, BOOLEANS>("any-response", JsonType::BOOLEAN),
};

template <typename Names>
std::string Join(const Names &names) {
  std::string joined;
  for (const auto &name : names) {
    joined += joined.empty() ? "" : ", ";
    joined += name;
  }
  return joined;
}

} // namespace

std::span<const DialectSwitch> DialectSwitches() {
  return SWITCHES;
}

const DialectSwitch *FindDialectSwitch(std::string_view name) {
  const auto *const found =
      std::find_if(std::begin(SWITCHES), std::end(SWITCHES), [&](const auto &known) { return known.name == name; });
  return found == std::end(SWITCHES) ? nullptr : found;
}

std::string DialectSwitchNames() {
  std::vector<std::string_view> names;
  for (const DialectSwitch &known : SWITCHES) {
    names.push_back(known.name);
  }
  return Join(names);
}

std::string DialectNames() {
  return Join(GetDialectNames());
}

bool IsDialectName(const std::string &name) {
  const std::vector<std::string> names = GetDialectNames();
  return std::find(names.begin(), names.end(), name) != names.end();
}

} // namespace SsoClient::Tool
