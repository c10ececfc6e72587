// SPDX-License-Identifier: Apache-2.0

#include "hostile_documents.h"

#include "hostile_pieces.h"
#include "hostile_tokens.h"
#include "shape_list.h"

namespace Bench {

namespace {

void AddNames(ShapeList &shapes) {
  shapes.AddDocument("different element names", [](std::size_t i) { return '<' + Name(i) + "/>"; });
  shapes.AddDocument("different long element names",
                     [](std::size_t i) { return '<' + Name(i) + std::string(LONG, 'e') + "/>"; });
  shapes.AddDocument("one long element name", Always('<' + std::string(LONG, 'e') + "/>"));
  shapes.AddDocument("multi-byte element names",
                     [](std::size_t i) { return "<\xC3\xA9" + Name(i) + "\xE4\xB8\x80/>"; });
  shapes.AddDocument("different attribute names", [](std::size_t i) {
    return "<a" + Repeat(MANY, [i](std::size_t j) { return ' ' + Name(i * MANY + j) + "=''"; }) + "/>";
  });
  shapes.AddDocument("many attributes of an element, of the same names each time",
                     Always("<a" + Repeat(MANY, [](std::size_t j) { return ' ' + Name(j) + "=''"; }) + "/>"));
  shapes.AddDocument("different instruction targets", [](std::size_t i) { return "<?" + Name(i) + "?>"; });
  shapes.AddDocument("different unbound prefixes", [](std::size_t i) { return '<' + Name(i) + ":a/>"; });
  shapes.AddDocument("different unbound prefixes of attributes",
                     [](std::size_t i) { return "<a " + Name(i) + ":a=''/>"; });
  shapes.AddDocument("many unbound prefixes of the attributes of an element", [](std::size_t i) {
    return "<a" + Repeat(MANY, [i](std::size_t j) { return ' ' + Name(i * MANY + j) + ":a=''"; }) + "/>";
  });
  shapes.AddDocument("long unbound prefixes",
                     [](std::size_t i) { return '<' + Name(i) + std::string(LONG, 'p') + ":a/>"; });
}

// Long because each shape is an entry of its own.
void AddNamespaces(ShapeList &shapes) {
  const std::string longUri = "urn:" + std::string(LONG, 'u');
  const std::string manyDeclarations = Repeat(MANY, Declaring(Name, Name));
  shapes.AddDocument("different prefixes, each bound",
                     [](std::size_t i) { return '<' + Name(i) + ":a xmlns:" + Name(i) + "='u'/>"; });
  shapes.AddDocument("different namespace names", [](std::size_t i) { return "<a xmlns='u:" + Name(i) + "'/>"; });
  shapes.AddDocument("different long namespace names",
                     [longUri](std::size_t i) { return "<a xmlns='" + longUri + Name(i) + "'/>"; });
  shapes.AddDocument("names by the first of many declarations", Always('<' + Name(0) + ":a/>"),
                     "<r" + manyDeclarations + '>');
  shapes.AddDocument(
      "names by each of many declarations", [](std::size_t i) { return '<' + Name(i % MANY) + ":a/>"; },
      "<r" + manyDeclarations + '>');
  shapes.AddDocument(
      "names by many declarations whose prefixes collide in a hash",
      [](std::size_t i) { return '<' + CollidingPrefix(i) + ":a/>"; },
      "<r" + Repeat(MANY, Declaring(CollidingPrefix, Name)) + '>');
  shapes.AddDocument("names deep below their declarations", Always('<' + Name(0) + ":a/>"),
                     "<r" + manyDeclarations + '>' + Repeat(MANY, Always("<d>")),
                     Repeat(MANY, Always("</d>")) + "</r>");
  shapes.AddDocument("unbound names deep below many declarations", Always("<x:a x:b=''/>"),
                     "<r" + manyDeclarations + '>' + Repeat(MANY, Always("<d>")),
                     Repeat(MANY, Always("</d>")) + "</r>");
  shapes.AddDocument("a long prefix, bound once", Always('<' + std::string(LONG, 'p') + ":a/>"),
                     "<r xmlns:" + std::string(LONG, 'p') + "='u'>");
  shapes.AddDocument("many declarations of each element", Always("<a" + manyDeclarations + "/>"));
  shapes.AddDocument("one prefix bound anew at each depth", [](std::size_t i) {
    return Repeat(MANY, [i](std::size_t j) { return "<a xmlns='u:" + Name(i + j) + "'>"; }) +
           Repeat(MANY, Always("</a>"));
  });
  // Attributes of one local name are the same when their prefixes are bound to the same namespace name.
  const std::string equalLocals = "<a" + Repeat(MANY, [](std::size_t j) { return ' ' + Name(j) + ":a=''"; }) + "/>";
  shapes.AddDocument("attributes of one local name in many namespaces", Always(equalLocals),
                     "<r" + manyDeclarations + '>');
  // As many attributes as are compared one by one.
  const std::string fewEqualLocals = "<a" + Repeat(8, [](std::size_t j) { return ' ' + Name(j) + ":a=''"; }) + "/>";
  shapes.AddDocument("few attributes of one local name below many declarations", Always(fewEqualLocals),
                     "<r" + manyDeclarations + '>');
  shapes.AddDocument("attributes of one local name in many namespaces of long names", Always(equalLocals),
                     "<r" + Repeat(MANY / 4, Declaring(Name, [&](std::size_t j) { return longUri + Name(j); })) +
                         Repeat(MANY - MANY / 4, [](std::size_t j) { return Declaring(Name, Name)(j + MANY / 4); }) +
                         '>');
  shapes.AddDocument("attributes of one local name, declared where they are", [longUri](std::size_t i) {
    return "<a" +
           Repeat(MANY / 2,
                  [&longUri, i](std::size_t j) {
                    return Declaring(Name, Always(longUri.substr(0, 60) + Name(i + j)))(j) + ' ' + Name(j) + ":a=''";
                  }) +
           "/>";
  });
}

void AddContent(ShapeList &shapes) {
  shapes.AddDocument("entity references", Always("&amp;"));
  shapes.AddDocument("decimal references", Always("&#65;"));
  shapes.AddDocument("hexadecimal references", Always("&#x10FFFF;"));
  shapes.AddDocument("references with many zeros", Always("&#x" + std::string(LONG, '0') + "41;"));
  shapes.AddDocument("comments", Always("<!---->"));
  shapes.AddDocument("instructions", Always("<?a?>"));
  shapes.AddDocument("CDATA sections", Always("<![CDATA[]]>"));
  shapes.AddDocument("CDATA sections between characters", Always("x<![CDATA[y]]>"));
  shapes.AddDocument("empty elements", Always("<a/>"));
  shapes.AddDocument("empty elements with an end tag", Always("<a></a>"));
  shapes.AddDocument("elements between characters", Always("<a/>x"));
  shapes.AddDocument("elements of two attributes", Always("<a b='' c=''/>"));
  shapes.AddDocument("blanks within tags", Always("<a" + std::string(LONG, ' ') + "/>"));
  shapes.AddDocument("deep content", Always(Repeat(MANY, Always("<a>")) + Repeat(MANY, Always("</a>"))));
  shapes.AddDocument("deep content of different names", [](std::size_t i) {
    return Repeat(MANY, [i](std::size_t j) { return '<' + Name(i + j) + '>'; }) +
           Repeat(MANY, [i](std::size_t j) { return "</" + Name(i + MANY - 1 - j) + '>'; });
  });
  shapes.AddDocument("carriage returns", Always("\r"));
  shapes.AddDocument("carriage returns and line feeds", Always("\r\n"));
  shapes.AddDocument("line feeds", Always("\n"));
  shapes.AddDocument("white space", Always(" "));
  shapes.AddDocument("closing brackets", Always("]] "));
  shapes.AddDocument("closing brackets in a row", Always("]"));
  shapes.AddDocument("closing brackets in a CDATA section", Always("]"), "<r><![CDATA[", "x]]></r>");
  shapes.AddDocument("hyphens in a comment", Always("- "), "<r><!--", "--></r>");
  shapes.AddDocument("question marks in an instruction", Always("?"), "<r><?a ", " ?></r>");
  shapes.AddDocument("characters of two octets", Always("\xC3\xA9"));
  shapes.AddDocument("characters of three octets", Always("\xE4\xB8\x80"));
  shapes.AddDocument("characters of four octets", Always("\xF0\x9F\x98\x80"));
  shapes.AddDocument("characters of one and of four octets", Always("a\xF0\x9F\x98\x80"));
  shapes.AddDocument("a long value", Always("v"), "<r a='", "'/>");
  shapes.AddDocument("a long value of references", Always("&lt;"), "<r a='", "'/>");
  shapes.AddDocument("a long value of line ends", Always("\r\n\t"), "<r a='", "'/>");
  shapes.AddDocument("short values of references", Always("<a b='&lt;'/>"));
}

void AddUnterminated(ShapeList &shapes) {
  shapes.AddDocument("a comment without end", Always("- "), "<r><!--", "");
  shapes.AddDocument("a CDATA section without end", Always("]] "), "<r><![CDATA[", "");
  shapes.AddDocument("an instruction without end", Always("? "), "<r><?a ", "");
  shapes.AddDocument("a tag without end", Always(" "), "<r", "");
  shapes.AddDocument("a value without end", Always("v "), "<r a='", "");
  shapes.AddDocument("a name without end", Always("n"), "<", "");
  shapes.AddDocument("a reference without end", Always("n"), "<r>&", "");
  shapes.AddDocument("nothing but less-than signs", Always("<"), "", "");
  shapes.AddDocument("content without end", Always("<a/>x"), "<r>", "");
  shapes.AddDocument("white space after the document element", Always(" "), "<r/>", "");
  shapes.AddDocument("comments before the document element", Always("<!---->"), "", "<r/>");
}

/// Documents with as many nodes as the limit allows, which take the most memory.
void AddMostNodes(ShapeList &shapes) {
  shapes.AddDocument("most elements", Thin("<a~/>", 1));
  shapes.AddDocument("most elements with an end tag", Thin("<a~></a>", 1));
  shapes.AddDocument("most elements with an attribute", Thin("<a b=''~/>", 2));
  shapes.AddDocument("most elements with a text", Thin("<a~>b</a>", 2));
  shapes.AddDocument("most comments", Thin("<!--~-->", 1));
  shapes.AddDocument("most instructions", Thin("<?a~?>", 1));
}

} // namespace

std::vector<HostileShape> MakeHostileShapes(const std::string &token) {
  ShapeList shapes(token);
  AddNames(shapes);
  AddNamespaces(shapes);
  AddContent(shapes);
  AddUnterminated(shapes);
  AddSignedContent(shapes);
  AddSignatureContent(shapes);
  AddMostNodes(shapes);
  AddMostNodesOfToken(shapes);
  return shapes.Take();
}

} // namespace Bench
