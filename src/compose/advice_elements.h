// SPDX-License-Identifier: Apache-2.0
/// @file
/// The advice that a request asks for.

#pragma once

#include "compose/xml_builder.h"

#include <ssoclient/advice.h>

#include <vector>

namespace SsoClient {

/// `rsa-advice:AdviceSet` with one `rsa-advice:Advice` per entry. It declares every prefix that is used in it.
XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice> &advices);

/// `rsa-advice:Advice` of one source, with one `rsa-advice:Attribute` per attribute.
XMLBuilderPtr RsaAdviceBuilder(const Advice &advice);

/// `rsa-advice:Attribute` with its values in order, each typed "xs:string".
XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute &attribute);

} // namespace SsoClient
