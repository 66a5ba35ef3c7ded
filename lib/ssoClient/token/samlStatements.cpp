#include "ssoClient/token/samlStatements.h"

#include "ssoClient/wire/wireNames.h"

#include <utility>

namespace SsoClient {

using Quillon::Xml::ElementNode;
using Quillon::Xml::Node;

namespace {

constexpr std::size_t UsualAttributes = 8;

std::size_t CountSiblings(const Node* node) noexcept
{
    std::size_t count = 0;
    for (; node != nullptr; node = node->GetNextSibling()) {
        ++count;
    }
    return count;
}

/**
 * White space alone is an empty value; any other text is kept with its blanks.
 *
 * @param last  the value before, which has the right name; null for the first.
 */
void ParseAttributeValueElement(
    NodeFilterIterator& iterator, const ElementNode*& last, std::string& value)
{
    const ElementNode* element = IteratorToElement(iterator);
    if (last == nullptr || element == nullptr || !element->RepeatsTagOf(*last)) {
        RequireElementQName(element, "AttributeValue", Wire::SamlNamespace);
    }
    last = element;
    if (iterator.FirstChild() != nullptr) {
        RequireTextualContent(iterator, value);
    }
    iterator.MoveToSibling();
}

} // namespace

void TryParseAdviceElement(NodeFilterIterator& iterator, boost::optional<AdviceType>& advice)
{
    const ElementNode* element = IteratorToElement(iterator);
    if (!ElementQNameIs(element, "Advice", Wire::SamlNamespace)) {
        return;
    }
    RequireNoAttributes(element);

    AdviceType result;
    NodeFilterIterator child = iterator.GetChild();
    do {
        result.RSAAdvice.emplace_back();
        ParseRsaAdviceElement(child, result.RSAAdvice.back());
    } while (!child.IsAtEnd());
    advice = std::move(result);
    iterator.MoveToSibling();
}

void ParseRsaAdviceElement(NodeFilterIterator& iterator, Advice& advice)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "RSAAdvice", Wire::RsaNamespace);
    RequireElementAttributesNames(element, {"AdviceSource"}, {});
    advice.source = GetTextAttribute(element, "AdviceSource");

    NodeFilterIterator child = iterator.GetChild();
    do {
        AttributeType attribute;
        ParseAttributeElement(child, attribute);
        advice.attributes.push_back(
            {std::move(attribute.Name), std::move(attribute.AttributeValue)});
    } while (!child.IsAtEnd());
    iterator.MoveToSibling();
}

void ParseAuthnStatementElement(NodeFilterIterator& iterator, AuthnStatementType& statement)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "AuthnStatement", Wire::SamlNamespace);
    RequireElementAttributesNames(element, {"AuthnInstant"}, {});
    GetDateAttribute(element, "AuthnInstant", statement.AuthnInstant);

    NodeFilterIterator child = iterator.GetChild();
    ParseAuthnContextElement(child, statement.AuthnContext);
    RequireNothingAfter(child, "AuthnContext");
    iterator.MoveToSibling();
}

void ParseAuthnContextElement(NodeFilterIterator& iterator, AuthnContextType& context)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "AuthnContext", Wire::SamlNamespace);
    RequireNoAttributes(element);

    NodeFilterIterator child = iterator.GetChild();
    RequireElementQName(IteratorToElement(child), "AuthnContextClassRef", Wire::SamlNamespace);
    RequireTextualContent(child, context.AuthnContextClassRef);
    RequireNothingAfter(child.MoveToSibling(), "AuthnContextClassRef");
    iterator.MoveToSibling();
}

void ParseAttributeStatementElement(NodeFilterIterator& iterator, AttributeStatementType& statement)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "AttributeStatement", Wire::SamlNamespace);
    RequireNoAttributes(element);

    NodeFilterIterator child = iterator.GetChild();
    statement.Attribute.reserve(UsualAttributes);
    do {
        statement.Attribute.emplace_back();
        ParseAttributeElement(child, statement.Attribute.back());
    } while (!child.IsAtEnd());
    iterator.MoveToSibling();
}

void ParseAttributeElement(NodeFilterIterator& iterator, AttributeType& attribute)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "Attribute", Wire::SamlNamespace);
    // NameFormat is required although SAML lets it be absent [SAML-CORE 2.7.3.1].
    RequireElementAttributesNames(element, {"Name", "NameFormat"}, {"FriendlyName"});
    attribute.Name = GetTextAttribute(element, "Name");
    attribute.NameFormat = GetTextAttribute(element, "NameFormat");
    attribute.FriendlyName = GetTextAttribute(element, "FriendlyName");

    NodeFilterIterator child = iterator.GetChild();
    attribute.AttributeValue.reserve(CountSiblings(child.GetNode()));
    const ElementNode* last = nullptr;
    while (!child.IsAtEnd()) {
        attribute.AttributeValue.emplace_back();
        ParseAttributeValueElement(child, last, attribute.AttributeValue.back());
    }
    iterator.MoveToSibling();
}

} // namespace SsoClient
