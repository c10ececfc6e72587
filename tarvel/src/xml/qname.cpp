// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/qname.h>

namespace Tarvel::Xml {

std::string QName::ToString() const {
  return namespaceUri.empty() ? localName : "{" + namespaceUri + "}" + localName;
}

std::string FormatMessageArgument(const QName &value) {
  return value.ToString();
}

} // namespace Tarvel::Xml
