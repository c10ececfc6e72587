// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenReport`, what each check of a token examined, expected and found.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/delegate.h>
#include <ssoclient/export.h>
#include <ssoclient/principal_id.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_details.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// What an assertion says about itself. **None of this is verified, even if the report says that the token is
/// accepted**: use `TokenVerifier::Verify` to get a token. An optional is empty if the text does not contain the value,
/// or contains it in a form that cannot be read. Texts are as the sender wrote them, so they may contain control
/// characters.
struct UnverifiedClaims {
  /// Whether the text contains an assertion, also of another version than SAML 2.0; if not, nothing else is set.
  bool isAssertion = false;
  boost::optional<std::string> id;                           ///< the `ID`
  boost::optional<std::string> issuer;                       ///< the text of the `Issuer`
  boost::optional<Tarvel::System::DateTime> issueInstant;    ///< when it was issued, as the issuer states
  boost::optional<std::string> nameId;                       ///< the subject's identifier as written
  boost::optional<std::string> nameIdFormat;                 ///< the `Format` of the subject's identifier
  boost::optional<PrincipalId> subject;                      ///< set for a user principal name; with SAML2, for any
  boost::optional<SamlToken::ConfirmationType> confirmation; ///< set if known; with SAML2, if it can be used
  boost::optional<std::string> confirmationMethod;           ///< as written; set for methods that are not known, too
  boost::optional<Tarvel::System::DateTime> startDate;       ///< valid from this instant
  boost::optional<Tarvel::System::DateTime> endDate;         ///< no longer valid at this instant
  boost::optional<bool> renewable; ///< whether the service may renew it; false also if that cannot be read
  boost::optional<bool> delegable; ///< whether it may be delegated; false also if that cannot be read
  boost::optional<bool> solution;  ///< whether its subject is a solution; false also if that cannot be read
  boost::optional<std::pair<std::string, std::string>> fullName; ///< first name and last name; empty texts if missing
  std::vector<PrincipalId> groups;                               ///< those that can be read
  std::vector<Delegate> delegationChain;                         ///< those that can be read
  std::set<std::string> audience;                                ///< empty also if there is no restriction
  std::vector<Advice> advice;                                    ///< those that can be read
  /// The subject and the SHA-256 thumbprint of the certificate in a holder-of-key token, as texts; empty for other
  /// tokens.
  std::string certificateSubject;
  std::string certificateThumbprint;
  /// What else the assertion states. Set if the profile SAML2 reads the assertion, even if the report is for the
  /// profile STRICT. If no confirmation can be used, `usedConfirmation` is the number of confirmations. If
  /// `GetAttributes` would throw, `attributes` is empty. If a value has elements with a signature, its text is empty,
  /// because a report never repeats a signature.
  boost::optional<TokenDetails> details;
};

/// Why a token is accepted or refused: each check of the verification with its outcome. Every check is reported, even
/// if an earlier one failed.
///
/// All texts except `refusal` and `claims` are printable: characters that could control a terminal are written as \\uXXXX
/// (`Tarvel::StringUtil::Printable`), and a text is cut at `Tarvel::StringUtil::MAX_VALUE_BYTES`. A report contains names of
/// persons and groups, but no secret and no token. It refers to nothing outside itself, except to the trusted certificates.
struct TokenReport {
  /// The checks, in the order of the verification.
  enum class Check : std::int32_t {
    WELL_FORMED = 0, ///< the text is a well-formed XML document within the limits
    FORM,            ///< elements, attributes and values are those of the profile, and the signature covers the token
    IDENTIFIERS,     ///< version and identifier
    VALIDITY,        ///< this machine's clock is within the time of validity
    CONFIRMATION,    ///< the confirmation lasts as long as the token; with the profile SAML2: at least one confirmation
                     ///< can be used with these `VerifyOptions`, and no session has ended
    DELEGATION,      ///< the delegate of the confirmation is the last delegate of the restriction
    ALGORITHMS,      ///< the signature uses only accepted algorithms, transforms and parts
    KEYS,            ///< a trusted key can be used with the signature's algorithm
    REFERENCES,      ///< each reference resolves to one node, which contains the signature if it is enveloped
    SIGNATURE,       ///< a trusted key made the signature
    DIGESTS,         ///< the digest of each reference is the one that was signed
    NAMES,           ///< subject, groups, delegates and attributes can be read
    AUDIENCE,        ///< the token is for an accepted audience; passed if `VerifyOptions` accept every audience
    REQUIRED_CONFIRMATION ///< the token has the confirmation that `VerifyOptions` require, if they require one
  };

  /// The outcome of a check.
  enum class Outcome : std::int32_t {
    PASSED = 0,
    FAILED,  ///< there is at least one finding
    NOT_DONE ///< an earlier check failed, so something that this check needs is missing: see `summary`
  };

  /// One reason to refuse a token.
  struct Finding {
    std::string message;   ///< the text of the exception that `Verify` would throw for this reason
    std::string element;   ///< the name of the element as written; empty if the finding has no place
    std::string attribute; ///< the name of the attribute; empty if the finding is about the element
    /// From the topmost element to the element, such as "/saml2:Assertion/saml2:Subject". "[n]" after a name means the
    /// n-th element of that name under its parent, and "[?]" that too many nodes are before the element to count them.
    std::string path;
    std::uint32_t line = 0;   ///< of the element's start tag, or of the error in the text; from 1; 0: unknown
    std::uint32_t column = 0; ///< from 1, in bytes; 0: unknown
    std::string wanted;       ///< what is allowed or expected at this place; may be empty
    std::string found;        ///< what is at this place; may be empty
    /// By how many seconds, rounded up, this machine's clock is outside the validity period with its tolerance; 0 for
    /// findings that are not about the clock.
    std::int64_t missedBySec = 0;
    std::string remedy; ///< what the reader can do about it; may be empty
  };

  /// One check.
  struct CheckResult {
    Check check = Check::WELL_FORMED;    ///< which check
    Outcome outcome = Outcome::NOT_DONE; ///< its outcome
    std::string summary;                 ///< what was checked and found, in one sentence
    std::vector<Finding> findings;       ///< in the order in which the verification finds them; empty unless FAILED
    std::size_t unlistedFindings = 0;    ///< further findings that are left out because of `MAX_FINDINGS`
  };

  /// One reference of the signature.
  struct Reference {
    std::string uri;                     ///< the `URI`
    bool resolves = false;               ///< to exactly one element, or to the document
    bool coversToken = false;            ///< its target is the assertion or the document that contains it
    std::string target;                  ///< the name of the target element; "document" for the whole document
    std::vector<std::string> transforms; ///< their algorithms, in order
    std::string digestMethod;            ///< its algorithm
    std::string digestWanted;            ///< the digest that the signature contains, in Base64
    std::string digestComputed;          ///< of the target, in Base64; empty if it cannot be computed
    bool digestMatches = false;          ///< whether the two digests are the same
  };

  /// One trusted key.
  struct TrustedKey {
    Tarvel::Ref<const Tarvel::Crypto::Certificate> certificate; ///< never null; one of those that the verifier trusts
    std::string subject;                                        ///< of the certificate; empty if it cannot be read
    std::string thumbprint;                                     ///< from `Certificate::GetSha256Thumbprint`
    bool isNamed = false;                                       ///< the signature's `KeyInfo` contains this certificate
    bool isUsable = false;                                      ///< it can be used with the signature's algorithm
    bool madeSignature = false;                                 ///< it made the signature
  };

  /// A certificate in the signature's `KeyInfo`. It is only shown, and never used to verify the signature.
  struct NamedCertificate {
    std::string subject;    ///< empty if it cannot be read
    std::string thumbprint; ///< SHA-256; empty if it cannot be read
    bool isTrusted = false; ///< whether it is one of the trusted certificates
  };

  /// The maximum number of findings in a report. Further ones are only counted, and so are those that follow 32 MiB of
  /// messages, but each check that failed lists at least one.
  static constexpr std::size_t MAX_FINDINGS = 1000;

  bool accepted = false; ///< whether `Verify` would return a token; true exactly when every check passed
  /// The exact text of the exception that `Verify` throws. It may contain control characters. Empty if accepted.
  std::string refusal;
  std::vector<CheckResult> checks;                 ///< all checks, in order
  std::string signatureAlgorithm;                  ///< its URI; empty if there is no signature that can be read
  std::string canonicalization;                    ///< the URI of the algorithm of `SignedInfo`; empty in that case
  std::vector<Reference> references;               ///< at most ten
  std::vector<TrustedKey> trustedKeys;             ///< in the order in which they are trusted
  std::vector<NamedCertificate> namedCertificates; ///< at most 16
  Tarvel::System::DateTime checkedAt;              ///< this machine's clock when the times were checked
  UnverifiedClaims claims;

  /// The result of `check`, which every report of `TokenVerifier::Explain` has.
  /// @throws Tarvel::InvalidArgumentException when a report that was made in another way has no such check.
  SSOCLIENT_API const CheckResult &Get(Check check) const &;

  /// Not for a temporary report, whose checks end with it.
  const CheckResult &Get(Check check) const && = delete;

  /// The first check that failed, or null.
  SSOCLIENT_API const CheckResult *FirstFailed() const &noexcept;

  /// Not for a temporary report, whose checks end with it.
  const CheckResult *FirstFailed() const &&noexcept = delete;
};

/// The name of a check in lower case with hyphens, such as "well-formed".
SSOCLIENT_API const char *GetCheckName(TokenReport::Check check) noexcept;

/// The name of an outcome: "passed", "failed" or "not done".
SSOCLIENT_API const char *GetOutcomeName(TokenReport::Outcome outcome) noexcept;

/// `report` as text for a log or a person: a line with the verdict, a line for each check, and below it a few lines for
/// each finding. The text does not contain `claims`, because they are not verified. It is printable except for its line
/// ends, and ends with one.
SSOCLIENT_API std::string WriteTokenReport(const TokenReport &report);

} // namespace SsoClient
