// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a C++ block without an #include may use: these headers and, unless it defines a function or a class, these
/// parameters.

#pragma once

#include <ssoclient/client/token_source.h>
#include <ssoclient/ssoclient.h>
#include <tarvel/core/checked_cast.h>
#include <tarvel/core/secret_text.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/crypto/system_configuration.h>
#include <tarvel/io/reader.h>
#include <tarvel/service/app.h>
#include <tarvel/ssl/ssl_context.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <exception>
#include <functional>
#include <future>
#include <iostream>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#define PARAMETERS                                                                                                     \
  [[maybe_unused]] const std::shared_ptr<const SsoClient::SecurityTokenService> &service,                              \
      [[maybe_unused]] SsoClient::SecurityTokenServiceConfig &config, [[maybe_unused]] SsoClient::TokenSpec &spec,     \
      [[maybe_unused]] std::shared_ptr<const SsoClient::SamlToken> &token,                                             \
      [[maybe_unused]] const Tarvel::Crypto::CertificateList &trusted, [[maybe_unused]] const std::string &xml,        \
      [[maybe_unused]] const std::string &password, [[maybe_unused]] const Tarvel::SecretText &secret,                 \
      [[maybe_unused]] const std::shared_ptr<const SsoClient::TokenClient> &client,                                    \
      [[maybe_unused]] const std::shared_ptr<const SsoClient::TokenSource> &source,                                    \
      [[maybe_unused]] const SsoClient::CredentialProvider &provider,                                                  \
      [[maybe_unused]] const Tarvel::Crypto::PrivateKey &key, [[maybe_unused]] const std::string &envelope,            \
      [[maybe_unused]] SsoClient::HttpRequest &request, [[maybe_unused]] const Tarvel::Crypto::Certificate &peer,      \
      [[maybe_unused]] const std::function<std::shared_ptr<SsoClient::NegotiationHandler>()> &makeHandler,             \
      [[maybe_unused]] std::vector<std::function<void()>> &eventLoop
