// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires tokens for several users at once, and tells how each operation ended.
///
/// As: acquire_async https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example bob@corp.example
///     <passwords.txt

#include <ssoclient/security_token_service.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/secure_wipe.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <condition_variable>
#include <cstddef>
#include <exception>
#include <iostream>
#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

struct Outcome {
  std::string user;
  std::shared_ptr<const SsoClient::SamlToken> token; // null when the operation failed
  std::shared_ptr<const Tarvel::Exception> failure;  // null when it did not
};

/// A password that leaves nothing behind in memory, however the block ends that it stands in.
struct Password {
  std::string text;
  ~Password() { Tarvel::SecureWipe(text); }
};

/// Collects the outcomes, which come on threads of the library's pool, several at once and in any order.
class Outcomes {
public:
  void Add(Outcome outcome) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_outcomes.push_back(std::move(outcome));
    m_added.notify_one();
  }

  std::vector<Outcome> WaitFor(std::size_t count) {
    std::unique_lock<std::mutex> lock(m_mutex);
    m_added.wait(lock, [this, count] { return m_outcomes.size() == count; });
    return m_outcomes;
  }

private:
  std::mutex m_mutex;
  std::condition_variable m_added;
  std::vector<Outcome> m_outcomes;
};

/// Starts one operation and returns at once. The library keeps copies of the service, the texts and the completion
/// until the operation has ended.
void Start(const SsoClient::SecurityTokenService &service, const std::string &user, const std::string &password,
           const std::shared_ptr<Outcomes> &outcomes) {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60;
  // Called exactly once, with one of the two. The exception is good during this call only; a clone lasts, and keeps
  // the exception's class.
  const auto end = [user, outcomes](const std::shared_ptr<const SsoClient::SamlToken> &token,
                                    const Tarvel::Exception *failure) {
    std::shared_ptr<const Tarvel::Exception> kept(failure ? failure->Clone() : nullptr);
    outcomes->Add({user, token, std::move(kept)});
  };
  service.AcquireTokenAsync(user, password, spec, end);
}

/// Whether the operation went well.
bool Print(const Outcome &outcome) {
  if (outcome.failure) {
    // Where its class matters: outcome.failure->Throw() throws it as what it is.
    std::cerr << outcome.user << ": " << outcome.failure->what() << '\n';
    return false;
  }
  std::cout << outcome.user << ": " << outcome.token->GetId() << ", valid until "
            << outcome.token->GetEndDate().ToString() << '\n';
  return true;
}

int Run(const SsoClient::SecurityTokenServiceConfig &config, const std::vector<std::string> &users) {
  const auto outcomes = std::make_shared<Outcomes>();
  {
    const auto service = SsoClient::CreateSecurityTokenService(config);
    for (const std::string &user : users) {
      Password password; // one line of standard input for each user
      std::getline(std::cin, password.text);
      Start(*service, user, password.text, outcomes);
    }
  } // Our service is gone now; what was started goes on.

  int exitCode = DONE;
  for (const Outcome &outcome : outcomes->WaitFor(users.size())) {
    exitCode = Print(outcome) ? exitCode : FAILED;
  }
  return exitCode;
}

} // namespace

int main(int argc, char **argv) {
  if (argc < 5) {
    std::cerr << "usage: acquire_async URL AUTHORITY-FILE SIGNER-FILE USER... <PASSWORDS-FILE\n";
    return USAGE;
  }
  try {
    // The one thing that the library does not copy: it must live until the last operation has ended.
    static const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);

    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = argv[1];
    config.signingCertificates = Tarvel::Crypto::LoadCertificates(argv[3]);
    config.sslContext = tls.get();
    return Run(config, {argv + 4, argv + argc});
  } catch (const std::exception &error) { // of the files and the address; an operation's failure goes to its completion
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
