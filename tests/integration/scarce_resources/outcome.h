// SPDX-License-Identifier: Apache-2.0
/// @file
/// How an operation of the service ends, as text.

#pragma once

#include <ssoclient/security_token_service.h>

#include <memory>
#include <string>

namespace Testing {

using ServicePtr = std::shared_ptr<const SsoClient::SecurityTokenService>;

/// A client of the service at `url`. It has read all its files.
ServicePtr ServiceAt(const std::string &url);

/// Acquires a token: its subject, or the class and the message of the exception.
std::string Acquire(const ServicePtr &service);

/// The same by `AcquireTokenAsync`; "thrown " comes before what the start throws.
std::string AcquireAsynchronously(const ServicePtr &service);

} // namespace Testing
