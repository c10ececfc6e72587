// SPDX-License-Identifier: Apache-2.0
/// @file
/// The builders that every outgoing message is composed of: small immutable descriptions of XML elements.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// Knows how to make one element. Immutable once its factory has returned, except a composite that its maker still fills;
/// may then be shared by several trees and built on several threads at once.
class XMLBaseBuilder {
public:
  /// Makes the element, with all below it, and puts it into `out` in place of what that held.
  /// @throws Tarvel::InvalidArgumentException for a text or attribute value that XML 1.0 cannot carry.
  virtual void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const = 0;

protected:
  XMLBaseBuilder() = default;
  XMLBaseBuilder(const XMLBaseBuilder &) = default;
  XMLBaseBuilder &operator=(const XMLBaseBuilder &) = default;
  ~XMLBaseBuilder() = default;
};

using XMLBuilderPtr = std::shared_ptr<const XMLBaseBuilder>;

/// Attribute values by qualified name, in the order in which they are written: byte by byte of the names. Namespace
/// declarations are ordinary entries. A literal list that repeats a name keeps the first value.
using XMLAttributes = std::map<std::string, std::string>;

/// An element without content.
XMLBuilderPtr ElementBuilder(const std::string &prefix, const std::string &name, XMLAttributes attributes);
XMLBuilderPtr ElementBuilder(const std::string &prefix, const std::string &name);

/// An element whose only child is a text node, also when `text` is empty. The text is given unescaped, and is wiped when
/// the builder goes, since it may be a password.
XMLBuilderPtr TextElementBuilder(const std::string &prefix, const std::string &name, XMLAttributes attributes,
                                 const std::string &text);
XMLBuilderPtr TextElementBuilder(const std::string &prefix, const std::string &name, const std::string &text);

/// What another builder makes, with further child elements behind those that it already has.
class XMLCompositeBuilder final : public XMLBaseBuilder {
public:
  explicit XMLCompositeBuilder(XMLBuilderPtr base);

  /// Appends a child and returns this composite. Null is ignored, so that an optional part need not be checked first.
  XMLCompositeBuilder &Add(XMLBuilderPtr child);

  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  XMLBuilderPtr m_base;
  std::vector<XMLBuilderPtr> m_children;
};

using XMLCompositePtr = std::shared_ptr<XMLCompositeBuilder>;

/// An element that exists already. Each build hands out this very node, not a copy: it fits into one tree only, and a
/// second one refuses it.
class PreBuiltElementImpl final : public XMLBaseBuilder {
public:
  explicit PreBuiltElementImpl(Tarvel::Ref<Tarvel::Xml::ElementNode> element);

  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  Tarvel::Ref<Tarvel::Xml::ElementNode> m_element;
};

/// Builds `child` and makes it the last child of `parent`.
void BuildAndAppendChildTo(Tarvel::Xml::ElementNode *parent, const XMLBuilderPtr &child);

/// Defines the attribute, a name and its value, on `element`.
void ElementDefineAttribute(Tarvel::Xml::ElementNode *element, const XMLAttributes::value_type &attribute);

/// Builds the tree and returns it as XML text, without an XML declaration. Text and attribute values are ASCII, with
/// references for all other characters: requests have no charset in their media type, so a service may take them for
/// ISO-8859-1. Names, comments and processing instructions of a pre-built element stay UTF-8.
std::string SerializeToXML(const XMLBuilderPtr &builder);

} // namespace SsoClient
