#include "ssoClient/message/xmlCommonBuilders.h"

#include "quillon/PanicVerify.h"
#include "ssoClient/wire/xmlReading.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <string.h>
#include <utility>

using Quillon::Ref;
using Quillon::Xml::ElementNode;

namespace SsoClient {

namespace {

constexpr char Unit[] = "lib/ssoClient/xmlCommonBuilders";

void CreateElement(
    const std::string& prefix,
    const std::string& localName,
    const AttributeMap& attributes,
    Ref<ElementNode>& out)
{
    Quillon::Xml::CreateElementNode(prefix, localName, out);
    for (const AttributeMap::value_type& attribute : attributes) {
        ElementDefineAttribute(out.get(), attribute);
    }
}

class ElementBuilderImpl final : public XMLBaseBuilder
{
public:
    ElementBuilderImpl(std::string prefix, std::string localName, AttributeMap attributes) noexcept
        : _prefix(std::move(prefix))
        , _localName(std::move(localName))
        , _attributes(std::move(attributes))
    {}

    void build(Ref<ElementNode>& out) const override
    {
        CreateElement(_prefix, _localName, _attributes, out);
    }

private:
    std::string _prefix;
    std::string _localName;
    AttributeMap _attributes;
};

class TextElementBuilderImpl final : public XMLBaseBuilder
{
public:
    TextElementBuilderImpl(
        std::string prefix, std::string localName, AttributeMap attributes, const std::string& text)
        : _prefix(std::move(prefix))
        , _localName(std::move(localName))
        , _attributes(std::move(attributes))
        , _text(text)
    {}

    /** The text may be a password: the builder keeps the only copy, and wipes it. */
    ~TextElementBuilderImpl() { explicit_bzero(_text.data(), _text.size()); }
    TextElementBuilderImpl(const TextElementBuilderImpl&) = delete;
    TextElementBuilderImpl& operator=(const TextElementBuilderImpl&) = delete;

    void build(Ref<ElementNode>& out) const override
    {
        CreateElement(_prefix, _localName, _attributes, out);
        Ref<Quillon::Xml::TextNode> text;
        Quillon::Xml::CreateTextNode(text);
        text->SetText(_text);
        out->AppendChild(text.get());
    }

private:
    std::string _prefix;
    std::string _localName;
    AttributeMap _attributes;
    std::string _text;
};

class PreBuiltElementImpl final : public XMLBaseBuilder
{
public:
    explicit PreBuiltElementImpl(Ref<ElementNode> element) noexcept
        : _element(std::move(element))
    {}

    void build(Ref<ElementNode>& out) const override { out = _element; }

private:
    Ref<ElementNode> _element;
};

} // namespace

XMLCompositeBuilder::XMLCompositeBuilder(XMLBuilderPtr rootBuilder)
    : _rootBuilder(std::move(rootBuilder))
{
    if (_rootBuilder == nullptr) {
        Quillon::PanicVerify("rootBuilder != __null", Unit, 168);
    }
}

XMLCompositeBuilder& XMLCompositeBuilder::Add(XMLBuilderPtr child)
{
    if (child != nullptr) {
        _children.push_back(std::move(child));
    }
    return *this;
}

void XMLCompositeBuilder::build(Ref<ElementNode>& out) const
{
    _rootBuilder->build(out);
    for (const XMLBuilderPtr& child : _children) {
        BuildAndAppendChildTo(out.get(), *child);
    }
}

XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName)
{
    return ElementBuilder(std::move(prefix), std::move(localName), AttributeMap());
}

XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName, AttributeMap attributes)
{
    return boost::make_shared<ElementBuilderImpl>(
        std::move(prefix), std::move(localName), std::move(attributes));
}

XMLBuilderPtr TextElementBuilder(std::string prefix, std::string localName, const std::string& text)
{
    return TextElementBuilder(std::move(prefix), std::move(localName), AttributeMap(), text);
}

XMLBuilderPtr TextElementBuilder(
    std::string prefix, std::string localName, AttributeMap attributes, const std::string& text)
{
    return boost::make_shared<TextElementBuilderImpl>(
        std::move(prefix), std::move(localName), std::move(attributes), text);
}

XMLBuilderPtr InsertSamlTokenBuilder(const SamlToken& token)
{
    Ref<Quillon::Xml::Document> document;
    ParseXML(token.ToXml(), document);
    return boost::make_shared<PreBuiltElementImpl>(Ref<ElementNode>(document->GetRootElement()));
}

void BuildAndAppendChildTo(ElementNode* parent, const XMLBaseBuilder& child)
{
    Ref<ElementNode> element;
    child.build(element);
    parent->AppendChild(element.get());
}

void ElementDefineAttribute(ElementNode* element, const AttributeMap::value_type& attribute)
{
    element->DefineAttribute(attribute.first, attribute.second);
}

} // namespace SsoClient
