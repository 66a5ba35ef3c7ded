#pragma once

#include "ssoClient/Assertion.h"
#include "ssoClient/SamlToken.h"

#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>
#include <vector>

/**
 * How a general assertion becomes a `SamlToken`: which name identifier or attribute is the user,
 * which domain it belongs to, and which attributes are groups and names. Nothing is guessed: what
 * no rule fits is refused.
 */
namespace SsoClient {

/** The forms of a user's name. */
enum class SubjectForm
{
    /** `name@domain`, in the spellings of the UPN claim. Split at the last `@`. */
    UPN,
    /** An e-mail address [SAML-CORE 8.3.2]; it is not a UPN, even where it looks like one. */
    EMAIL,
    /** `DOMAIN\name` or `name` [SAML-CORE 8.3.4]. */
    WINDOWS_NAME,
    /** A distinguished name [SAML-CORE 8.3.3], taken as it is written. */
    X509_SUBJECT,
    /** A pseudonym that its two qualifiers are a part of [SAML-CORE 8.3.7]. */
    PERSISTENT,
    /** A name without a format, or of the format that says nothing [SAML-CORE 8.3.1]. */
    PLAIN
};

/** One way to find the user. */
struct SubjectRule
{
    SubjectForm form = SubjectForm::UPN;
    /** Take the one value of this attribute, in that form, instead of the name identifier. */
    boost::optional<std::string> attribute;
    /** What the name identifier's qualifiers must be; absent means that it must have none. */
    boost::optional<std::string> nameQualifier;
    boost::optional<std::string> spNameQualifier;
    /** The domain of everyone whom this rule finds; the value as a whole is then the name. */
    boost::optional<std::string> domain;
};

/** How the values of a group attribute are written. */
enum class GroupForm
{
    QUALIFIED, ///< domain, separator, name
    PLAIN,     ///< the name; the domain is the default one
    /** A distinguished name [RFC 4514]: its first value is the name, all behind it the domain. */
    DISTINGUISHED_NAME
};

struct GroupRule
{
    std::string attribute;
    GroupForm form = GroupForm::QUALIFIED;
    char separator = '\\'; ///< of the qualified form
};

struct SubjectMapping
{
    /** Tried in order; the first that fits decides. */
    std::vector<SubjectRule> subjects;
    /** The domain of names that have none. */
    boost::optional<std::string> defaultDomain;
    /** Attributes that no rule names are no groups. */
    std::vector<GroupRule> groups;
    boost::optional<std::string> givenNameAttribute;
    boost::optional<std::string> surnameAttribute;
    /**
     * Whether equal names in equal domains are the same person, whichever rule found them. Without
     * it several rules must lead to different domains.
     */
    bool isOneDirectory = false;
};

/**
 * The assertion as a token.
 *
 * Its validity and confirmation are those that the rules of `VerifyAssertion` led to. Its audience
 * is what all audience restrictions have in common. It is renewable and delegable if a restriction
 * says how often. Delegates are found by the same rules as the subject. `GetAdvice` is empty and
 * `IsSolution` false: the general model, which `GetAssertion` gives, has everything.
 *
 * @throws ParseException                     no rule fits; the text has the format and qualifiers
 *                                            that were found. Or a value is not of its form, or the
 *                                            audience restrictions have nothing in common, or a
 *                                            holder's key comes without a certificate.
 * @throws Quillon::InvalidArgumentException  the assertion is null, there is no subject rule, or
 *                                            two rules may give different people the same name.
 *
 * Thread safety: any number of threads.
 */
SSOCLIENT_API boost::shared_ptr<const SamlToken> CreateSamlToken(
    const boost::shared_ptr<const VerifiedAssertion>& assertion, const SubjectMapping& mapping);

/** The assertion that a token was made of; null if it was read in the narrow way. */
SSOCLIENT_API boost::shared_ptr<const VerifiedAssertion> GetAssertion(const SamlToken& token);

} // namespace SsoClient
