// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecretMask`, which replaces the secrets of an operation in the texts that observers receive.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/core/secret_text.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

/// Copies of the secrets of one operation, in the forms in which a service may repeat them. The copies are wiped when
/// the mask is destroyed. Only one thread at a time may use a mask.
class SecretMask {
public:
  /// Masks the password as it is, without the blanks around it, escaped for XML once or twice, and in Base64. An empty
  /// password is ignored.
  void AddPassword(const std::string &password) noexcept;

  /// Masks a leg of a negotiation in Base64.
  void AddLeg(const std::vector<std::uint8_t> &leg) noexcept;

  /// Masks the text of a token, and the values of its signature.
  void AddToken(const SamlToken &token) noexcept;
  void AddToken(const std::string &tokenXml) noexcept;

  /// Masks the values of signatures and negotiations in a request.
  void AddRequest(const std::string &envelope) noexcept;

  /// Masks the prefix of `qualifiedName` also without its colon, because exceptions quote it in that form. Does nothing
  /// if `masked`, which is `qualifiedName` after `Apply`, still shows the prefix with its colon.
  void AddPrefixOf(std::string_view qualifiedName, std::string_view masked) noexcept;

  /// `text` with "***" in place of secrets, printable (`Tarvel::StringUtil::Printable`), and cut at
  /// `Tarvel::StringUtil::MAX_VALUE_BYTES` bytes. A text that is cut ends with the number of bytes that are missing. A
  /// secret that the cut divides is masked, too, and so are eight or more bytes of its beginning at the end of `text`.
  /// The markup of a token, a signature or a password is masked, whether or not it was added. The time is at most linear
  /// in the length of the text: if a hostile text needs more, the rest of it is masked. If there was no memory to add a
  /// secret, or if there are more than 100, every text becomes "***".
  std::string Apply(std::string_view text) const;

private:
  template <typename AddAll>
  void Guard(const AddAll &addAll) noexcept;
  void AddText(std::string_view text);
  void AddSecret(Tarvel::SecretText &&secret);
  void AddValues(std::string_view xml);
  std::size_t FindSecretEnd(std::string_view text, std::size_t begin, std::size_t &comparisons) const noexcept;
  std::size_t FindMaskedEnd(std::string_view text, std::size_t begin, std::size_t &comparisons) const noexcept;

  std::vector<Tarvel::SecretText> m_secrets; // none is empty
  bool m_isIncomplete = false;
};

} // namespace SsoClient
