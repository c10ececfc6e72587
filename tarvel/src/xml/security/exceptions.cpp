// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/security/exceptions.h>

namespace Tarvel {
namespace Xml {
namespace Security {

TARVEL_DEFINE_EXCEPTION(XmlSecurityException)
TARVEL_DEFINE_EXCEPTION(SignatureSyntaxException)

} // namespace Security
} // namespace Xml
} // namespace Tarvel
