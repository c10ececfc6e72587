// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks the places in a report against the document.

#pragma once

#include <ssoclient/token_report.h>
#include <tarvel/xml/document.h>

#include <string>

namespace Testing {

/// What is wrong with the elements, paths, lines and columns of the first 20 findings of each check, one finding on
/// each line; empty if nothing is.
/// @param document the tree of the text that was explained
std::string FindWrongPlaces(const SsoClient::TokenReport &report, const Tarvel::Xml::Document &document);

} // namespace Testing
