// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Outcome`, the result for a token: its facts, or the documented exception that refused it.

#pragma once

#include <ssoclient/verify_options.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <memory>
#include <ostream>
#include <string>

namespace Attacks {

struct Outcome {
  std::string exceptionClass; ///< unqualified; "undocumented" for any class that the factories do not document; empty
                              ///< when the token was accepted
  std::string text;           ///< the exception's message, or every fact of the accepted token

  bool IsAccepted() const { return exceptionClass.empty(); }
  friend bool operator==(const Outcome &, const Outcome &) = default;
};

std::ostream &operator<<(std::ostream &out, const Outcome &outcome);

/// The service's certificates: one for each kind and size of key that signs the fixtures. "other" is not among them.
const Tarvel::Crypto::CertificateList &Trusted();

/// The outcome for `xml` with the certificates of `Trusted` and, except for the profile, the default options.
Outcome TryToken(const std::string &xml, SsoClient::TokenProfile profile = SsoClient::TokenProfile::STRICT);

/// The outcome for the assertion number `index` (from 0, in document order) of the document `xml`.
/// @throws std::out_of_range when there are fewer assertions.
Outcome TryElement(const std::string &xml, std::size_t index,
                   SsoClient::TokenProfile profile = SsoClient::TokenProfile::STRICT);

/// A token fixture by its name without folder and extension.
std::string ReadToken(const std::string &name);

/// `text` with the first `from` replaced by `to`. @throws std::logic_error when `text` does not contain `from`:
/// the test is wrong then.
std::string Replaced(std::string text, const std::string &from, const std::string &to);

} // namespace Attacks
