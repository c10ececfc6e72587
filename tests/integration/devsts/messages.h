// SPDX-License-Identifier: Apache-2.0
/// @file
/// Messages to the development service: built by the library's own request builder, then corrupted as text.

#pragma once

#include "exchange/request.h"
#include "exchange/request_builder_impl.h"
#include "support/dev_sts.h"
#include "support/token_stand_in.h"
#include "tls_client.h"

#include <ssoclient/token_spec.h>
#include <tarvel/core/environment.h>

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <string_view>

namespace DevStsTest {

/// The identity `name` in the service's state folder, such as "client".
SsoClient::HolderOfKeyConfig IdentityOf(const Testing::DevSts &service, const std::string &name);

/// A builder that signs with that identity, or does not sign when the name is empty.
SsoClient::RequestBuilderImpl BuilderFor(const Testing::DevSts &service, const std::string &name);

/// A lifetime of an hour, and nothing else.
SsoClient::TokenSpec PlainSpec();
/// The same for a token that may be renewed and delegated.
SsoClient::TokenSpec RenewableSpec();

SsoClient::Request PasswordRequest(const std::string &user = "alice@corp.example",
                                   const std::string &password = "wonderland");
SsoClient::Request CertificateRequest(const Testing::DevSts &service, const SsoClient::TokenSpec &spec = PlainSpec(),
                                      const std::string &identity = "client");

/// `text` with the first `from` replaced. @throws std::runtime_error when there is none to corrupt
std::string Replaced(std::string text, std::string_view from, std::string_view to);
/// `text` without the part from the first `begin` to the next `end`, both included.
std::string Without(const std::string &text, std::string_view begin, std::string_view end);
/// The text between the first `begin` and the next `end`. @throws std::runtime_error when one of them is missing
std::string Between(const std::string &text, std::string_view begin, std::string_view end);

HttpAnswer Send(const Testing::DevSts &service, const SsoClient::Request &request, std::string_view target = "/sts");

/// The assertion in an answer, in a form that the builder accepts. @throws std::runtime_error when there is none
Testing::TokenStandIn TokenIn(const HttpAnswer &answer);

/// While it exists, the library's clock is this much ahead of the true time.
class ShiftedClock {
public:
  explicit ShiftedClock(std::chrono::seconds ahead);

private:
  Tarvel::ScopedEnvironment m_scope;
};

/// Whether the answer is a SOAP fault with exactly this code and text, and HTTP status 500.
testing::AssertionResult IsRefused(const HttpAnswer &answer, const std::string &code, const std::string &reason);

/// Whether the answer contains a token.
testing::AssertionResult IsIssued(const HttpAnswer &answer);

} // namespace DevStsTest
