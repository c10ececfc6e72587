// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the subject and of how it is confirmed.

#pragma once

#include "token/assertion_model.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads a `saml:Subject`: one name and one confirmation.
void ParseSubjectElement(NodeFilterIterator &iterator, SubjectType &subject);

/// Reads a `saml:SubjectConfirmation` of the method bearer or holder-of-key.
void ParseSubjectConfirmationElement(NodeFilterIterator &iterator, SubjectConfirmationType &confirmation);

/// Reads a `saml:SubjectConfirmationData` as `method` has it: with an end for bearer, with a certificate for holder-of-key.
void ParseSubjectConfirmationDataElement(NodeFilterIterator &iterator, SamlToken::ConfirmationType method,
                                         SubjectConfirmationDataType &data);

/// Reads a `ds:KeyInfo` with the one certificate in it.
void ParseSubjectConfirmationDataKeyInfoElement(NodeFilterIterator &iterator,
                                                Tarvel::Ref<const Tarvel::Crypto::Certificate> &certificate);

} // namespace SsoClient
