// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks the places in a report against the document.

#pragma once

#include <ssoclient/token_report.h>
#include <tarvel/xml/document.h>

#include <string>

namespace Testing {

/// What is wrong with the elements, attributes, paths, lines and columns of the findings, one on each line; empty if
/// nothing is.
/// @param document the tree of the text that was explained
std::string FindWrongPlaces(const SsoClient::TokenReport &report, const Tarvel::Xml::Document &document);

} // namespace Testing
