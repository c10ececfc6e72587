// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefusedToken`, which keeps a token that the service issued and the tool refused.

#pragma once

#include "exit_code.h"
#include "output.h"
#include "token_output.h"

#include <ssoclient/service_options.h>

#include <exception>
#include <string>

namespace SsoClient::Tool {

/// Saves a refused token in the file of --save-refused, and adds a hint to the failure. The object must outlive the
/// service that uses its sink. Main thread only.
class RefusedToken {
public:
  /// @param trusted the certificates with which tokens are verified
  /// @param verifyOptions the options with which tokens are verified
  RefusedToken(const TokenOutputOptions &options, const Tarvel::Crypto::CertificateList &trusted,
               const VerifyOptions &verifyOptions, const OutputOptions &output);
  RefusedToken(const RefusedToken &) = delete;
  RefusedToken &operator=(const RefusedToken &) = delete;

  /// A function that calls `Keep`.
  ServiceOptions::RefusedTokenSink GetSink();

  /// Saves the token, if there is a file for it, and reports where it is. If it cannot be saved, there is only a
  /// warning, because the failure that follows is more important.
  void Keep(const std::string &xml);

  /// Returns what `call` returns.
  /// @throws HintedException when `call` fails after a token was refused. Everything else that `call` throws is thrown
  ///         unchanged.
  template <typename Call>
  auto Explain(const Call &call) const {
    try {
      return call();
    } catch (const HintedException &) {
      throw;
    } catch (const std::exception &failure) {
      if (m_hint.empty()) {
        throw;
      }
      throw HintedException(failure, m_hint);
    }
  }

private:
  /// Saves the token, and returns a hint: where the token is, and what to do next.
  std::string Save(const std::string &xml);

  const TokenOutputOptions &m_options;
  const Tarvel::Crypto::CertificateList &m_trusted;
  const VerifyOptions &m_verifyOptions;
  const OutputOptions &m_output;
  std::string m_hint; ///< empty: no token was refused
};

} // namespace SsoClient::Tool
