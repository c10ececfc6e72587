// SPDX-License-Identifier: Apache-2.0

#include "compose/xml_builder.h"

#include <tarvel/core/secret_text.h>
#include <tarvel/io/writer.h>

#include <utility>

namespace SsoClient {

namespace {

using ElementRef = Tarvel::Ref<Tarvel::Xml::ElementNode>;

class ElementBuilderImpl final : public XMLBaseBuilder {
public:
  ElementBuilderImpl(std::string prefix, std::string name, XMLAttributes attributes)
      : m_prefix(std::move(prefix)), m_name(std::move(name)), m_attributes(std::move(attributes)) {}

  void build(ElementRef &out) const override {
    Tarvel::Xml::CreateElementNode(m_prefix, m_name, out);
    for (const auto &attribute : m_attributes) {
      ElementDefineAttribute(out.get(), attribute);
    }
  }

private:
  std::string m_prefix;
  std::string m_name;
  XMLAttributes m_attributes;
};

class TextElementBuilderImpl final : public XMLBaseBuilder {
public:
  /// `text` is copied directly into its field: a copy in a parameter could stay on the stack.
  TextElementBuilderImpl(std::string prefix, std::string name, XMLAttributes attributes, const std::string &text)
      : m_element(std::move(prefix), std::move(name), std::move(attributes)), m_text(text) {}

  void build(ElementRef &out) const override {
    m_element.build(out);
    out->AppendText(m_text.Get());
  }

private:
  ElementBuilderImpl m_element;
  Tarvel::SecretText m_text;
};

} // namespace

XMLBuilderPtr ElementBuilder(const std::string &prefix, const std::string &name, XMLAttributes attributes) {
  return std::make_shared<const ElementBuilderImpl>(prefix, name, std::move(attributes));
}

XMLBuilderPtr ElementBuilder(const std::string &prefix, const std::string &name) {
  return ElementBuilder(prefix, name, XMLAttributes());
}

XMLBuilderPtr TextElementBuilder(const std::string &prefix, const std::string &name, XMLAttributes attributes,
                                 const std::string &text) {
  return std::make_shared<const TextElementBuilderImpl>(prefix, name, std::move(attributes), text);
}

XMLBuilderPtr TextElementBuilder(const std::string &prefix, const std::string &name, const std::string &text) {
  return TextElementBuilder(prefix, name, XMLAttributes(), text);
}

XMLCompositeBuilder::XMLCompositeBuilder(XMLBuilderPtr base) : m_base(std::move(base)) {}

XMLCompositeBuilder &XMLCompositeBuilder::Add(XMLBuilderPtr child) {
  if (child) {
    m_children.push_back(std::move(child));
  }
  return *this;
}

void XMLCompositeBuilder::build(ElementRef &out) const {
  m_base->build(out);
  for (const XMLBuilderPtr &child : m_children) {
    BuildAndAppendChildTo(out.get(), child);
  }
}

PreBuiltElementImpl::PreBuiltElementImpl(ElementRef element) : m_element(std::move(element)) {}

void PreBuiltElementImpl::build(ElementRef &out) const {
  out = m_element;
}

void BuildAndAppendChildTo(Tarvel::Xml::ElementNode *parent, const XMLBuilderPtr &child) {
  ElementRef element;
  child->build(element);
  parent->AppendChild(element.get());
}

void ElementDefineAttribute(Tarvel::Xml::ElementNode *element, const XMLAttributes::value_type &attribute) {
  element->DefineAttribute(attribute.first, attribute.second);
}

std::string SerializeToXML(const XMLBuilderPtr &builder) {
  ElementRef element;
  builder->build(element);
  const Tarvel::Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  element->WriteTo(*writer, Tarvel::Xml::CharacterForm::REFERENCES);
  return writer->TakeText();
}

} // namespace SsoClient
