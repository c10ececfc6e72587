// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefusedToken`, which keeps a token that the service issued and the tool refused.

#pragma once

#include "exit_code.h"
#include "output.h"
#include "token_output.h"

#include <ssoclient/service_options.h>

#include <exception>
#include <memory>
#include <string>

namespace SsoClient::Tool {

/// Saves a refused token in the file of --save-refused, and adds a hint to the failure. The client may call the sink on
/// any thread, even after this object has been destroyed.
class RefusedToken {
public:
  /// @param trusted the certificates with which tokens are verified
  /// @param verifyOptions the options with which tokens are verified
  RefusedToken(const TokenOutputOptions &options, const Tarvel::Crypto::CertificateList &trusted,
               const VerifyOptions &verifyOptions, const OutputOptions &output);
  RefusedToken(const RefusedToken &) = delete;
  RefusedToken &operator=(const RefusedToken &) = delete;

  /// A function that saves a token, if there is a file for it, and reports where it is. If it cannot be saved, there is
  /// only a warning, because the failure that follows is more important.
  ServiceOptions::RefusedTokenSink GetSink() const;

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
      const std::string hint = GetHint();
      if (hint.empty()) {
        throw;
      }
      throw HintedException(failure, hint);
    }
  }

private:
  class Keeper;

  /// What to do about the token that was refused; empty if no token was refused.
  std::string GetHint() const;

  std::shared_ptr<Keeper> m_keeper; // shared with the sink
};

} // namespace SsoClient::Tool
