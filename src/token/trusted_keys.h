// SPDX-License-Identifier: Apache-2.0
/// @file
/// The texts that describe certificates in a report.

#pragma once

#include <ssoclient/token_report.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/security/key_info_resolver.h>

#include <string>
#include <vector>

namespace SsoClient {

/// The certificate's subject; empty if it cannot be read. It need not be printable, because its maker has chosen it.
std::string SubjectOf(const Tarvel::Crypto::Certificate &certificate);

/// One trusted key, of which only the certificate is known so far.
TokenReport::TrustedKey DescribeTrustedKey(const Tarvel::Ref<const Tarvel::Crypto::Certificate> &certificate);

/// All keys that `resolver` trusts.
std::vector<TokenReport::TrustedKey> DescribeTrustedKeys(const Tarvel::Xml::Security::KeyInfoResolver &resolver);

} // namespace SsoClient
