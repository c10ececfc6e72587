// SPDX-License-Identifier: Apache-2.0
/// @file
/// The outcome of an operation of the service, as text.

#pragma once

#include <ssoclient/security_token_service.h>

#include <memory>
#include <string>

namespace Testing {

using ServicePtr = std::shared_ptr<const SsoClient::SecurityTokenService>;

/// A client of the service at `url`, which has already read all its files.
ServicePtr ServiceAt(const std::string &url);

/// Acquires a token. Returns its subject, or the class and the message of the exception.
std::string Acquire(const ServicePtr &service);

/// The same with `AcquireTokenAsync`. For an exception that the start throws, the text begins with "thrown ".
std::string AcquireAsynchronously(const ServicePtr &service);

} // namespace Testing
