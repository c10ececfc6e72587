// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExplainAssertion`, which reports the checks of an assertion.

#pragma once

#include "token/report_recorder.h"

#include <ssoclient/token_report.h>
#include <ssoclient/verify_options.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/key_info_resolver.h>

namespace SsoClient {

/// Runs all checks after WELL_FORMED on `root`, or on the first assertion in it, and writes the results to `report`.
void ExplainAssertion(const Tarvel::Xml::ElementNode &root, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                      const VerifyOptions &options, TokenReport &report, ReportRecorder &recorder);

} // namespace SsoClient
