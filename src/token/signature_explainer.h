// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExplainSignature`, which reports the checks of a token's signature.

#pragma once

#include "token/report_recorder.h"

#include <ssoclient/token_report.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature.h>

namespace SsoClient {

/// Runs the checks ALGORITHMS, KEYS, REFERENCES, SIGNATURE and DIGESTS on the signature of `assertion`. They are not done if
/// `signature` is null.
void ExplainSignature(const Tarvel::Xml::Security::Signature *signature, const Tarvel::Xml::ElementNode &assertion,
                      const Tarvel::Xml::Security::KeyInfoResolver &resolver, TokenReport &report,
                      ReportRecorder &recorder);

} // namespace SsoClient
