// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/security/exceptions.h>

namespace Tarvel::Xml::Security {

TARVEL_DEFINE_EXCEPTION(XmlSecurityException)
TARVEL_DEFINE_EXCEPTION(SignatureSyntaxException)

} // namespace Tarvel::Xml::Security
