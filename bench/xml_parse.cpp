// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares reading a text into our tree with libxml2's tree, and with libxml2 and expat when they only call functions
/// that do nothing.

#include "program.h"

#include "xml/xml_text.h"

#include <tarvel/xml/document.h>

#include <benchmark/benchmark.h>
#include <expat.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include <cstddef>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <type_traits>

namespace Bench {

namespace {

struct Text {
  const char *name;
  const std::string xml;
};

/// The same tokens as in token_verify.
const Text *GetTexts() {
  static const Text texts[] = {{"5k", ReadFile(TOKEN_DATA_DIR "/bearer-5k.xml")},
                               {"50k", ReadFile(TOKEN_DATA_DIR "/bearer-50k.xml")},
                               {"5m", ReadFile(LARGE_TOKEN)}};
  return texts;
}
constexpr std::size_t TEXTS = 3;

/// The content that a reader read. It must be the same for all readers.
struct Content {
  std::size_t elements = 0;
  std::size_t textOctets = 0;
  bool operator==(const Content &) const = default;
};

[[noreturn]] void Fail(const char *who) {
  throw std::runtime_error(std::string(who) + " does not read the text");
}

Tarvel::Ref<Tarvel::Xml::Document> ReadTree(const std::string &xml) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  SsoClient::ParseXML(xml, document);
  return document;
}

Content CountTree(const std::string &xml) {
  Content content;
  const Tarvel::Ref<Tarvel::Xml::Document> document = ReadTree(xml);
  const Tarvel::Xml::Node *const top = document->GetDocumentNode();
  const Tarvel::Xml::Node *node = top;
  while (node) {
    content.elements += Tarvel::Xml::AsElement(node) ? 1U : 0U;
    if (const Tarvel::Xml::TextNode *const text = Tarvel::Xml::AsText(node)) {
      content.textOctets += text->GetValue().size();
    }
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    while (node != top && !node->GetNextSibling()) {
      node = node->GetParent();
    }
    node = node == top ? nullptr : node->GetNextSibling();
  }
  return content;
}

struct LibxmlDocumentDeleter {
  void operator()(xmlDoc *document) const { xmlFreeDoc(document); }
};
using LibxmlDocument = std::unique_ptr<xmlDoc, LibxmlDocumentDeleter>;

LibxmlDocument ReadLibxmlTree(const std::string &xml) {
  LibxmlDocument document(xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr, XML_PARSE_NONET));
  if (!document) {
    Fail("libxml2");
  }
  return document;
}

Content CountLibxmlTree(const std::string &xml) {
  Content content;
  const LibxmlDocument document = ReadLibxmlTree(xml);
  const xmlNode *node = xmlDocGetRootElement(document.get());
  while (node) {
    content.elements += node->type == XML_ELEMENT_NODE ? 1U : 0U;
    if (node->type == XML_TEXT_NODE || node->type == XML_CDATA_SECTION_NODE) {
      content.textOctets += static_cast<std::size_t>(xmlStrlen(node->content));
    }
    if (node->type == XML_ELEMENT_NODE && node->children) {
      node = node->children;
      continue;
    }
    while (node && !node->next) {
      node = node->parent && node->parent->type == XML_ELEMENT_NODE ? node->parent : nullptr;
    }
    node = node ? node->next : nullptr;
  }
  return content;
}

/// The functions that libxml2 and expat call. With `COUNTS` they count in their `Content`, otherwise they do nothing.
template <bool COUNTS>
struct Callbacks {
  static void CountElement([[maybe_unused]] void *content) {
    if constexpr (COUNTS) {
      ++static_cast<Content *>(content)->elements;
    }
  }
  static void CountText([[maybe_unused]] void *content, [[maybe_unused]] int octets) {
    if constexpr (COUNTS) {
      static_cast<Content *>(content)->textOctets += static_cast<std::size_t>(octets);
    }
  }

  static void StartElementNs(void *content, const xmlChar *, const xmlChar *, const xmlChar *, int, const xmlChar **,
                             int, int, const xmlChar **) {
    CountElement(content);
  }
  static void EndElementNs(void *, const xmlChar *, const xmlChar *, const xmlChar *) {}
  static void Characters(void *content, const xmlChar *, int octets) { CountText(content, octets); }
  static void LibxmlComment(void *, const xmlChar *) {}
  static void LibxmlInstruction(void *, const xmlChar *, const xmlChar *) {}

  static void StartElement(void *content, const XML_Char *, const XML_Char **) { CountElement(content); }
  static void EndElement(void *, const XML_Char *) {}
  static void CharacterData(void *content, const XML_Char *, int octets) { CountText(content, octets); }
  static void Comment(void *, const XML_Char *) {}
  static void Instruction(void *, const XML_Char *, const XML_Char *) {}
};

template <bool COUNTS>
Content ReadByLibxmlSax2(const std::string &xml) {
  using Calls = Callbacks<COUNTS>;
  xmlSAXHandler handler{};
  handler.initialized = XML_SAX2_MAGIC;
  handler.startElementNs = Calls::StartElementNs;
  handler.endElementNs = Calls::EndElementNs;
  handler.characters = Calls::Characters;
  handler.ignorableWhitespace = Calls::Characters;
  handler.cdataBlock = Calls::Characters;
  handler.comment = Calls::LibxmlComment;
  handler.processingInstruction = Calls::LibxmlInstruction;
  Content content;
  if (xmlSAXUserParseMemory(&handler, &content, xml.data(), static_cast<int>(xml.size())) != 0) {
    Fail("libxml2's SAX2");
  }
  return content;
}

template <bool COUNTS>
Content ReadByExpat(const std::string &xml) {
  using Calls = Callbacks<COUNTS>;
  const std::unique_ptr<std::remove_pointer_t<XML_Parser>, void (*)(XML_Parser)> parser(
      XML_ParserCreateNS(nullptr, '|'), &XML_ParserFree);
  Content content;
  XML_SetUserData(parser.get(), &content);
  XML_SetElementHandler(parser.get(), Calls::StartElement, Calls::EndElement);
  XML_SetCharacterDataHandler(parser.get(), Calls::CharacterData);
  XML_SetCommentHandler(parser.get(), Calls::Comment);
  XML_SetProcessingInstructionHandler(parser.get(), Calls::Instruction);
  if (XML_Parse(parser.get(), xml.data(), static_cast<int>(xml.size()), XML_TRUE) != XML_STATUS_OK) {
    Fail("expat");
  }
  return content;
}

/// The figures mean nothing unless all readers read the same content.
void RequireSameContent(const Text &text) {
  const Content ours = CountTree(text.xml);
  if (ours.elements == 0 || ours.textOctets == 0 || CountLibxmlTree(text.xml) != ours ||
      ReadByLibxmlSax2<true>(text.xml) != ours || ReadByExpat<true>(text.xml) != ours) {
    throw std::runtime_error(std::string("the readers differ about the text of ") + text.name);
  }
}

template <auto READ>
void Read(benchmark::State &state, const std::string &xml) {
  for (auto _ : state) {
    benchmark::DoNotOptimize(READ(xml));
  }
}

void RegisterBenchmarks() {
  for (std::size_t i = 0; i < TEXTS; ++i) {
    const Text &text = GetTexts()[i];
    RequireSameContent(text);
    const auto add = [&text](const char *reader, auto function) {
      benchmark::RegisterBenchmark((std::string(reader) + '/' + text.name).c_str(), function, text.xml)
          ->Unit(benchmark::kMicrosecond);
    };
    add("ParseXML", Read<ReadTree>);
    add("libxml2", Read<ReadLibxmlTree>);
    add("libxml2_sax2", Read<ReadByLibxmlSax2<false>>);
    add("expat", Read<ReadByExpat<false>>);
  }
}

// Times are microseconds of the measuring thread's CPU.
void WriteSummary(const Medians &medians, std::ostream &out) {
  const auto time = [&medians](const char *reader, const char *text) {
    return medians.at(std::string(reader) + '/' + text).cpuUs;
  };
  const char *const smallest = GetTexts()[0].name;
  out << "{\n\"xml_parse\": {\"ours_us\": " << time("ParseXML", smallest)
      << ", \"ratio\": " << time("ParseXML", smallest) / time("libxml2", smallest) << ",\n  \"by_size\": {";
  for (std::size_t i = 0; i < TEXTS; ++i) {
    const Text &text = GetTexts()[i];
    const double ours = time("ParseXML", text.name);
    out << (i == 0 ? "" : ",") << "\n    \"" << text.name << "\": {\"ours_us\": " << ours
        << ", \"ns_per_octet\": " << ours * 1000 / static_cast<double>(text.xml.size()) << ", \"ratios\": {";
    const char *separator = "";
    for (const char *const peer : {"libxml2", "libxml2_sax2", "expat"}) {
      out << separator << '"' << peer << "\": " << ours / time(peer, text.name);
      separator = ", ";
    }
    out << "}}";
  }
  out << "}}\n}\n";
}

} // namespace

constexpr Program PROGRAM{"xml_parse", RegisterBenchmarks, WriteSummary};

} // namespace Bench

int main(int argc, char **argv) {
  return Bench::RunProgram(Bench::PROGRAM, argc, argv);
}
