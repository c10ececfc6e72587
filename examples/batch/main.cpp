// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires many tokens, some of them at once, with one deadline for all, and prints a summary.
///
/// Usage: batch https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example 1000 100 30 <password.txt

#include <ssoclient/client/token_client.h>

#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <exception>
#include <iostream>
#include <map>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

#include <unistd.h>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

/// Reads a line of standard input, octet by octet. `std::getline` would leave copies of the password in memory: in the
/// buffer of the stream, and in the memory that the string used before it grew.
Tarvel::SecretText ReadPassword() {
  Tarvel::SecretText password;
  char octet = 0;
  while (read(STDIN_FILENO, &octet, 1) == 1 && octet != '\n') {
    password.Append(std::string_view(&octet, 1));
  }
  if (password.Get().empty()) {
    throw std::runtime_error("there is no password on standard input");
  }
  return password;
}

int ParseCount(const char *text) {
  const int count = std::atoi(text);
  return count > 0 ? count : throw std::invalid_argument(std::string(text) + " is not a positive number");
}

struct Job {
  SsoClient::Credential credential;
  SsoClient::TokenSpec spec;
  SsoClient::CallOptions options;
};

struct Summary {
  int acquired = 0;
  int mostUnderWay = 0;
  std::map<std::string, int> failures; // how often, by text
};

/// Starts one job again and again. Each outcome starts the next operation, so that the same number is always under way.
/// Callbacks keep the batch alive, and run on several threads.
class Batch : public std::enable_shared_from_this<Batch> {
public:
  Batch(const SsoClient::SecurityTokenServiceConfig &config, Job job, int count)
      : m_client(config), m_job(std::move(job)), m_left(count), m_open(count) {}

  /// Starts up to `atOnce` operations, and returns when all operations of the batch have ended.
  Summary Run(int atOnce) {
    for (int i = 0; i < atOnce; ++i) {
      StartNext();
    }
    std::unique_lock<std::mutex> lock(m_mutex);
    m_done.wait(lock, [this] { return m_open == 0; });
    return m_summary;
  }

private:
  /// Starts one operation if one is left. If it cannot be started, tries the next one.
  void StartNext() {
    while (Take()) {
      try {
        m_client.AcquireAsync(m_job.credential, m_job.spec, m_job.options,
                              [batch = shared_from_this()](const SsoClient::TokenOutcome &outcome) {
                                batch->Note(outcome.GetException());
                                batch->StartNext();
                              });
        return;
      } catch (const std::exception &) {
        Note(std::current_exception()); // no memory or no thread: the callback is not called
      }
    }
  }

  bool Take() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    if (m_left == 0) {
      return false;
    }
    --m_left;
    m_summary.mostUnderWay = std::max(m_summary.mostUnderWay, ++m_underWay);
    return true;
  }

  void Note(const std::exception_ptr &failure) {
    std::string text;
    try {
      if (failure) {
        std::rethrow_exception(failure); // in its own class
      }
    } catch (const std::exception &error) {
      text = error.what();
    }
    const std::lock_guard<std::mutex> lock(m_mutex);
    if (failure) {
      ++m_summary.failures[text];
    } else {
      ++m_summary.acquired;
    }
    --m_underWay;
    if (--m_open == 0) {
      m_done.notify_one();
    }
  }

  const SsoClient::TokenClient m_client;
  const Job m_job;
  std::mutex m_mutex;
  std::condition_variable m_done;
  int m_left;         // not started yet
  int m_open;         // not ended yet
  int m_underWay = 0; // started and not ended
  Summary m_summary;
};

int Print(const Summary &summary) {
  int failed = 0;
  for (const auto &[text, times] : summary.failures) {
    failed += times;
  }
  std::cout << summary.acquired << " acquired, " << failed << " failed, at most " << summary.mostUnderWay
            << " under way\n";
  for (const auto &[text, times] : summary.failures) {
    std::cout << "  " << times << " times: " << text << '\n';
  }
  return std::cout.flush() && failed == 0 ? DONE : FAILED;
}

} // namespace

int main(int argc, char **argv) {
  if (argc < 5 || argc > 8) {
    std::cerr << "usage: batch URL AUTHORITY-FILE SIGNER-FILE USER [COUNT [AT-ONCE [SECONDS]]] <PASSWORD-FILE\n";
    return USAGE;
  }
  try {
    const int count = argc > 5 ? ParseCount(argv[5]) : 1000;
    const int atOnce = argc > 6 ? ParseCount(argv[6]) : 100;
    const int seconds = argc > 7 ? ParseCount(argv[7]) : 60;

    const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = argv[1];
    config.signingCertificates = Tarvel::Crypto::LoadCertificates(argv[3]);
    config.sslContext = tls.get(); // the client takes its own reference

    Job job;
    job.credential = SsoClient::PasswordCredential{argv[4], ReadPassword()};
    job.spec.tokenLifetimeSec = 60 * 60;
    job.options = SsoClient::CallOptions::WithTimeout(std::chrono::seconds(seconds)); // one time for all operations
    return Print(std::make_shared<Batch>(config, std::move(job), count)->Run(atOnce));
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // a file, an argument, the address or standard input is wrong
    return FAILED;
  }
}
