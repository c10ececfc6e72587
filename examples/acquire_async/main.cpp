// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires tokens for several users at once, and reports how each operation ended.
///
/// Usage: acquire_async https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example bob@corp.example
///     <passwords.txt

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <condition_variable>
#include <cstddef>
#include <exception>
#include <iostream>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <unistd.h>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

struct Outcome {
  std::string user;
  std::shared_ptr<const SsoClient::SamlToken> token; // null when the operation failed
  std::shared_ptr<const Tarvel::Exception> failure;  // null when it succeeded
};

/// Reads a line of standard input, octet by octet. `std::getline` would leave copies of the password in memory: in the
/// buffer of the stream, and wherever the string was before it grew.
Tarvel::SecretText ReadPassword() {
  Tarvel::SecretText password;
  char octet = 0;
  while (read(STDIN_FILENO, &octet, 1) == 1 && octet != '\n') {
    password.Append(std::string_view(&octet, 1));
  }
  if (password.Get().empty()) {
    throw std::runtime_error("there are fewer passwords on standard input than users");
  }
  return password;
}

/// Collects the outcomes, which arrive on threads of the library's pool, several at once and in any order.
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

/// Starts one operation and returns at once. The library keeps what the operation needs until it has ended: the
/// service's state, copies of the texts (the password is wiped afterwards), and the completion.
void Start(const SsoClient::SecurityTokenService &service, const std::string &user, const std::string &password,
           const std::shared_ptr<Outcomes> &outcomes) {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60;
  // Called once, with a token or an exception. The exception is valid only during this call. A clone stays valid, and
  // has the same class.
  const auto end = [user, outcomes](const std::shared_ptr<const SsoClient::SamlToken> &token,
                                    const Tarvel::Exception *failure) {
    std::shared_ptr<const Tarvel::Exception> kept(failure ? failure->Clone() : nullptr);
    outcomes->Add({user, token, std::move(kept)});
  };
  service.AcquireTokenAsync(user, password, spec, end);
}

/// Returns whether the operation succeeded.
bool Print(const Outcome &outcome) {
  try {
    if (outcome.failure) {
      outcome.failure->Throw(); // in its own class
    }
    std::cout << outcome.user << ": " << outcome.token->GetId() << ", valid until "
              << outcome.token->GetEndDate().ToString() << '\n';
    return true;
  } catch (const SsoClient::InvalidCredentialsException &error) {
    std::cerr << outcome.user << ": refused: " << error.what() << '\n'; // ask for the password again
  } catch (const SsoClient::CommunicationException &error) {
    std::cerr << outcome.user << ": unreachable: " << error.what() << '\n'; // try again later
  } catch (const Tarvel::Exception &error) {
    std::cerr << outcome.user << ": failed: " << error.what() << '\n'; // another fault, or a token that is not valid
  }
  return false;
}

int Run(const SsoClient::SecurityTokenServiceConfig &config, const std::vector<std::string> &users) {
  const auto outcomes = std::make_shared<Outcomes>();
  {
    const auto service = SsoClient::CreateSecurityTokenService(config);
    for (const std::string &user : users) {
      const Tarvel::SecretText password = ReadPassword(); // one line of standard input for each user
      Start(*service, user, password.Get(), outcomes);
    }
  } // The service may be released while its operations run: each of them keeps what it needs.

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
    const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);

    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = argv[1];
    config.signingCertificates = Tarvel::Crypto::LoadCertificates(argv[3]);
    config.sslContext = tls.get(); // the service and each operation take their own references
    return Run(config, {argv + 4, argv + argc});
  } catch (const std::exception &error) {
    // A file, the address or standard input is wrong. The failure of an operation is passed to its completion instead.
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
