// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ServiceClient`, the library's service on the development service, and what tokens from there say.

#pragma once

#include "support/dev_sts.h"

#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <memory>
#include <string>
#include <vector>

namespace Testing {

constexpr const char *ALICE = "alice@corp.example";
constexpr const char *PASSWORD = "wonderland";

/// The service of this program, started when first asked for.
DevSts &RunningService();

/// The certificates that tokens of the running service must be signed with.
Tarvel::Crypto::CertificateList TrustedSigners();

/// A holder-of-key identity of the running service's state folder: "client" or "other-client".
SsoClient::HolderOfKeyConfig IdentityOf(const std::string &name);

/// A context that trusts the running service's authority.
Tarvel::Ref<Tarvel::Ssl::SSLContext> TrustingContext();

/// What describes the running service. `context` must outlive whatever is made of it.
/// @param identity as for `IdentityOf`; empty for none
SsoClient::SecurityTokenServiceConfig ConfigFor(Tarvel::Ssl::SSLContext &context, const std::string &identity,
                                                const std::string &url);

/// The library's service, with the TLS context that it needs.
class ServiceClient {
public:
  /// Bearer tokens only, without an identity.
  explicit ServiceClient(const std::string &identity = "") : ServiceClient(identity, RunningService().GetUrl()) {}
  ServiceClient(const std::string &identity, const std::string &url);

  const SsoClient::SecurityTokenService *operator->() const { return m_service.get(); }
  const SsoClient::SecurityTokenService &operator*() const { return *m_service; }

private:
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  const std::shared_ptr<const SsoClient::SecurityTokenService> m_service;
};

/// A spec for that many seconds.
SsoClient::TokenSpec SpecFor(std::int64_t lifetimeSec);

/// Everything that a spec can ask for, but a delegate.
SsoClient::TokenSpec FullSpec();

/// What `DescribeFields` says of a token; the defaults are those of alice's plain bearer token.
struct ExpectedFields {
  std::string subject = ALICE;
  std::int64_t lifetimeSec = 3600;
  std::string confirmation = "bearer"; ///< or the name of the identity whose certificate it is
  bool renewable = false;
  bool delegable = false;
  bool solution = false;
  std::string fullName = "Alice Liddell";
  std::vector<std::string> groups = {"admins@corp.example", "users@corp.example"};
  std::vector<std::string> delegation = {}; ///< the delegates, without the instants
  std::vector<std::string> audience = {};
  std::string advice = {}; ///< as "source{name=value,value;name=value}"
};

/// What a token for the client certificate says that has nobody's name or groups in it.
ExpectedFields FieldsOfCertificate(const std::string &identity);

/// All of `expected`, one line each.
std::string Describe(const ExpectedFields &expected);

/// The same of a token: all it says, but for its identifier, its start and its XML.
std::string DescribeFields(const SsoClient::SamlToken &token);

/// How `DescribeFields` and a few properties of the rest fail to be as expected; empty when all is well. The rest is: the
/// identifier is there; the token begins, and its last delegation happened, since `earliest` (microseconds since 1970)
/// and not in the future; its XML stands on its own.
std::string Compare(const std::shared_ptr<const SsoClient::SamlToken> &token, const ExpectedFields &expected,
                    std::int64_t earliest);

/// The time in milliseconds' steps, as tokens tell it, in microseconds since 1970.
std::int64_t NowInMilliseconds();

} // namespace Testing
