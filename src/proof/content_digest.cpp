// SPDX-License-Identifier: Apache-2.0

#include "proof/content_digest.h"

#include "proof/structured_fields.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/crypto/message_digest.h>

#include <optional>

namespace SsoClient {

namespace {

using Tarvel::Crypto::HashAlgorithm;

constexpr const char *FIELD = "Content-Digest";

std::optional<HashAlgorithm> FindAlgorithm(std::string_view key) noexcept {
  if (key == "sha-256") {
    return HashAlgorithm::SHA256;
  }
  return key == "sha-512" ? std::optional(HashAlgorithm::SHA512) : std::nullopt;
}

const std::vector<std::uint8_t> &RequireOctets(const StructuredMember &member) {
  const auto *const item = std::get_if<StructuredItem>(&member.value);
  const auto *const octets = item ? std::get_if<std::vector<std::uint8_t>>(&item->value) : nullptr;
  if (!octets) {
    throw InvalidMessageException(std::string("The digest ") + member.key + " in " + FIELD +
                                  " does not consist of octets");
  }
  return *octets;
}

} // namespace

std::string WriteContentDigest(std::string_view content) {
  return "sha-256=" + WriteStructured(Tarvel::Crypto::ComputeDigest(HashAlgorithm::SHA256, content));
}

void CheckContentDigest(std::string_view field, std::string_view content) {
  bool isChecked = false;
  for (const StructuredMember &member : ReadDictionary(FIELD, field)) {
    const std::optional<HashAlgorithm> algorithm = FindAlgorithm(member.key);
    if (!algorithm) {
      continue;
    }
    if (RequireOctets(member) != Tarvel::Crypto::ComputeDigest(*algorithm, content)) {
      throw InvalidProofException("The content of the request does not have the digest " + member.key + " of " + FIELD);
    }
    isChecked = true;
  }
  if (!isChecked) {
    throw InvalidMessageException(std::string(FIELD) + " has neither a digest sha-256 nor a digest sha-512");
  }
}

} // namespace SsoClient
