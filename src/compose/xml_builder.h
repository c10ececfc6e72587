// SPDX-License-Identifier: Apache-2.0
/// @file
/// Builders: small immutable descriptions of XML elements. All outgoing messages are composed of them.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// Makes one element. Immutable after its factory has returned (a composite: after its last child has been added). From
/// then on several threads may build it at once, and several trees may share it. The exception is a builder that
/// contains a `PreBuiltElementImpl`: only one tree can have that element.
class XMLBaseBuilder {
public:
  /// Sets `out` to the element with its content.
  /// @throws Tarvel::InvalidArgumentException for a text or attribute value that XML 1.0 cannot represent.
  virtual void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const = 0;

protected:
  XMLBaseBuilder() = default;
  XMLBaseBuilder(const XMLBaseBuilder &) = default;
  XMLBaseBuilder &operator=(const XMLBaseBuilder &) = default;
  ~XMLBaseBuilder() = default;
};

using XMLBuilderPtr = std::shared_ptr<const XMLBaseBuilder>;

/// Attribute values by qualified name. They are written in the byte order of the names. Namespace declarations are ordinary
/// entries. If an initialiser list repeats a name, the first value is used.
using XMLAttributes = std::map<std::string, std::string>;

/// An element without content.
XMLBuilderPtr ElementBuilder(const std::string &prefix, const std::string &name, XMLAttributes attributes);
XMLBuilderPtr ElementBuilder(const std::string &prefix, const std::string &name);

/// An element whose only child is a text node, even if `text` is empty. Callers do not escape `text`. The builder's
/// copy is wiped when the builder is destroyed, because it may be a password.
XMLBuilderPtr TextElementBuilder(const std::string &prefix, const std::string &name, XMLAttributes attributes,
                                 const std::string &text);
XMLBuilderPtr TextElementBuilder(const std::string &prefix, const std::string &name, const std::string &text);

/// The element of another builder, with further child elements after its own.
class XMLCompositeBuilder final : public XMLBaseBuilder {
public:
  explicit XMLCompositeBuilder(XMLBuilderPtr base);

  /// Appends a child and returns this composite. Null is ignored, so that callers need not check an optional part.
  XMLCompositeBuilder &Add(XMLBuilderPtr child);

  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  XMLBuilderPtr m_base;
  std::vector<XMLBuilderPtr> m_children;
};

using XMLCompositePtr = std::shared_ptr<XMLCompositeBuilder>;

/// An element that exists already. Each build returns the same node, not a copy. So the node can be added to one tree
/// only: a second tree refuses it.
class PreBuiltElementImpl final : public XMLBaseBuilder {
public:
  explicit PreBuiltElementImpl(Tarvel::Ref<Tarvel::Xml::ElementNode> element);

  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  Tarvel::Ref<Tarvel::Xml::ElementNode> m_element;
};

/// Builds `child` and makes it the last child of `parent`.
void BuildAndAppendChildTo(Tarvel::Xml::ElementNode *parent, const XMLBuilderPtr &child);

/// Defines `attribute` on `element`.
void ElementDefineAttribute(Tarvel::Xml::ElementNode *element, const XMLAttributes::value_type &attribute);

/// Builds the tree and returns it as XML text without an XML declaration. Text and attribute values are ASCII, with character
/// references for all other characters: the media type of requests has no charset, so a service may read them as ISO-8859-1.
/// Names, comments and processing instructions of a pre-built element stay UTF-8.
std::string SerializeToXML(const XMLBuilderPtr &builder);

} // namespace SsoClient
