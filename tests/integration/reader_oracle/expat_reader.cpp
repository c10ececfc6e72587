// SPDX-License-Identifier: Apache-2.0

#include "readers.h"

#include <expat.h>

#include <algorithm>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace Testing {

namespace {

constexpr std::string_view XML_NAMESPACE = "http://www.w3.org/XML/1998/namespace";
constexpr std::string_view XMLNS_NAMESPACE = "http://www.w3.org/2000/xmlns/";
constexpr char SEPARATOR = '\n'; // not in a namespace name: white space in attribute values becomes blanks

struct ParserDeleter {
  void operator()(XML_ParserStruct *parser) const noexcept { XML_ParserFree(parser); }
};
using ParserHandle = std::unique_ptr<XML_ParserStruct, ParserDeleter>;

struct Declaration {
  std::string prefix; // "" is the default namespace
  std::string name;
};

std::string_view PrefixOf(std::string_view name) {
  return name.substr(0, name.find(':') == std::string_view::npos ? 0 : name.find(':'));
}

std::string_view LocalNameOf(std::string_view name) {
  return name.substr(name.find(':') + 1);
}

/// Whether `part`, a part of a valid XML name, is a name without a colon. The whole name begins with a character that
/// may begin a name, but the part after a colon may begin with one that may only continue a name. Beyond ASCII, expat
/// has the characters of XML 1.0's fourth edition; the few that are tested here are the same in the fifth.
bool IsColonless(std::string_view part) {
  if (part.empty() || part.find(':') != std::string_view::npos) {
    return false;
  }
  if (std::string_view("-.0123456789").find(part[0]) != std::string_view::npos) {
    return false;
  }
  const std::string_view two = part.substr(0, 2);
  const bool isMiddleDot = two == "\xC2\xB7";
  const bool isCombining = (two >= "\xCC\x80" && two <= "\xCD\xAF"); // U+0300 to U+036F
  const bool isTie = part.substr(0, 3) == "\xE2\x80\xBF" || part.substr(0, 3) == "\xE2\x81\x80";
  return !isMiddleDot && !isCombining && !isTie;
}

/// Checks Namespaces in XML 1.0, except whether a namespace name is a URI.
class NamespaceRules {
public:
  const std::string &GetFault() const { return m_fault; }
  bool HasUnboundPrefix() const { return m_hasUnboundPrefix; }

  void Start(std::string_view element, const char **attributes) {
    m_open.push_back(m_declarations.size());
    for (const char **next = attributes; *next; next += 2) {
      if (IsDeclaration(next[0])) {
        Declare(next[0], next[1]);
      }
    }
    CheckName(element);
    if (PrefixOf(element) == "xmlns") {
      SetFault("the prefix xmlns is on an element");
    }
    std::set<std::pair<std::string, std::string>> expanded;
    for (const char **next = attributes; *next; next += 2) {
      if (IsDeclaration(next[0])) {
        continue;
      }
      const std::string *const uri = CheckName(next[0]);
      if (uri && !expanded.insert({*uri, std::string(LocalNameOf(next[0]))}).second) {
        SetFault("two attributes have one expanded name");
      }
    }
  }

  void End() {
    m_declarations.resize(m_open.back());
    m_open.pop_back();
  }

  void CheckTarget(std::string_view target) {
    if (target.find(':') != std::string_view::npos) {
      SetFault("the target of a processing instruction has a colon");
    }
  }

private:
  void SetFault(const char *fault) {
    if (m_fault.empty()) {
      m_fault = fault;
    }
  }

  void Declare(std::string_view name, std::string_view value) {
    const std::string_view prefix = name.size() == 5 ? std::string_view() : name.substr(6);
    if (name.size() > 5 && !IsColonless(prefix)) {
      SetFault("a declared prefix is not a name without a colon");
    }
    if (prefix == "xmlns") {
      SetFault("the prefix xmlns is declared");
    }
    if ((prefix == "xml") != (value == XML_NAMESPACE)) {
      SetFault("the namespace of xml has another prefix, or the prefix another namespace");
    }
    if (value == XMLNS_NAMESPACE) {
      SetFault("the namespace of xmlns is declared");
    }
    if (!prefix.empty() && value.empty()) {
      SetFault("a prefix is declared to have no namespace");
    }
    m_declarations.push_back({std::string(prefix), std::string(value)});
  }

  /// @return the namespace of the name's prefix; null when the name has no prefix, is not valid, or its prefix is not
  /// bound.
  const std::string *CheckName(std::string_view name) {
    const std::size_t colon = name.find(':');
    if (colon == std::string_view::npos) {
      return nullptr;
    }
    if (!IsColonless(name.substr(0, colon)) || !IsColonless(name.substr(colon + 1))) {
      SetFault("a name has an empty part, two colons, or a part that cannot begin so");
      return nullptr;
    }
    const std::string_view prefix = PrefixOf(name);
    static const std::string xmlNamespace(XML_NAMESPACE);
    if (prefix == "xml") {
      return &xmlNamespace;
    }
    const auto found = std::find_if(m_declarations.rbegin(), m_declarations.rend(),
                                    [&](const Declaration &declaration) { return declaration.prefix == prefix; });
    if (found != m_declarations.rend()) {
      return &found->name;
    }
    m_hasUnboundPrefix = true;
    return nullptr;
  }

  std::string m_fault;
  bool m_hasUnboundPrefix = false;
  std::vector<Declaration> m_declarations;
  std::vector<std::size_t> m_open; // how many declarations are outside of each open element
};

struct Session {
  XML_Parser parser;
  Reading reading;
  NamespaceRules rules;                  // where expat does not judge namespaces
  std::vector<Declaration> declarations; // of the element that begins, with expat's namespaces

  EventText &Events() { return reading.declarationsFirst; }
};

Session &Self(void *self) {
  return *static_cast<Session *>(self);
}

std::string_view ToView(const char *text) {
  return text ? std::string_view(text) : std::string_view();
}

/// Sets the parser's handlers except those for elements, which are set already, and parses `document`. The events
/// become text in `EVENTS`.
template <EventText Reading::*EVENTS>
void Run(Session &session, std::string_view document) {
  const XML_Parser parser = session.parser;
  XML_SetUserData(parser, &session);
  XML_SetHashSalt(parser, 1);
  XML_SetCharacterDataHandler(parser, [](void *self, const char *text, int length) {
    (Self(self).reading.*EVENTS).Characters({text, static_cast<std::size_t>(length)});
  });
  XML_SetCommentHandler(parser,
                        [](void *self, const char *text) { (Self(self).reading.*EVENTS).Comment(ToView(text)); });
  XML_SetProcessingInstructionHandler(parser, [](void *self, const char *target, const char *data) {
    Self(self).rules.CheckTarget(target);
    (Self(self).reading.*EVENTS).ProcessingInstruction(target, ToView(data));
  });
  XML_SetStartDoctypeDeclHandler(parser, [](void *self, const char *, const char *, const char *, int) {
    Self(self).reading.hasDocumentType = true;
    XML_StopParser(Self(self).parser, XML_FALSE);
  });
  const bool isWhole = XML_Parse(parser, document.data(), static_cast<int>(document.size()), XML_TRUE) == XML_STATUS_OK;
  Reading &reading = session.reading;
  reading.isAccepted = reading.hasDocumentType || isWhole;
  if (!reading.isAccepted) {
    reading.code = XML_GetErrorCode(parser);
    reading.message = ToView(XML_ErrorString(XML_GetErrorCode(parser)));
    reading.offset = static_cast<std::size_t>(XML_GetCurrentByteIndex(parser));
    reading.line = static_cast<std::uint32_t>(XML_GetCurrentLineNumber(parser));
  }
}

/// The name in the form "prefix:local" or "local"; expat reports "URI\nlocal\nprefix", "URI\nlocal" or "local".
std::string WrittenName(std::string_view triplet) {
  const std::size_t first = triplet.find(SEPARATOR);
  if (first == std::string_view::npos) {
    return std::string(triplet);
  }
  const std::size_t second = triplet.find(SEPARATOR, first + 1);
  const std::string_view localName = triplet.substr(first + 1, second - first - 1);
  return second == std::string_view::npos ? std::string(localName)
                                          : std::string(triplet.substr(second + 1)).append(":").append(localName);
}

} // namespace

Reading ReadWithExpat(std::string_view document) {
  thread_local const ParserHandle parser(XML_ParserCreate(nullptr));
  XML_ParserReset(parser.get(), nullptr);
  Session session{parser.get(), {}, {}, {}};
  XML_SetElementHandler(
      parser.get(),
      [](void *self, const char *name, const char **attributes) {
        Self(self).rules.Start(name, attributes);
        Self(self).reading.offsets.push_back(static_cast<std::size_t>(XML_GetCurrentByteIndex(Self(self).parser)));
        Self(self).reading.events.StartElement(name);
        for (; *attributes; attributes += 2) {
          Self(self).reading.events.Attribute(attributes[0], attributes[1]);
        }
      },
      [](void *self, const char *) {
        Self(self).rules.End();
        Self(self).reading.events.EndElement();
      });
  Run<&Reading::events>(session, document);
  Reading &reading = session.reading;
  reading.hasUnboundPrefix = session.rules.HasUnboundPrefix();
  if (reading.isAccepted && !session.rules.GetFault().empty()) {
    reading.isAccepted = false;
    reading.hasDocumentType = false;
    reading.code = NAMESPACE_FAULT;
    reading.message = session.rules.GetFault();
  }
  return session.reading;
}

Reading ReadWithNamespacesOfExpat(std::string_view document) {
  thread_local const ParserHandle parser(XML_ParserCreateNS(nullptr, SEPARATOR));
  XML_ParserReset(parser.get(), nullptr);
  XML_SetReturnNSTriplet(parser.get(), 1);
  Session session{parser.get(), {}, {}, {}};
  XML_SetStartNamespaceDeclHandler(parser.get(), [](void *self, const char *prefix, const char *name) {
    if (ToView(prefix) != "xml") {
      Self(self).declarations.push_back({std::string(ToView(prefix)), std::string(ToView(name))});
    }
  });
  XML_SetElementHandler(
      parser.get(),
      [](void *self, const char *name, const char **attributes) {
        EventText &events = Self(self).Events();
        events.StartElement(WrittenName(name));
        for (const Declaration &declaration : Self(self).declarations) {
          events.Attribute(declaration.prefix.empty() ? "xmlns" : "xmlns:" + declaration.prefix, declaration.name);
        }
        Self(self).declarations.clear();
        for (; *attributes; attributes += 2) {
          events.Attribute(WrittenName(attributes[0]), attributes[1]);
        }
      },
      [](void *self, const char *) { Self(self).Events().EndElement(); });
  Run<&Reading::declarationsFirst>(session, document);
  return session.reading;
}

} // namespace Testing
