// SPDX-License-Identifier: Apache-2.0
/// @file
/// The readers that are compared: the platform's, libxml2's, and expat's in both of its forms.

#pragma once

#include "reading.h"

#include <string_view>

namespace Testing {

Reading ReadWithPlatform(std::string_view document);

/// Like `ReadWithPlatform`, but without the parser, which would copy the document first.
Reading ReadInPlace(std::string_view document);

/// libxml2's SAX2 interface with namespaces. It refuses a document that is not well-formed or has a namespace error
/// other than an unbound prefix. The declared encoding is ignored.
Reading ReadWithLibxml2(std::string_view document);

/// expat without namespaces. Rules of this test check those, and refuse with the code `NAMESPACE_FAULT`.
Reading ReadWithExpat(std::string_view document);

/// expat's own reading of namespaces, which refuses an unbound prefix.
Reading ReadWithNamespacesOfExpat(std::string_view document);

constexpr int NAMESPACE_FAULT = 1000; ///< beyond expat's own numbers

} // namespace Testing
