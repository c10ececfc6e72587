// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token leg by leg, for programs that cannot use the ready handler, for example because another process
/// makes the legs. Such a program runs the GSS loop itself. Here the GSSAPI makes the legs, by SPNEGO.
///
/// Usage: kinit alice && negotiate https://sts.corp.example/STS/trust authority.pem sts.pem HTTP@sts.corp.example
/// >token.xml

#include <ssoclient/exceptions.h>
#include <ssoclient/gss_negotiation_context.h>

#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <gssapi/gssapi.h>

#include <cstdint>
#include <exception>
#include <iostream>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2, REFUSED = 3, UNREACHABLE = 4 };

constexpr int MAX_LEGS = 10; // nothing else ends a negotiation with a service that never completes it

using Leg = std::vector<std::uint8_t>;

/// The GSSAPI's text for a status code. `kind` says whether the code is major or minor.
std::string Describe(OM_uint32 code, int kind) {
  std::string all;
  OM_uint32 rest = 0;
  do {
    OM_uint32 minor = 0;
    gss_buffer_desc text = GSS_C_EMPTY_BUFFER;
    if (GSS_ERROR(gss_display_status(&minor, code, kind, GSS_C_NO_OID, &rest, &text))) {
      break;
    }
    all += " " + std::string(static_cast<const char *>(text.value), text.length);
    gss_release_buffer(&minor, &text);
  } while (rest != 0);
  return all;
}

void RequireSuccess(OM_uint32 major, OM_uint32 minor) {
  if (GSS_ERROR(major)) {
    throw std::runtime_error("GSSAPI:" + Describe(major, GSS_C_GSS_CODE) + Describe(minor, GSS_C_MECH_CODE));
  }
}

/// The client's side of one SPNEGO negotiation, with the ticket of the default credential cache.
class Client {
public:
  explicit Client(std::string service) {
    OM_uint32 minor = 0;
    gss_buffer_desc text = {service.size(), service.data()};
    RequireSuccess(gss_import_name(&minor, &text, GSS_C_NT_HOSTBASED_SERVICE, &m_service), minor);
  }
  Client(const Client &) = delete;
  Client &operator=(const Client &) = delete;
  ~Client() {
    OM_uint32 minor = 0;
    gss_delete_sec_context(&minor, &m_context, GSS_C_NO_BUFFER);
    gss_release_name(&minor, &m_service);
  }

  /// Processes the service's leg (empty at first), and returns the client's next one, empty when there is nothing to
  /// send.
  Leg Step(Leg serviceLeg) {
    static char octets[] = "\x2b\x06\x01\x05\x05\x02"; // 1.3.6.1.5.5.2, SPNEGO (RFC 4178)
    static gss_OID_desc spnego = {sizeof octets - 1, octets};
    OM_uint32 minor = 0;
    OM_uint32 flags = 0;
    gss_buffer_desc input = {serviceLeg.size(), serviceLeg.data()};
    gss_buffer_desc output = GSS_C_EMPTY_BUFFER;
    const OM_uint32 major = gss_init_sec_context(&minor, GSS_C_NO_CREDENTIAL, &m_context, m_service, &spnego,
                                                 GSS_C_MUTUAL_FLAG | GSS_C_INTEG_FLAG, GSS_C_INDEFINITE,
                                                 GSS_C_NO_CHANNEL_BINDINGS, &input, nullptr, &output, &flags, nullptr);
    const auto *begin = static_cast<const std::uint8_t *>(output.value);
    Leg leg(begin, begin + output.length);
    OM_uint32 ignored = 0;
    gss_release_buffer(&ignored, &output);
    RequireSuccess(major, minor);
    m_isComplete = major == GSS_S_COMPLETE && (flags & GSS_C_MUTUAL_FLAG) != 0;
    return leg;
  }

  /// Whether the negotiation is complete, and the service has proved its identity.
  bool IsComplete() const { return m_isComplete; }

private:
  gss_name_t m_service = GSS_C_NO_NAME;
  gss_ctx_id_t m_context = GSS_C_NO_CONTEXT;
  bool m_isComplete = false;
};

/// Sends leg after leg until the service issues the token.
std::shared_ptr<const SsoClient::SamlToken> Negotiate(SsoClient::InternalApi::GssNegotiationContext &context,
                                                      Client &client) {
  Leg serviceLeg;
  for (int count = 0; count < MAX_LEGS; ++count) {
    const SsoClient::InternalApi::GssNegotiationResult result = context.NegotiateToken(client.Step(serviceLeg));
    serviceLeg = *result.serverLeg;
    if (!result.token) {
      continue;
    }
    // The last leg arrives with the token. Do not skip it: it contains the proof of the service's identity.
    if (!serviceLeg.empty()) {
      client.Step(serviceLeg);
    }
    if (!client.IsComplete()) {
      throw std::runtime_error("the service has not proved its identity");
    }
    return result.token;
  }
  throw std::runtime_error("the service has not issued a token after " + std::to_string(MAX_LEGS) + " legs");
}

std::shared_ptr<const SsoClient::SamlToken> Acquire(const char *url, const char *authority, const char *signers,
                                                    const char *serviceName) {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
  tls->TrustFile(authority);

  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(signers);
  config.sslContext = tls.get(); // the negotiation takes its own reference
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60;

  // A context is for one negotiation, and for one thread at a time. Its legs share one HTTP session with its cookies.
  const auto context = SsoClient::InternalApi::CreateGssNegotiationContext(config, spec);
  Client client(serviceName);
  return Negotiate(*context, client);
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 5) {
    std::cerr << "usage: negotiate URL AUTHORITY-FILE SIGNER-FILE SERVICE >TOKEN-FILE\n";
    return USAGE;
  }
  try {
    const auto token = Acquire(argv[1], argv[2], argv[3], argv[4]);
    std::cerr << "acquired " << token->GetId() << " for " << token->GetSubject().name << " of "
              << token->GetSubject().domain << '\n';
    std::cout << token->ToXml() << std::flush;
    return std::cout ? DONE : FAILED;
  } catch (const SsoClient::InvalidCredentialsException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // the service refuses the ticket, or does not know its owner
    return REFUSED;
  } catch (const SsoClient::CommunicationException &error) {
    std::cerr << "unreachable: " << error.what() << '\n'; // try again later
    return UNREACHABLE;
  } catch (const std::exception &error) {
    // The GSSAPI, another fault of the service, a token that is not valid or not trusted, a file that cannot be read.
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
