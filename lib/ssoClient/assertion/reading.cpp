#include "ssoClient/assertion/reading.h"

#include "quillon/StringUtil.h"
#include "quillon/xml/security/Identifiers.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"

#include <algorithm>
#include <charconv>

namespace SsoClient::GeneralReader {

using Quillon::System::DateTime;
using Quillon::Xml::AsElement;
using Quillon::Xml::AsText;
using Quillon::Xml::Attribute;
using Quillon::Xml::Node;
using Quillon::Xml::QName;
using Quillon::Xml::TextNode;

namespace {

constexpr std::string_view Blanks = "\t\n\r ";

bool IsBlank(std::string_view text) noexcept
{
    return text.find_first_not_of(Blanks) == std::string_view::npos;
}

std::string_view Trim(std::string_view text) noexcept
{
    const std::size_t first = text.find_first_not_of(Blanks);
    return first == std::string_view::npos
               ? std::string_view()
               : text.substr(first, text.find_last_not_of(Blanks) + 1 - first);
}

[[noreturn]] void ThrowBadValue(
    const ElementNode& element, std::string_view name, const std::string& problem)
{
    throw ParseException(
        "Attribute " + Quote(name) + " of " + Describe(element) + " is " + problem);
}

std::string_view GetTypePrefix(std::string_view typeName) noexcept
{
    const std::size_t colon = typeName.find(':');
    return colon == std::string_view::npos ? std::string_view() : typeName.substr(0, colon);
}

const Attribute* FindType(const ElementNode& element) noexcept
{
    return element.FindAttribute("type", Wire::XsiNamespace);
}

/** Whether the prefix of a type's name is declared, and the signature covers that. */
bool IsCovered(const ReaderContext& context, const ElementNode& element, std::string_view typeName)
{
    const std::string_view prefix = GetTypePrefix(typeName);
    std::string_view uri;
    return (prefix.empty() || element.LookupNamespace(prefix, uri))
           && context.signature->CoversBinding(element, prefix);
}

void AppendText(const TextNode& node, AssertionXml& parent)
{
    if (parent.children.empty() || parent.children.back().IsElement()) {
        parent.children.emplace_back();
    }
    parent.children.back().text += node.GetText();
}

} // namespace

std::string Quote(std::string_view text)
{
    constexpr std::size_t MaxLength = 200;
    if (text.size() <= MaxLength) {
        return "'" + std::string(text) + "'";
    }
    // Not in the middle of a character.
    std::size_t length = MaxLength;
    while (length > 0 && (static_cast<unsigned char>(text[length]) & 0xC0U) == 0x80U) {
        --length;
    }
    return "'" + std::string(text.substr(0, length)) + "...'";
}

std::string Describe(const ElementNode& element)
{
    return Quote(element.GetName()) + " at " + std::to_string(element.GetLine()) + ","
           + std::to_string(element.GetColumn());
}

void ThrowUnexpected(const ElementNode& element, const std::string& where)
{
    std::string_view uri;
    element.LookupNamespace(element.GetPrefix(), uri);
    throw ParseException(
        "Unexpected element " + Describe(element) + " of namespace " + Quote(uri) + " in " + where);
}

ElementCursor::ElementCursor(const ElementNode& parent)
    : _parent(parent)
{
    MoveTo(parent.GetFirstChild());
}

bool ElementCursor::IsAt(std::string_view localName) const noexcept
{
    return _current != nullptr && _current->HasQName(localName, Wire::SamlNamespace);
}

const ElementNode& ElementCursor::Take(std::string_view localName)
{
    return TakeNamed(localName, Wire::SamlNamespace);
}

const ElementNode& ElementCursor::TakeNamed(std::string_view localName, const char* namespaceUri)
{
    if (_current == nullptr || !_current->HasQName(localName, namespaceUri)) {
        throw ParseException(
            "Expected element '" + std::string(localName) + "' in " + Describe(_parent) + ", found "
            + (_current == nullptr ? "its end" : Describe(*_current)));
    }
    return TakeAny();
}

const ElementNode* ElementCursor::TakeIf(std::string_view localName)
{
    return IsAt(localName) ? &TakeAny() : nullptr;
}

const ElementNode& ElementCursor::TakeAny()
{
    const ElementNode& taken = *_current;
    MoveTo(taken.GetNextSibling());
    return taken;
}

void ElementCursor::RequireEnd() const
{
    if (_current != nullptr) {
        ThrowUnexpected(*_current, Describe(_parent));
    }
}

void ElementCursor::MoveTo(const Node* node)
{
    for (; node != nullptr && AsElement(node) == nullptr; node = node->GetNextSibling()) {
        const TextNode* text = AsText(node);
        if (text != nullptr && !IsBlank(text->GetText())) {
            throw ParseException("Unexpected text in " + Describe(_parent));
        }
    }
    _current = AsElement(node);
}

bool IsAboutTheSchema(const ElementNode& element, const Attribute& attribute)
{
    if (attribute.IsNamespaceDeclaration()) {
        return true;
    }
    // [XML Schema Part 1, 2.6.3]
    const QName name = GetAttributeName(element, attribute);
    return name == QName(Wire::XsiNamespace, "type")
           || name == QName(Wire::XsiNamespace, "schemaLocation")
           || name == QName(Wire::XsiNamespace, "noNamespaceSchemaLocation");
}

QName GetAttributeName(const ElementNode& element, const Attribute& attribute)
{
    QName name;
    ResolveQName(&element, attribute.name, std::string_view(), name);
    return name;
}

void CheckAttributeNames(
    const ElementNode& element, std::initializer_list<std::string_view> allowed)
{
    for (const Attribute& attribute : element.GetAttributes()) {
        const bool isAllowed =
            std::find(allowed.begin(), allowed.end(), attribute.name) != allowed.end();
        if (!isAllowed && !IsAboutTheSchema(element, attribute)) {
            throw ParseException(
                "Unexpected attribute " + Quote(attribute.name) + " of " + Describe(element));
        }
    }
}

void CheckAttributes(
    const ReaderContext& context,
    const ElementNode& element,
    std::initializer_list<std::string_view> allowed,
    const QName& expectedType)
{
    CheckAttributeNames(element, allowed);
    const boost::optional<QName> type = GetCoveredType(context, element);
    if (type && *type != expectedType) {
        throw ParseException(
            "The xsi:type of " + Describe(element) + " is " + Quote(type->ToString())
            + ", expected " + Quote(expectedType.ToString()));
    }
}

QName SamlType(const char* name)
{
    return {Wire::SamlNamespace, name};
}

boost::optional<QName> GetCoveredType(const ReaderContext& context, const ElementNode& element)
{
    const Attribute* attribute = FindType(element);
    if (attribute == nullptr) {
        return boost::none;
    }
    const std::string_view name = Trim(attribute->value);
    if (!IsCovered(context, element, name)) {
        throw ParseException(
            "The signature does not cover what the prefix of the xsi:type " + Quote(name) + " of "
            + Describe(element) + " is bound to");
    }
    QName type;
    ResolveTypeName(&element, name, type);
    return type;
}

boost::optional<QName> FindCoveredType(const ReaderContext& context, const ElementNode& element)
{
    const Attribute* attribute = FindType(element);
    return attribute != nullptr && IsCovered(context, element, Trim(attribute->value))
               ? GetCoveredType(context, element)
               : boost::none;
}

boost::optional<std::string> GetOptional(const ElementNode& element, std::string_view name)
{
    const Attribute* attribute = element.FindAttribute(name);
    return attribute == nullptr ? boost::optional<std::string>()
                                : boost::optional<std::string>(std::string(attribute->value));
}

std::string GetRequired(const ElementNode& element, std::string_view name)
{
    const Attribute* attribute = element.FindAttribute(name);
    if (attribute == nullptr || attribute->value.empty()) {
        throw ParseException(Describe(element) + " has no attribute " + Quote(name));
    }
    return std::string(attribute->value);
}

boost::optional<DateTime> GetOptionalDate(const ElementNode& element, std::string_view name)
{
    const Attribute* attribute = element.FindAttribute(name);
    if (attribute == nullptr) {
        return boost::none;
    }
    try {
        return DateTime(attribute->value);
    } catch (const Quillon::System::DateTimeFormatException&) {
        ThrowBadValue(element, name, Quote(attribute->value) + ", which is not a date");
    }
}

DateTime GetRequiredDate(const ElementNode& element, std::string_view name)
{
    GetRequired(element, name);
    return *GetOptionalDate(element, name);
}

bool GetFlag(const ElementNode& element, std::string_view name)
{
    const Attribute* attribute = element.FindAttribute(name);
    if (attribute == nullptr || attribute->value == "false" || attribute->value == "0") {
        return false;
    }
    if (attribute->value != "true" && attribute->value != "1") {
        ThrowBadValue(element, name, Quote(attribute->value) + ", which is not a Boolean");
    }
    return true;
}

boost::optional<unsigned long long> GetOptionalCount(
    const ElementNode& element, std::string_view name)
{
    const Attribute* attribute = element.FindAttribute(name);
    if (attribute == nullptr) {
        return boost::none;
    }
    unsigned long long value = 0;
    const std::string_view text = attribute->value;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), value);
    if (result.ec != std::errc() || result.ptr != text.data() + text.size()) {
        ThrowBadValue(element, name, Quote(text) + ", which is not a non-negative integer");
    }
    return value;
}

std::string GetText(const ElementNode& element)
{
    const TextNode* only = nullptr;
    for (const Node* node = element.GetFirstChild(); node != nullptr;
         node = node->GetNextSibling()) {
        if (const ElementNode* child = AsElement(node)) {
            ThrowUnexpected(*child, Describe(element) + ", which must hold text alone");
        }
        const TextNode* text = AsText(node);
        if (text != nullptr && only != nullptr) {
            throw ParseException(
                "A comment or processing instruction cuts the value of " + Describe(element));
        }
        only = text != nullptr ? text : only;
    }
    return only == nullptr ? std::string() : std::string(only->GetText());
}

std::string GetUri(const ElementNode& element)
{
    const std::string text = GetText(element);
    const std::string_view uri = Trim(text);
    if (uri.empty()) {
        throw ParseException(Describe(element) + " has no value");
    }
    return std::string(uri);
}

std::vector<unsigned char> ReadBase64(const ElementNode& element)
{
    std::vector<unsigned char> bytes;
    try {
        Quillon::StringUtil::Base64Decode(GetText(element), bytes);
    } catch (const Quillon::Base64FormatException& error) {
        throw ParseException(Describe(element) + " is not Base64: " + error.what());
    }
    return bytes;
}

AssertionXml ReadXml(const ElementNode& element)
{
    AssertionXml xml;
    ResolveTypeName(&element, element.GetName(), xml.name);
    for (const Attribute& attribute : element.GetAttributes()) {
        if (!attribute.IsNamespaceDeclaration()) {
            xml.attributes.push_back(
                {GetAttributeName(element, attribute), std::string(attribute.value)});
        }
    }
    for (const Node* node = element.GetFirstChild(); node != nullptr;
         node = node->GetNextSibling()) {
        if (const ElementNode* child = AsElement(node)) {
            xml.children.push_back(ReadXml(*child));
        } else if (const TextNode* text = AsText(node)) {
            AppendText(*text, xml);
        }
    }
    return xml;
}

bool HoldsElements(const ElementNode& element) noexcept
{
    const Node* node = element.GetFirstChild();
    while (node != nullptr && AsElement(node) == nullptr) {
        node = node->GetNextSibling();
    }
    return node != nullptr;
}

std::string ToCoveredText(const ElementNode& element)
{
    return ToCanonicalXml(&element, Quillon::Xml::Security::ExclusiveC14n);
}

} // namespace SsoClient::GeneralReader
