// SPDX-License-Identifier: Apache-2.0

#include "signature_template.h"

#include <cctype>

namespace Testing {

namespace {

constexpr std::string_view CANONICALIZATIONS[] = {
    "http://www.w3.org/TR/2001/REC-xml-c14n-20010315", "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#WithComments",
    "http://www.w3.org/2001/10/xml-exc-c14n#", "http://www.w3.org/2001/10/xml-exc-c14n#WithComments"};
constexpr std::string_view DIGESTS[] = {"http://www.w3.org/2001/04/xmlenc#sha256",
                                        "http://www.w3.org/2001/04/xmldsig-more#sha384",
                                        "http://www.w3.org/2001/04/xmlenc#sha512"};
constexpr std::string_view LETTERS = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";

class TemplateWriter {
public:
  explicit TemplateWriter(RandomSource &random) : m_random(random), m_prefix(random.OneOf({"ds:", "dsig:", ""})) {}

  std::string Write(std::string_view signatureUri, std::size_t elements) {
    const std::string declaration = m_prefix.empty() ? "xmlns" : "xmlns:" + m_prefix.substr(0, m_prefix.size() - 1);
    Open("Signature", declaration, "http://www.w3.org/2000/09/xmldsig#");
    Open("SignedInfo");
    WriteCanonicalization("CanonicalizationMethod");
    Open("SignatureMethod", "Algorithm", signatureUri);
    Close("SignatureMethod");
    for (std::size_t count = 1 + m_random.Below(3); count != 0; --count) {
      WriteReference(elements);
    }
    Close("SignedInfo");
    Open("SignatureValue");
    Close("SignatureValue");
    Close("Signature");
    return m_text;
  }

private:
  void Space() {
    if (m_random.OnceIn(6)) {
      m_text += m_random.OneOf({"\n", " ", "<!--c-->"});
    }
  }

  void Open(std::string_view name, std::string_view attribute = {}, std::string_view value = {}) {
    m_text += "<" + m_prefix + std::string(name);
    if (!attribute.empty()) {
      m_text += " " + std::string(attribute) + "=\"" + std::string(value) + "\"";
    }
    m_text += ">";
  }

  void Close(std::string_view name) {
    m_text += "</" + m_prefix + std::string(name) + ">";
    if (name != "Signature") {
      Space();
    }
  }

  void WriteCanonicalization(std::string_view element) {
    const std::size_t choice = m_random.Below(4);
    Open(element, "Algorithm", CANONICALIZATIONS[choice]);
    if (choice >= 2 && m_random.OnceIn(2)) {
      m_text += "<ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList=\"";
      for (const std::string &prefix : GeneratePrefixList(m_random)) {
        m_text += prefix + " ";
      }
      m_text += "\"/>";
    }
    Close(element);
  }

  // The signature is in the document element, so a reference to that element or to the document needs the transform
  // that removes the signature.
  void WriteReference(std::size_t elements) {
    const std::size_t element = m_random.OnceIn(2) ? 0 : m_random.Below(elements);
    const bool isEnveloping = element == 0;
    Open("Reference", "URI", isEnveloping && m_random.OnceIn(2) ? "" : "#e" + std::to_string(element));
    Space();
    const bool isCanonical = !m_random.OnceIn(3);
    if (isEnveloping || isCanonical) {
      Open("Transforms");
      if (isEnveloping) {
        Open("Transform", "Algorithm", "http://www.w3.org/2000/09/xmldsig#enveloped-signature");
        Close("Transform");
      }
      if (isCanonical) {
        WriteCanonicalization("Transform");
      }
      Close("Transforms");
    }
    Open("DigestMethod", "Algorithm", m_random.OneOf(DIGESTS));
    Close("DigestMethod");
    Open("DigestValue");
    Close("DigestValue");
    Close("Reference");
  }

  RandomSource &m_random;
  const std::string m_prefix;
  std::string m_text;
};

/// A random place after a ">", but not where the text of a digest or signature value begins: we refuse a comment there,
/// but other engines skip it.
std::size_t PlaceAfterTag(const std::string &text, RandomSource &random) {
  std::size_t at = text.find('>', random.Below(text.size()));
  while (at != std::string::npos) {
    const std::string_view tag = std::string_view(text).substr(0, at).substr(text.rfind('<', at));
    const bool opensValue = tag.size() > 1 && tag[1] != '/' && tag.find("Value") != std::string_view::npos;
    if (!opensValue) {
      return at + 1;
    }
    at = text.find('>', at + 1);
  }
  return text.size();
}

void ReplaceFirst(std::string &text, std::string_view from, std::string_view to) {
  const std::size_t at = text.find(from);
  if (at != std::string::npos) {
    text.replace(at, from.size(), to);
  }
}

void ChangeLetter(std::string &text, std::size_t at, RandomSource &random) {
  while (at < text.size() && !std::isalpha(static_cast<unsigned char>(text[at]))) {
    ++at;
  }
  if (at < text.size()) {
    text[at] = LETTERS[random.Below(LETTERS.size())];
  }
}

} // namespace

std::string AddSignatureTemplate(const GeneratedDocument &document, std::string_view signatureUri,
                                 RandomSource &random) {
  std::string text = document.text;
  return text.insert(document.endOfRoot, TemplateWriter(random).Write(signatureUri, document.elements));
}

std::string ChangeSomething(std::string text, RandomSource &random) {
  switch (random.Below(10)) {
  case 0:
    ChangeLetter(text, random.Below(text.size()), random);
    break;
  case 1:
    ChangeLetter(text, text.find("SignatureValue>") + 15 + random.Below(80), random);
    break;
  case 2:
    ChangeLetter(text, text.find("DigestValue>") + 12 + random.Below(40), random);
    break;
  case 3:
  case 4:
    text.insert(PlaceAfterTag(text, random), "<!-- new -->");
    break;
  case 5:
    text.insert(PlaceAfterTag(text, random), random.OneOf({" ", "\n", "x"}));
    break;
  case 6:
    text.erase(random.Below(text.size()), 1 + random.Below(2));
    break;
  case 7:
    ReplaceFirst(text, " ID=\"e0\"", random.OneOf({" ID=\"e0\" new=\"\"", " xmlns:new=\"urn:new\" ID=\"e0\""}));
    break;
  case 8:
    ReplaceFirst(text, "xml-exc-c14n#\"", "xml-exc-c14n#WithComments\"");
    break;
  default:
    ReplaceFirst(text, "<![CDATA[", "<![CDATA[]]><![CDATA[");
    ReplaceFirst(text, "&gt;", ">");
    ReplaceFirst(text, "'", "&apos;");
  }
  return text;
}

} // namespace Testing
