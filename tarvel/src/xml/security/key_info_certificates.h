// SPDX-License-Identifier: Apache-2.0
/// @file
/// Functions that read, describe and compare the certificates in a `ds:KeyInfo`.

#pragma once

#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature_report.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// The texts of the first 16 X509Certificate elements that contain text and nothing else. Views belong to the tree.
std::vector<std::string_view> CertificateTexts(const ElementNode &keyInfo);

/// The bytes that a certificate's text encodes; empty if it is not Base64.
std::vector<std::uint8_t> DecodeCertificateText(std::string_view text);

/// What a report says about a certificate. `isTrusted` is false.
SignatureReport::NamedCertificate DescribeCertificate(const Crypto::Certificate &certificate);

/// What a report says about a certificate that is not trusted. `der` may be any octets; more than 64 KiB are not
/// decoded.
SignatureReport::NamedCertificate DescribeStranger(const std::vector<std::uint8_t> &der);

/// The certificates in their order, without nulls and duplicates.
Crypto::CertificateList DistinctCertificates(const Crypto::CertificateList &certificates);

} // namespace Tarvel::Xml::Security
