// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExplainToken`, which runs all checks of a verification, also after a failure, and reports them.

#pragma once

#include <ssoclient/token_report.h>
#include <ssoclient/verify_options.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/key_info_resolver.h>

#include <string>

namespace SsoClient {

/// The report on the token in `xml`. See `TokenVerifier::Explain`.
TokenReport ExplainToken(const std::string &xml, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                         const VerifyOptions &options);

/// The same for an element.
TokenReport ExplainToken(const Tarvel::Xml::ElementNode &element,
                         const Tarvel::Xml::Security::KeyInfoResolver &resolver, const VerifyOptions &options);

} // namespace SsoClient
