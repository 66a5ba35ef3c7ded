#include "ssoClient/assertion/principals.h"

#include "quillon/StringUtil.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/reading.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>

namespace SsoClient::GeneralReader {

namespace {

constexpr char EmailFormat[] = "urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress";
constexpr char WindowsFormat[] =
    "urn:oasis:names:tc:SAML:1.1:nameid-format:WindowsDomainQualifiedName";
constexpr char X509Format[] = "urn:oasis:names:tc:SAML:1.1:nameid-format:X509SubjectName";
constexpr char PersistentFormat[] = "urn:oasis:names:tc:SAML:2.0:nameid-format:persistent";
constexpr char UnspecifiedFormat[] = "urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified";

/** What a UPN is called beside the claim of this build. */
constexpr const char* UpnFormats[] = {
    "http://schemas.xmlsoap.org/claims/UPN",
    "http://schemas.xmlsoap.org/claims/upn",
    "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/upn",
};

bool IsUpn(const std::string& format)
{
    return format == Wire::UpnClaim
           || std::find(std::begin(UpnFormats), std::end(UpnFormats), format)
                  != std::end(UpnFormats);
}

/** A format that is not given is the unspecified one [SAML-CORE 2.2.2]. */
bool HasForm(const AssertionNameId& id, SubjectForm form)
{
    const std::string format = id.format.get_value_or(UnspecifiedFormat);
    switch (form) {
    case SubjectForm::UPN:
        return IsUpn(format);
    case SubjectForm::EMAIL:
        return format == EmailFormat;
    case SubjectForm::WINDOWS_NAME:
        return format == WindowsFormat;
    case SubjectForm::X509_SUBJECT:
        return format == X509Format;
    case SubjectForm::PERSISTENT:
        return format == PersistentFormat;
    case SubjectForm::PLAIN:
        return format == UnspecifiedFormat;
    }
    return false;
}

bool Fits(const SubjectRule& rule, const AssertionNameId& id)
{
    return !rule.attribute && HasForm(id, rule.form) && rule.nameQualifier == id.nameQualifier
           && rule.spNameQualifier == id.spNameQualifier;
}

std::string Describe(const boost::optional<std::string>& value)
{
    return value ? Quote(*value) : "none";
}

[[noreturn]] void ThrowNoRule(const char* whose, const boost::optional<AssertionNameId>& id)
{
    if (!id) {
        throw ParseException(std::string("No rule fits the ") + whose + ": it has no NameID");
    }
    throw ParseException(
        std::string("No rule fits the ") + whose + ": the Format of its NameID is "
        + Describe(id->format) + ", the NameQualifier " + Describe(id->nameQualifier)
        + ", the SPNameQualifier " + Describe(id->spNameQualifier));
}

/** Whether the domain stands in the value itself. */
bool CarriesDomain(const SubjectRule& rule)
{
    return !rule.domain
           && (rule.form == SubjectForm::UPN || rule.form == SubjectForm::EMAIL
               || rule.form == SubjectForm::WINDOWS_NAME);
}

/** The domain of everyone whom a rule finds, in upper case; none if the value carries it. */
boost::optional<std::string> GetFixedDomain(const SubjectRule& rule, const SubjectMapping& mapping)
{
    if (CarriesDomain(rule)) {
        return boost::none;
    }
    const boost::optional<std::string>& domain = rule.domain ? rule.domain : mapping.defaultDomain;
    return Quillon::StringUtil::ToUpper(domain.get_value_or(std::string()));
}

/** A domain in a value may be the one that another rule gives to others. */
void RequireOwnDomain(
    const SubjectRule& rule, const std::string& domain, const SubjectMapping& mapping)
{
    if (mapping.isOneDirectory) {
        return;
    }
    for (const SubjectRule& other : mapping.subjects) {
        if (&other != &rule
            && GetFixedDomain(other, mapping) == Quillon::StringUtil::ToUpper(domain)) {
            throw ParseException(
                "The subject's domain " + Quote(domain)
                + " is the one that another rule gives to other people");
        }
    }
}

PrincipalId InDefaultDomain(const std::string& name, const SubjectMapping& mapping)
{
    if (name.empty() || !mapping.defaultDomain || mapping.defaultDomain->empty()) {
        throw ParseException("The name " + Quote(name) + " has no domain, and there is no default");
    }
    return {name, *mapping.defaultDomain};
}

PrincipalId SplitAtLast(const std::string& value, char separator)
{
    const std::size_t position = value.rfind(separator);
    if (position == std::string::npos || position == 0 || position + 1 == value.size()) {
        throw ParseException(
            "The name " + Quote(value) + " is not of the form name" + separator + "domain");
    }
    return {value.substr(0, position), value.substr(position + 1)};
}

PrincipalId SplitAtFirst(const std::string& value, char separator)
{
    const std::size_t position = value.find(separator);
    if (position == std::string::npos || position == 0 || position + 1 == value.size()) {
        throw ParseException(
            "The name " + Quote(value) + " is not of the form domain" + separator + "name");
    }
    return {value.substr(position + 1), value.substr(0, position)};
}

PrincipalId FromCarriedDomain(
    const SubjectRule& rule, const std::string& value, const SubjectMapping& mapping)
{
    if (rule.form != SubjectForm::WINDOWS_NAME) {
        return SplitAtLast(value, '@');
    }
    return value.find('\\') == std::string::npos ? InDefaultDomain(value, mapping)
                                                 : SplitAtFirst(value, '\\');
}

PrincipalId Apply(const SubjectRule& rule, const std::string& value, const SubjectMapping& mapping)
{
    if (value.empty()) {
        throw ParseException("The subject's name is empty");
    }
    if (rule.domain) {
        return {value, *rule.domain};
    }
    if (!CarriesDomain(rule)) {
        return InDefaultDomain(value, mapping);
    }
    PrincipalId id = FromCarriedDomain(rule, value, mapping);
    RequireOwnDomain(rule, id.GetDomain(), mapping);
    return id;
}

/** The value that the rule looks at; none if the assertion does not have it. */
boost::optional<std::string> FindValue(const SubjectRule& rule, const AssertionFacts& facts)
{
    if (!rule.attribute) {
        return facts.subject && Fits(rule, *facts.subject)
                   ? boost::optional<std::string>(facts.subject->value)
                   : boost::none;
    }
    const std::vector<std::string> values = GetTextValues(facts, *rule.attribute);
    if (values.size() > 1) {
        throw ParseException(
            "Attribute " + Quote(*rule.attribute) + " has " + std::to_string(values.size())
            + " values, expected the one of the subject");
    }
    return values.empty() ? boost::none : boost::optional<std::string>(values.front());
}

/** Where the first part of a distinguished name ends [RFC 4514 2.4]. */
std::size_t FindUnescapedComma(const std::string& name)
{
    for (std::size_t i = 0; i < name.size(); ++i) {
        if (name[i] == ',') {
            return i;
        }
        if (name[i] == '\\') {
            ++i;
        }
    }
    return std::string::npos;
}

std::string TrimStart(const std::string& text)
{
    const std::size_t start = text.find_first_not_of(' ');
    return start == std::string::npos ? std::string() : text.substr(start);
}

/**
 * What stands behind the first comma stays with the name: groups of the same name elsewhere in the
 * directory are others. Escapes are left as they are, for the same reason.
 */
PrincipalId ParseDistinguishedName(const std::string& value)
{
    const std::size_t comma = FindUnescapedComma(value);
    const std::size_t equals = value.find('=');
    const bool isCommonName =
        equals != std::string::npos
        && Quillon::StringUtil::ToUpper(std::string_view(value).substr(0, equals)) == "CN";
    if (!isCommonName || comma == std::string::npos || equals + 1 >= comma) {
        throw ParseException("The group " + Quote(value) + " is not of the form CN=name,directory");
    }
    const std::string directory = TrimStart(value.substr(comma + 1));
    if (directory.empty()) {
        throw ParseException("The group " + Quote(value) + " has no directory");
    }
    return {value.substr(equals + 1, comma - equals - 1), directory};
}

PrincipalId ParseGroup(
    const GroupRule& rule, const std::string& value, const SubjectMapping& mapping)
{
    switch (rule.form) {
    case GroupForm::QUALIFIED:
        return SplitAtFirst(value, rule.separator);
    case GroupForm::PLAIN:
        return InDefaultDomain(value, mapping);
    case GroupForm::DISTINGUISHED_NAME:
        return ParseDistinguishedName(value);
    }
    throw Quillon::InvalidArgumentException("Unknown form of groups");
}

/** Whether two rules may find different people and call them the same. */
bool MayCollide(const SubjectRule& a, const SubjectRule& b, const SubjectMapping& mapping)
{
    return GetFixedDomain(a, mapping) == GetFixedDomain(b, mapping);
}

void CheckRule(const SubjectRule& rule)
{
    if (rule.domain && rule.domain->empty()) {
        throw Quillon::InvalidArgumentException("A subject rule has an empty domain");
    }
    if (rule.attribute && (rule.nameQualifier || rule.spNameQualifier)) {
        throw Quillon::InvalidArgumentException(
            "A subject rule demands qualifiers of an attribute, which has none");
    }
}

void AppendTextValues(const AssertionAttribute& attribute, std::vector<std::string>& values)
{
    for (const AssertionAttributeValue& value : attribute.values) {
        if (value.xml) {
            throw ParseException("A value of attribute " + Quote(attribute.name) + " is no text");
        }
        if (!value.isNil) {
            values.push_back(value.text);
        }
    }
}

} // namespace

void CheckRules(const SubjectMapping& mapping)
{
    const auto& rules = mapping.subjects;
    if (rules.empty()) {
        throw Quillon::InvalidArgumentException("The mapping has no subject rule");
    }
    for (auto rule = rules.begin(); rule != rules.end(); ++rule) {
        CheckRule(*rule);
        const bool collides =
            !mapping.isOneDirectory && std::any_of(rules.begin(), rule, [&](const auto& earlier) {
                return MayCollide(earlier, *rule, mapping);
            });
        if (collides) {
            throw Quillon::InvalidArgumentException(
                "Two subject rules may give different people the same name; give one of them a "
                "domain, or say that they are of one directory");
        }
    }
}

PrincipalId FindSubject(const AssertionFacts& facts, const SubjectMapping& mapping)
{
    for (const SubjectRule& rule : mapping.subjects) {
        if (const boost::optional<std::string> value = FindValue(rule, facts)) {
            return Apply(rule, *value, mapping);
        }
    }
    ThrowNoRule("subject", facts.subject);
}

const SubjectRule* FindSubjectRule(const AssertionFacts& facts, const SubjectMapping& mapping)
{
    for (const SubjectRule& rule : mapping.subjects) {
        if (FindValue(rule, facts)) {
            return &rule;
        }
    }
    return nullptr;
}

PrincipalId FindDelegate(const AssertionNameId& nameId, const SubjectMapping& mapping)
{
    for (const SubjectRule& rule : mapping.subjects) {
        if (Fits(rule, nameId)) {
            return Apply(rule, nameId.value, mapping);
        }
    }
    ThrowNoRule("delegate", nameId);
}

std::vector<PrincipalId> FindGroups(const AssertionFacts& facts, const SubjectMapping& mapping)
{
    std::vector<PrincipalId> groups;
    for (const GroupRule& rule : mapping.groups) {
        for (const std::string& value : GetTextValues(facts, rule.attribute)) {
            groups.push_back(ParseGroup(rule, value, mapping));
        }
    }
    return groups;
}

std::vector<std::string> GetTextValues(const AssertionFacts& facts, const std::string& name)
{
    std::vector<std::string> values;
    for (const AssertionAttribute& attribute : facts.attributes) {
        if (attribute.name == name) {
            AppendTextValues(attribute, values);
        }
    }
    return values;
}

} // namespace SsoClient::GeneralReader
