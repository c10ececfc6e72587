// SPDX-License-Identifier: Apache-2.0
// Written for comparison: it uses whole maps where the library uses tables, and has no limits and no buffers.

#include "expat_oracle.h"

#include <expat.h>

#include <algorithm>
#include <map>
#include <memory>
#include <set>
#include <utility>

namespace Testing {

namespace {

constexpr std::string_view XML_NAMESPACE = "http://www.w3.org/XML/1998/namespace";

using Namespaces = std::map<std::string, std::string, std::less<>>; // by prefix; "" is the default namespace

struct ParserDeleter {
  void operator()(XML_ParserStruct *parser) const noexcept { XML_ParserFree(parser); }
};

std::string Escaped(std::string_view text, bool isAttributeValue) {
  static const std::map<char, std::string> inText{{'&', "&amp;"}, {'<', "&lt;"}, {'>', "&gt;"}, {'\r', "&#xD;"}};
  static const std::map<char, std::string> inValue{{'&', "&amp;"},  {'<', "&lt;"},   {'"', "&quot;"},
                                                   {'\t', "&#x9;"}, {'\n', "&#xA;"}, {'\r', "&#xD;"}};
  const std::map<char, std::string> &escapes = isAttributeValue ? inValue : inText;
  std::string escaped;
  for (const char character : text) {
    const auto escape = escapes.find(character);
    escaped += escape == escapes.end() ? std::string(1, character) : escape->second;
  }
  return escaped;
}

std::string PrefixOf(std::string_view name) {
  const std::size_t colon = name.find(':');
  return std::string(colon == std::string_view::npos ? std::string_view() : name.substr(0, colon));
}

std::string LocalNameOf(std::string_view name) {
  const std::size_t colon = name.find(':');
  return std::string(colon == std::string_view::npos ? name : name.substr(colon + 1));
}

struct Attribute {
  std::string name;
  std::string value;
};

struct OpenElement {
  Namespaces inScope;
  Namespaces written; // declared in the output by this element and its ancestors
  std::vector<Attribute> xmlAttributes;
};

class CanonicalWriter {
public:
  CanonicalWriter(std::size_t apex, std::size_t omitted, const ExpatMethod &method)
      : m_apex(apex), m_omitted(omitted), m_method(method) {}

  std::optional<std::string> Write(std::string_view text) {
    const std::unique_ptr<XML_ParserStruct, ParserDeleter> parser(XML_ParserCreate(nullptr));
    XML_SetUserData(parser.get(), this);
    XML_SetElementHandler(
        parser.get(), [](void *self, const char *name, const char **attributes) { Self(self).Start(name, attributes); },
        [](void *self, const char *name) { Self(self).End(name); });
    XML_SetCharacterDataHandler(parser.get(), [](void *self, const char *data, int size) {
      Self(self).Text({data, static_cast<std::size_t>(size)});
    });
    XML_SetCommentHandler(parser.get(), [](void *self, const char *data) { Self(self).Comment(data); });
    XML_SetProcessingInstructionHandler(
        parser.get(), [](void *self, const char *target, const char *data) { Self(self).Instruction(target, data); });
    const XML_Status status = XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), XML_TRUE);
    return status == XML_STATUS_OK && !m_hasUnboundPrefix ? std::optional<std::string>(m_output) : std::nullopt;
  }

private:
  static CanonicalWriter &Self(void *self) { return *static_cast<CanonicalWriter *>(self); }

  bool IsWritten() const { return m_withinApex != 0 && m_withinOmitted == 0; }

  void Start(std::string_view name, const char **attributes) {
    const std::size_t number = m_elements++;
    m_withinApex += m_withinApex != 0 || m_apex == NO_ELEMENT || number == m_apex ? 1u : 0u;
    m_withinOmitted += m_withinOmitted != 0 || number == m_omitted ? 1u : 0u;

    OpenElement element;
    if (!m_open.empty()) {
      element.inScope = m_open.back().inScope;
      element.written = m_open.back().written;
    }
    std::vector<Attribute> own;
    for (; *attributes; attributes += 2) {
      Attribute attribute{attributes[0], attributes[1]};
      if (attribute.name == "xmlns") {
        element.inScope[""] = attribute.value;
      } else if (PrefixOf(attribute.name) == "xmlns") {
        element.inScope[LocalNameOf(attribute.name)] = attribute.value;
      } else {
        if (PrefixOf(attribute.name) == "xml") {
          element.xmlAttributes.push_back(attribute);
        }
        own.push_back(std::move(attribute));
      }
    }
    element.inScope["xml"] = XML_NAMESPACE;
    if (IsWritten()) {
      // The inclusive form of an apex includes the xml: attributes of its omitted ancestors, the nearest first.
      if (!m_method.isExclusive && m_withinApex == 1) {
        for (auto above = m_open.rbegin(); above != m_open.rend(); ++above) {
          for (const Attribute &inherited : above->xmlAttributes) {
            if (std::none_of(own.begin(), own.end(),
                             [&](const Attribute &other) { return other.name == inherited.name; })) {
              own.push_back(inherited);
            }
          }
        }
      }
      WriteStartTag(name, own, element);
    }
    m_open.push_back(std::move(element));
  }

  std::set<std::string> WantedPrefixes(std::string_view name, const std::vector<Attribute> &attributes,
                                       const OpenElement &element) const {
    std::set<std::string> wanted;
    for (const auto &[prefix, uri] : element.inScope) {
      const std::string listed = prefix.empty() ? "#default" : prefix;
      const std::vector<std::string> &list = m_method.inclusivePrefixes;
      if (!m_method.isExclusive || std::find(list.begin(), list.end(), listed) != list.end()) {
        wanted.insert(prefix);
      }
    }
    if (m_method.isExclusive) {
      wanted.insert(PrefixOf(name));
      for (const Attribute &attribute : attributes) {
        if (!PrefixOf(attribute.name).empty()) {
          wanted.insert(PrefixOf(attribute.name));
        }
      }
    }
    wanted.erase("xml");
    return wanted;
  }

  static std::string UriOf(const Namespaces &namespaces, const std::string &prefix) {
    const auto found = namespaces.find(prefix);
    return found == namespaces.end() ? std::string() : found->second;
  }

  void WriteStartTag(std::string_view name, std::vector<Attribute> &attributes, OpenElement &element) {
    m_output.append("<").append(name);
    for (const std::string &prefix : WantedPrefixes(name, attributes, element)) {
      const std::string uri = UriOf(element.inScope, prefix);
      // An empty default namespace is declared only where the output has declared another one.
      if (uri != UriOf(element.written, prefix)) {
        m_output.append(prefix.empty() ? " xmlns" : " xmlns:" + prefix).append("=\"" + Escaped(uri, true) + "\"");
        element.written[prefix] = uri;
      }
    }
    const auto uriOf = [&](const Attribute &attribute) {
      const std::string prefix = PrefixOf(attribute.name);
      return prefix.empty() ? std::string() : UriOf(element.inScope, prefix);
    };
    m_hasUnboundPrefix =
        m_hasUnboundPrefix || (!PrefixOf(name).empty() && UriOf(element.inScope, PrefixOf(name)).empty());
    for (const Attribute &attribute : attributes) {
      m_hasUnboundPrefix = m_hasUnboundPrefix || (!PrefixOf(attribute.name).empty() && uriOf(attribute).empty());
    }
    std::sort(attributes.begin(), attributes.end(), [&](const Attribute &left, const Attribute &right) {
      return std::pair(uriOf(left), LocalNameOf(left.name)) < std::pair(uriOf(right), LocalNameOf(right.name));
    });
    for (const Attribute &attribute : attributes) {
      m_output.append(" " + attribute.name + "=\"" + Escaped(attribute.value, true) + "\"");
    }
    m_output.append(">");
  }

  void End(std::string_view name) {
    if (IsWritten()) {
      m_output.append("</").append(name).append(">");
      m_isRootWritten = m_open.size() == 1;
    }
    m_withinApex -= m_withinApex != 0 ? 1u : 0u;
    m_withinOmitted -= m_withinOmitted != 0 ? 1u : 0u;
    m_open.pop_back();
  }

  void Text(std::string_view text) {
    if (IsWritten()) {
      m_output += Escaped(text, false);
    }
  }

  void Comment(std::string_view text) {
    if (m_method.withComments) {
      WriteNode("<!--" + std::string(text) + "-->");
    }
  }

  void Instruction(std::string_view target, std::string_view data) {
    WriteNode("<?" + std::string(target) + (data.empty() ? "" : " ") + std::string(data) + "?>");
  }

  void WriteNode(const std::string &node) {
    if (!m_open.empty()) {
      m_output += IsWritten() ? node : std::string();
    } else if (m_apex == NO_ELEMENT) {
      // If the document element is omitted, the recommendation does not define what is before it; libxml2 writes
      // everything.
      m_output += m_isRootWritten ? "\n" + node : node + "\n";
    }
  }

  const std::size_t m_apex;
  const std::size_t m_omitted;
  const ExpatMethod &m_method;
  std::vector<OpenElement> m_open;
  std::size_t m_elements = 0;
  std::size_t m_withinApex = 0;    // how many open elements are the apex or within it
  std::size_t m_withinOmitted = 0; // the same for the omitted subtree
  bool m_isRootWritten = false;
  bool m_hasUnboundPrefix = false;
  std::string m_output;
};

} // namespace

std::optional<std::string> CanonicalFormByExpat(std::string_view text, std::size_t apex, std::size_t omitted,
                                                const ExpatMethod &method) {
  return CanonicalWriter(apex, omitted, method).Write(text);
}

} // namespace Testing
