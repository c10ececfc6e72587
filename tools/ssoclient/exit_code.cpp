// SPDX-License-Identifier: Apache-2.0
/// @file
/// The table of exit codes and the table of failures.

#include "exit_code.h"

#include <ssoclient/client/exceptions.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/proof/exceptions.h>
#ifdef SSOCLIENT_TOOL_HAS_GSSAPI
#include <ssoclient/gssapi/exceptions.h>
#endif
#include <tarvel/core/exception.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/http/url.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <new>

namespace SsoClient::Tool {
namespace {

struct Meaning {
  ExitCode code;
  std::string_view text;
};

constexpr Meaning MEANINGS[] = {
    {ExitCode::DONE, "done; for validate: the token is valid"},
    {ExitCode::UNEXPECTED, "unexpected failure"},
    {ExitCode::USAGE, "wrong command line"},
    {ExitCode::CREDENTIALS_REFUSED, "credentials missing, expired, or refused by the service"},
    {ExitCode::COMMUNICATION, "communication with the service failed"},
    {ExitCode::TOKEN_INVALID, "token or message invalid or expired; for validate: the verdict"},
    {ExitCode::SIGNATURE_INVALID, "signature or proof invalid"},
    {ExitCode::FILE_OR_KEY, "a file, key, certificate or passphrase"},
    {ExitCode::SERVICE_FAULT, "any other failure that the service reports"},
    {ExitCode::INTERRUPTED, "interrupted"},
};

template <typename Class>
bool IsA(const std::exception &failure) {
  return dynamic_cast<const Class *>(&failure) != nullptr;
}

struct Row {
  bool (*matches)(const std::exception &);
  Failure failure;
};

// The first matching row counts, so a class precedes its base.
constexpr Row TABLE[] = {
    {IsA<UsageException>, {ExitCode::USAGE, "UsageException", "usage"}},
#ifdef SSOCLIENT_TOOL_HAS_GSSAPI
    {IsA<Gssapi::GssCredentialException>, {ExitCode::CREDENTIALS_REFUSED, "GssCredentialException", "credentials"}},
    {IsA<Gssapi::GssLimitException>, {ExitCode::COMMUNICATION, "GssLimitException", "communication failed"}},
    {IsA<Gssapi::GssNegotiationException>,
     {ExitCode::COMMUNICATION, "GssNegotiationException", "communication failed"}},
#endif
    {IsA<InvalidCredentialsException>,
     {ExitCode::CREDENTIALS_REFUSED, "InvalidCredentialsException", "credentials refused"}},
    {IsA<DeadlineExceededException>, {ExitCode::COMMUNICATION, "DeadlineExceededException", "timed out"}},
    {IsA<CancelledException>, {ExitCode::COMMUNICATION, "CancelledException", "cancelled"}},
    {IsA<CommunicationException>, {ExitCode::COMMUNICATION, "CommunicationException", "communication failed"}},
    {IsA<ParseException>, {ExitCode::TOKEN_INVALID, "ParseException", "token invalid"}},
    {IsA<Tarvel::Xml::XMLParseException>, {ExitCode::TOKEN_INVALID, "XMLParseException", "token invalid"}},
    {IsA<InvalidSignatureException>, {ExitCode::SIGNATURE_INVALID, "InvalidSignatureException", "signature invalid"}},
    {IsA<Tarvel::Xml::Security::SignatureSyntaxException>,
     {ExitCode::SIGNATURE_INVALID, "SignatureSyntaxException", "signature invalid"}},
    {IsA<Tarvel::Xml::Security::XmlSecurityException>,
     {ExitCode::SIGNATURE_INVALID, "XmlSecurityException", "signature invalid"}},
    {IsA<InvalidProofException>, {ExitCode::SIGNATURE_INVALID, "InvalidProofException", "proof invalid"}},
    {IsA<StaleMessageException>, {ExitCode::TOKEN_INVALID, "StaleMessageException", "message invalid"}},
    {IsA<RepeatedMessageException>, {ExitCode::TOKEN_INVALID, "RepeatedMessageException", "message invalid"}},
    {IsA<InvalidMessageException>, {ExitCode::TOKEN_INVALID, "InvalidMessageException", "message invalid"}},
    {IsA<Tarvel::IOException>, {ExitCode::FILE_OR_KEY, "IOException", "file"}},
    {IsA<Tarvel::Crypto::WrongPassphraseException>, {ExitCode::FILE_OR_KEY, "WrongPassphraseException", "passphrase"}},
    {IsA<Tarvel::Crypto::NoKeyException>, {ExitCode::FILE_OR_KEY, "NoKeyException", "key"}},
    {IsA<Tarvel::Crypto::KeyMismatchException>, {ExitCode::FILE_OR_KEY, "KeyMismatchException", "key"}},
    {IsA<Tarvel::Crypto::CryptoException>, {ExitCode::FILE_OR_KEY, "CryptoException", "key or certificate"}},
    {IsA<SsoException>, {ExitCode::SERVICE_FAULT, "SsoException", "service fault"}},
    // All arguments of the library are from the command line, for example an address, or a name that XML cannot
    // represent.
    {IsA<Tarvel::Http::MalformedURLException>, {ExitCode::USAGE, "MalformedURLException", "usage"}},
    {IsA<Tarvel::InvalidArgumentException>, {ExitCode::USAGE, "InvalidArgumentException", "usage"}},
    {IsA<Tarvel::OutOfMemoryException>, {ExitCode::UNEXPECTED, "OutOfMemoryException", "out of memory"}},
    {IsA<Tarvel::InvalidStateException>, {ExitCode::UNEXPECTED, "InvalidStateException", "unexpected failure"}},
    {IsA<Tarvel::Exception>, {ExitCode::UNEXPECTED, "Exception", "unexpected failure"}},
    {IsA<std::bad_alloc>, {ExitCode::UNEXPECTED, "bad_alloc", "out of memory"}},
};

} // namespace

std::string ExitCodeHelp() {
  std::string help = "Exit codes:\n";
  for (const Meaning &meaning : MEANINGS) {
    const std::string number = std::to_string(static_cast<int>(meaning.code));
    help += "  " + number + std::string(5 - number.size(), ' ') + std::string(meaning.text) + "\n";
  }
  return help;
}

Failure Classify(const std::exception &failure) noexcept {
  if (const auto *const hinted = dynamic_cast<const HintedException *>(&failure)) {
    return hinted->GetFailure();
  }
  if (const auto *const relabelled = dynamic_cast<const RelabelledException *>(&failure)) {
    return relabelled->GetFailure();
  }
  for (const Row &row : TABLE) {
    if (row.matches(failure)) {
      return row.failure;
    }
  }
  return {ExitCode::UNEXPECTED, "exception", "unexpected failure"};
}

} // namespace SsoClient::Tool
