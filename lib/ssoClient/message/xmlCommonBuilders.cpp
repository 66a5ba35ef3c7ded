#include "ssoClient/message/xmlCommonBuilders.h"

#include "quillon/PanicVerify.h"
#include "quillon/Wiped.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/xmlReading.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <atomic>
#include <utility>

using Quillon::Ref;
using Quillon::Xml::ElementNode;

namespace SsoClient {

namespace {

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

    void build(Ref<ElementNode>& out) const override
    {
        CreateElement(_prefix, _localName, _attributes, out);
        Ref<Quillon::Xml::TextNode> text;
        Quillon::Xml::CreateTextNode(text);
        // First the one, then the other: a text that is refused is named by its element.
        out->AppendChild(text.get());
        text->SetText(_text.Get());
    }

private:
    std::string _prefix;
    std::string _localName;
    AttributeMap _attributes;
    Quillon::Wiped _text; // may be a password
};

/**
 * A copy of a parsed element, comments and all. It is read anew from its text, which costs as much
 * as reading it the first time did.
 */
Ref<ElementNode> CopyElement(const ElementNode& element)
{
    const Ref<Quillon::StringWriter> text = Quillon::CreateStringWriter();
    Quillon::Xml::Serialize(&element, text.get());
    Ref<Quillon::Xml::Document> document;
    ParseXML(text->GetString(), document);
    return Ref<ElementNode>(document->GetRootElement());
}

class PreBuiltElementImpl final : public XMLBaseBuilder
{
public:
    explicit PreBuiltElementImpl(Ref<ElementNode> element) noexcept
        : _element(std::move(element))
    {}

    void build(Ref<ElementNode>& out) const override { out = _element; }

    /**
     * The first call appends the element itself, the others copies of it. A copy reads only what is
     * below the element and takes no reference to it: both stay as they are while the thread of the
     * first call goes on with the tree that the element now stands in.
     */
    void AppendTo(ElementNode& parent) const
    {
        if (_isAppended.exchange(true) || _element->GetParent() != nullptr) {
            parent.AppendChild(CopyElement(*_element).get());
        } else {
            parent.AppendChild(_element.get());
        }
    }

private:
    Ref<ElementNode> _element;
    mutable std::atomic<bool> _isAppended{false};
};

} // namespace

XMLCompositeBuilder::XMLCompositeBuilder(XMLBuilderPtr rootBuilder)
    : _rootBuilder(std::move(rootBuilder))
{
    if (_rootBuilder == nullptr) {
        Quillon::PanicVerify(
            "rootBuilder != __null",
            AssertionPlaces::XmlCommonBuilders,
            AssertionPlaces::CompositeWithoutRoot);
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

boost::shared_ptr<XMLCompositeBuilder> Composite(
    XMLBuilderPtr root, std::vector<XMLBuilderPtr> children)
{
    auto composite = boost::make_shared<XMLCompositeBuilder>(std::move(root));
    for (XMLBuilderPtr& child : children) {
        composite->Add(std::move(child));
    }
    return composite;
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
    if (const auto* preBuilt = dynamic_cast<const PreBuiltElementImpl*>(&child)) {
        preBuilt->AppendTo(*parent);
        return;
    }
    Ref<ElementNode> element;
    child.build(element);
    parent->AppendChild(
        element->GetParent() == nullptr ? element.get() : CopyElement(*element).get());
}

void ElementDefineAttribute(ElementNode* element, const AttributeMap::value_type& attribute)
{
    element->DefineAttribute(attribute.first, attribute.second);
}

} // namespace SsoClient
