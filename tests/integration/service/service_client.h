// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ServiceClient`, which uses the development service through the library, and the expected facts of its tokens.

#pragma once

#include "support/dev_sts.h"
#include "support/service_stand_ins.h"

#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <memory>
#include <string>
#include <vector>

namespace Testing {

constexpr const char *ALICE = "alice@corp.example";
constexpr const char *PASSWORD = "wonderland";

/// The service of this program, started at the first call.
DevSts &RunningService();

/// The certificates that tokens of the running service must be signed with.
Tarvel::Crypto::CertificateList TrustedSigners();

/// A holder-of-key identity of the running service's state folder: "client" or "other-client".
SsoClient::HolderOfKeyConfig IdentityOf(const std::string &name);

/// A context that trusts the running service's authority.
Tarvel::Ref<Tarvel::Ssl::SSLContext> TrustingContext();

/// The configuration for the running service. `context` must exist until a service or context is created from it.
/// @param identity a name as in `IdentityOf`; empty for none
SsoClient::SecurityTokenServiceConfig ConfigFor(Tarvel::Ssl::SSLContext &context, const std::string &identity,
                                                const std::string &url);

/// The library's service object, with the TLS context that it needs.
class ServiceClient {
public:
  /// Without an identity, the service issues only bearer tokens.
  explicit ServiceClient(const std::string &identity = "") : ServiceClient(identity, RunningService().GetUrl()) {}
  ServiceClient(const std::string &identity, const std::string &url);

  const SsoClient::SecurityTokenService *operator->() const { return m_service.get(); }
  const SsoClient::SecurityTokenService &operator*() const { return *m_service; }

private:
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  const std::shared_ptr<const SsoClient::SecurityTokenService> m_service;
};

/// Everything that a spec can request, except a delegate.
SsoClient::TokenSpec SpecWithEverything();

/// The fields of a token that `DescribeFields` shows; the defaults are those of alice's plain bearer token.
struct ExpectedFields {
  std::string subject = ALICE;
  std::int64_t lifetimeSec = 3600;
  std::string confirmation = "bearer"; ///< or the name of the identity to whose key the token is bound
  bool renewable = false;
  bool delegable = false;
  bool solution = false;
  std::string fullName = "Alice Liddell";
  std::vector<std::string> groups = {"admins@corp.example", "users@corp.example"};
  std::vector<std::string> delegation = {}; ///< the delegates, without the instants
  std::vector<std::string> audience = {};
  std::string advice = {}; ///< in the form "source{name=value,value;name=value}"
};

/// The fields of a token for the client certificate, which has no person's name and no groups.
ExpectedFields FieldsOfCertificate(const std::string &identity);

/// All of `expected`, one field on each line.
std::string Describe(const ExpectedFields &expected);

/// The same for a token: all its facts except its identifier, its start and its XML.
std::string DescribeFields(const SsoClient::SamlToken &token);

/// The differences between a token and `expected`; empty when there are none. Compares `DescribeFields`, and also
/// checks that the token has an identifier, that its start and its last delegation are not before `earliest`
/// (microseconds since 1970) and not in the future, and that its XML is complete by itself.
std::string Compare(const std::shared_ptr<const SsoClient::SamlToken> &token, const ExpectedFields &expected,
                    std::int64_t earliest);

/// The time in microseconds since 1970, rounded down to milliseconds as in tokens.
std::int64_t NowInMilliseconds();

} // namespace Testing
