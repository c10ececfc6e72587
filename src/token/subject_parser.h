// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the elements that name a party: the issuer, the subject, and the confirmation of the subject.

#pragma once

#include "model/namespaces.h"
#include "token/assertion_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"
#include "xml/qualified_name.h"

#include <boost/optional.hpp>

#include <string_view>

namespace SsoClient {

/// The type of `SubjectConfirmationData` with a key.
constexpr QNameView KEY_INFO_CONFIRMATION_DATA_TYPE(Namespaces::SAML, "KeyInfoConfirmationDataType");

/// The kind of confirmation whose method has this URI; empty for other methods.
boost::optional<SamlToken::ConfirmationType> FindConfirmationType(std::string_view method);

/// Reads attributes and text of an element of the type NameIDType with any name. The cursor must be on an element.
void ParseNameIDType(NodeFilterIterator &iterator, NameIDType &nameId, DeviationSink &sink = ThrowingSink());

/// Reads a `saml:Issuer`.
void ParseSamlIssuerElement(NodeFilterIterator &iterator, NameIDType &issuer, DeviationSink &sink = ThrowingSink());

/// Reads a `saml:NameID`.
void ParseSubjectNameIdElement(NodeFilterIterator &iterator, NameIDType &nameId, DeviationSink &sink = ThrowingSink());

/// Reads a `saml:Subject`: one name and one confirmation.
void ParseSubjectElement(NodeFilterIterator &iterator, SubjectType &subject, DeviationSink &sink = ThrowingSink());

/// Reads a `saml:SubjectConfirmation` of the method bearer or holder-of-key.
void ParseSubjectConfirmationElement(NodeFilterIterator &iterator, SubjectConfirmationType &confirmation,
                                     DeviationSink &sink = ThrowingSink());

/// Refuses the `Method` of `confirmation`, a `saml:SubjectConfirmation`, because it is not known.
void RefuseMethod(const Tarvel::Xml::ElementNode *confirmation, std::string_view method, DeviationSink &sink);

/// Reads a `saml:SubjectConfirmationData`, whose form depends on `method`: bearer has an end of validity, holder-of-key a
/// certificate.
void ParseSubjectConfirmationDataElement(NodeFilterIterator &iterator, SamlToken::ConfirmationType method,
                                         SubjectConfirmationDataType &data, DeviationSink &sink = ThrowingSink());

/// Reads a `ds:X509Certificate`. `certificate` stays null if the element is not there, or is not a certificate.
void ParseX509CertificateElement(NodeFilterIterator &iterator,
                                 Tarvel::Ref<const Tarvel::Crypto::Certificate> &certificate,
                                 DeviationSink &sink = ThrowingSink());

/// Reads a `ds:KeyInfo` and its only certificate.
void ParseSubjectConfirmationDataKeyInfoElement(NodeFilterIterator &iterator,
                                                Tarvel::Ref<const Tarvel::Crypto::Certificate> &certificate,
                                                DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
