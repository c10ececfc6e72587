// SPDX-License-Identifier: Apache-2.0

#include "proof/http_signature.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <optional>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::StringUtil;
using Tarvel::Crypto::HashAlgorithm;

constexpr unsigned BITS_OF_P256 = 256;
constexpr unsigned BITS_OF_P384 = 384;

std::vector<StructuredMember> ReadField(const HttpComponents &components, const char *name, const char *title) {
  const std::optional<std::string> field = components.FindField(name);
  return field ? ReadDictionary(title, *field) : std::vector<StructuredMember>();
}

const StructuredMember *FindMember(const std::vector<StructuredMember> &members, std::string_view key) noexcept {
  const auto found =
      std::find_if(members.begin(), members.end(), [key](const StructuredMember &member) { return member.key == key; });
  return found != members.end() ? &*found : nullptr;
}

HttpSignature MakeSignature(const StructuredMember &input, const StructuredMember &value) {
  const auto *const list = std::get_if<StructuredInnerList>(&input.value);
  if (!list) {
    throw InvalidMessageException("Signature-Input has no list for the label " + StringUtil::Shorten(input.key));
  }
  const auto *const item = std::get_if<StructuredItem>(&value.value);
  const auto *const octets = item ? std::get_if<std::vector<std::uint8_t>>(&item->value) : nullptr;
  if (!octets) {
    throw InvalidMessageException("Signature has no octets for the label " + StringUtil::Shorten(value.key));
  }
  return {input.key, *list, *octets};
}

/// The text of a component in a message.
std::string Quote(std::string_view name) {
  return '"' + StringUtil::Shorten(name) + '"';
}

std::string RequireComponent(const HttpComponents &components, const std::string &name) {
  if (!name.empty() && name.front() == '@') {
    if (std::optional<std::string> value = components.FindDerived(name)) {
      return *std::move(value);
    }
    throw InvalidMessageException("The signature covers the unknown component " + Quote(name));
  }
  if (!IsHttpToken(name) || name != FieldNameInLowerCase(name)) {
    throw InvalidMessageException("The signature covers " + Quote(name) +
                                  ", which is not the name of a header field in lower case");
  }
  std::optional<std::string> value = components.FindField(name);
  if (!value) {
    throw InvalidMessageException("The signature covers the header field " + Quote(name) +
                                  ", which the request does not have");
  }
  return *std::move(value);
}

bool IsAscii(std::string_view text) noexcept {
  return std::all_of(text.begin(), text.end(), [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

} // namespace

std::vector<HttpSignature> ReadHttpSignatures(const HttpComponents &components) {
  const std::vector<StructuredMember> inputs = ReadField(components, SIGNATURE_INPUT_FIELD, "Signature-Input");
  const std::vector<StructuredMember> values = ReadField(components, SIGNATURE_FIELD, "Signature");
  for (const StructuredMember &value : values) {
    if (!FindMember(inputs, value.key)) {
      throw InvalidMessageException("Signature has the label " + StringUtil::Shorten(value.key) +
                                    ", which Signature-Input does not have");
    }
  }
  std::vector<HttpSignature> signatures;
  for (const StructuredMember &input : inputs) {
    const StructuredMember *const value = FindMember(values, input.key);
    if (!value) {
      throw InvalidMessageException("Signature-Input has the label " + StringUtil::Shorten(input.key) +
                                    ", which Signature does not have");
    }
    signatures.push_back(MakeSignature(input, *value));
  }
  return signatures;
}

HttpSignatureAlgorithm GetHttpSignatureAlgorithm(const Tarvel::Crypto::VerifyingKey &key) {
  if (std::string refusal = key.GetRefusal(); !refusal.empty()) {
    return {nullptr, HashAlgorithm::SHA256, std::move(refusal)};
  }
  if (key.GetAlgorithm() == "RSA") {
    return {"rsa-v1_5-sha256", HashAlgorithm::SHA256, {}};
  }
  if (key.GetBits() == BITS_OF_P256) {
    return {"ecdsa-p256-sha256", HashAlgorithm::SHA256, {}};
  }
  if (key.GetBits() == BITS_OF_P384) {
    return {"ecdsa-p384-sha384", HashAlgorithm::SHA384, {}};
  }
  return {nullptr, HashAlgorithm::SHA512, "there is no HTTP signature algorithm for keys on the curve P-521"};
}

std::vector<std::string> ReadComponentNames(const StructuredInnerList &input) {
  std::vector<std::string> names;
  for (const StructuredItem &item : input.items) {
    const auto *const name = std::get_if<std::string>(&item.value);
    if (!name) {
      throw InvalidMessageException("The signature covers a component whose name is not a string");
    }
    if (!item.parameters.empty()) {
      throw InvalidMessageException("The signature covers the component " + Quote(*name) + " with the parameter " +
                                    StringUtil::Shorten(item.parameters.front().key) + ", which is not supported");
    }
    if (std::find(names.begin(), names.end(), *name) != names.end()) {
      throw InvalidMessageException("The signature covers the component " + Quote(*name) + " twice");
    }
    names.push_back(*name);
  }
  return names;
}

std::string MakeSignatureBase(const HttpComponents &components, const std::vector<std::string> &names,
                              const StructuredInnerList &input) {
  std::string base;
  for (const std::string &name : names) {
    const std::string value = RequireComponent(components, name);
    if (!IsAscii(value)) {
      throw InvalidMessageException("The signature covers the component " + Quote(name) + ", which is not ASCII");
    }
    base.append("\"").append(name).append("\": ").append(value).append("\n");
  }
  return base.append("\"@signature-params\": ").append(WriteStructured(input));
}

} // namespace SsoClient
