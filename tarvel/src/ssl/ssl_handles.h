// SPDX-License-Identifier: Apache-2.0
/// @file
/// Owning handles for the objects of OpenSSL's TLS.

#pragma once

#include "crypto/openssl_handles.h"

#include <openssl/ssl.h>

namespace Tarvel::Ssl {

using ContextHandle = std::unique_ptr<SSL_CTX, Crypto::OpenSslDeleter<SSL_CTX_free>>;
using ConnectionHandle = std::unique_ptr<SSL, Crypto::OpenSslDeleter<SSL_free>>;
using SessionHandle = std::unique_ptr<SSL_SESSION, Crypto::OpenSslDeleter<SSL_SESSION_free>>;

} // namespace Tarvel::Ssl
