#pragma once

#include "quillon/system/DateTime.h"
#include "quillon/xml/Node.h"
#include "quillon/xml/QName.h"
#include "quillon/xml/security/Signature.h"
#include "ssoClient/Assertion.h"

#include <boost/optional.hpp>

#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

/**
 * How the elements of a verified assertion are read: in the order of the schema, nothing passed
 * over that could mean something. Every failure is a `ParseException`.
 */
namespace SsoClient::GeneralReader {

using Quillon::Xml::ElementNode;

/** `text` in quotes for a message, cut where it is long, as it may be an attacker's. */
std::string Quote(std::string_view text);

/** An element's name as written with its line and column, for messages. */
std::string Describe(const ElementNode& element);

/** Refuses an element that cannot be here. `where` says what is around it. */
[[noreturn]] void ThrowUnexpected(const ElementNode& element, const std::string& where);

/** What reading an element needs to know of the whole. */
struct ReaderContext
{
    const Quillon::Xml::Security::Signature* signature;
};

/**
 * Goes through the child elements of an element that has no text of its own. Blanks, comments and
 * processing instructions between elements are passed over; any other text is refused.
 */
class ElementCursor
{
public:
    explicit ElementCursor(const ElementNode& parent);

    /** The next child element; null at the end. */
    const ElementNode* Get() const noexcept { return _current; }
    bool IsAt(std::string_view localName) const noexcept;

    /** The next child, which must be a SAML element of that name. */
    const ElementNode& Take(std::string_view localName);

    /** The same, or null if another one is next. */
    const ElementNode* TakeIf(std::string_view localName);

    /** The next child, which must be an element of that name and namespace. */
    const ElementNode& TakeNamed(std::string_view localName, const char* namespaceUri);

    /** The next child, whatever it is, which must be there. */
    const ElementNode& TakeAny();

    void RequireEnd() const;

private:
    void MoveTo(const Quillon::Xml::Node* node);

    const ElementNode& _parent;
    const ElementNode* _current = nullptr;
};

/**
 * Refuses any attribute but the given ones and `xsi:type`. Hints where a schema lies are allowed,
 * as they say nothing.
 */
void CheckAttributeNames(
    const ElementNode& element, std::initializer_list<std::string_view> allowed);

/** The same; and `xsi:type`, if it is there, must name what the element is anyway. */
void CheckAttributes(
    const ReaderContext& context,
    const ElementNode& element,
    std::initializer_list<std::string_view> allowed,
    const Quillon::Xml::QName& expectedType);

/** A type of SAML's schema. */
Quillon::Xml::QName SamlType(const char* name);

/** Whether an attribute is `xsi:type`, a declaration, or a hint where a schema lies. */
bool IsAboutTheSchema(const ElementNode& element, const Quillon::Xml::Attribute& attribute);

/** What an attribute's name stands for; an unprefixed one lies in no namespace. */
Quillon::Xml::QName GetAttributeName(
    const ElementNode& element, const Quillon::Xml::Attribute& attribute);

/** The type that `xsi:type` names; none without one. Refused unless the signature covers it. */
boost::optional<Quillon::Xml::QName> GetCoveredType(
    const ReaderContext& context, const ElementNode& element);

/** The type that `xsi:type` names, where it decides nothing: none if it is not covered. */
boost::optional<Quillon::Xml::QName> FindCoveredType(
    const ReaderContext& context, const ElementNode& element);

boost::optional<std::string> GetOptional(const ElementNode& element, std::string_view name);
std::string GetRequired(const ElementNode& element, std::string_view name);
boost::optional<Quillon::System::DateTime> GetOptionalDate(
    const ElementNode& element, std::string_view name);
Quillon::System::DateTime GetRequiredDate(const ElementNode& element, std::string_view name);
bool GetFlag(const ElementNode& element, std::string_view name);
boost::optional<unsigned long long> GetOptionalCount(
    const ElementNode& element, std::string_view name);

/**
 * The text of an element that holds nothing else; empty if there is none. A comment or processing
 * instruction is refused where the text is not the same with and without it: signatures do not
 * cover comments, so one may have been put in to cut the value for another reader.
 */
std::string GetText(const ElementNode& element);

/** The same without the blanks around it, for URIs; must not be empty. */
std::string GetUri(const ElementNode& element);

/** The octets that the element's text stands for. */
std::vector<unsigned char> ReadBase64(const ElementNode& element);

/** The element and all that is in it. Text that a comment cuts is one text again. */
AssertionXml ReadXml(const ElementNode& element);

/** What may stand in an `AttributeValue` beside its text. */
bool HoldsElements(const ElementNode& element) noexcept;

/** The element in exclusive canonical form, which is all of it that a signature covers. */
std::string ToCoveredText(const ElementNode& element);

} // namespace SsoClient::GeneralReader
