#include "ssoClient/SubjectMapping.h"

#include "ssoClient/Exceptions.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "unit/ssoClient/assertion/AssertionTable.h"

#include "ssoClient/CreateSamlToken.h"

#include <gtest/gtest.h>

using namespace SsoClient;

namespace {

boost::shared_ptr<const VerifiedAssertion> VerifyFile(const std::string& name)
{
    return AssertionTable::Verify(AssertionTable::GetRow("accepted/" + name + ".xml"));
}

SubjectMapping WithRules(std::vector<SubjectRule> rules)
{
    SubjectMapping mapping;
    mapping.subjects = std::move(rules);
    return mapping;
}

SubjectRule Rule(SubjectForm form)
{
    SubjectRule rule;
    rule.form = form;
    return rule;
}

SubjectRule InDomain(SubjectRule rule, const std::string& domain)
{
    rule.domain = domain;
    return rule;
}

SubjectRule FromAttribute(const std::string& name, SubjectForm form)
{
    SubjectRule rule = Rule(form);
    rule.attribute = name;
    return rule;
}

SubjectMapping InDefaultDomain(SubjectMapping mapping)
{
    mapping.defaultDomain = "example.org";
    return mapping;
}

SubjectMapping WithGroups(const std::string& attribute, GroupForm form, char separator = '\\')
{
    SubjectMapping mapping = WithRules({Rule(SubjectForm::UPN)});
    mapping.groups = {{attribute, form, separator}};
    return mapping;
}

boost::shared_ptr<const SamlToken> Map(const std::string& file, const SubjectMapping& mapping)
{
    return CreateSamlToken(VerifyFile(file), mapping);
}

/** The subject, or the text of the refusal. */
std::string SubjectOf(const std::string& file, const SubjectMapping& mapping)
{
    try {
        return Map(file, mapping)->GetSubject().ToString();
    } catch (const ParseException& error) {
        return error.what();
    }
}

std::string GroupsOf(const SubjectMapping& mapping)
{
    std::string text;
    try {
        std::vector<PrincipalId> groups;
        Map("group-values", mapping)->GetGroups(groups);
        for (const PrincipalId& group : groups) {
            text += group.GetName() + " of " + group.GetDomain() + ";";
        }
    } catch (const ParseException& error) {
        return error.what();
    }
    return text;
}

std::string ArgumentErrorOf(const SubjectMapping& mapping)
{
    try {
        Map("group-values", mapping);
        return "accepted";
    } catch (const Quillon::InvalidArgumentException& error) {
        return error.what();
    }
}

} // namespace

TEST(SubjectMapping, SplitsAUpnInAllItsSpellings)
{
    for (const char* file : {"adfs-rsa", "name-of-upn", "name-of-upn-lower-case"}) {
        EXPECT_EQ(
            SubjectOf(file, WithRules({Rule(SubjectForm::UPN)})),
            "{Name: alice; Domain:example.com}")
            << file;
    }
}

TEST(SubjectMapping, SplitsAUpnAtTheLastSign)
{
    EXPECT_EQ(
        SubjectOf("name-with-two-signs", WithRules({Rule(SubjectForm::UPN)})),
        "{Name: alice@home; Domain:example.com}");
}

// [SAML-CORE 8.3.2]
TEST(SubjectMapping, TakesAnEmailAddressForWhatItIs)
{
    EXPECT_EQ(
        SubjectOf("okta-rsa", WithRules({Rule(SubjectForm::EMAIL)})),
        "{Name: alice; Domain:example.com}");
    EXPECT_EQ(
        SubjectOf("okta-rsa", WithRules({Rule(SubjectForm::UPN)})),
        "No rule fits the subject: the Format of its NameID is "
        "'urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress', the NameQualifier none, the "
        "SPNameQualifier none");
    EXPECT_EQ(
        SubjectOf("adfs-rsa", WithRules({Rule(SubjectForm::EMAIL)})).substr(0, 26),
        "No rule fits the subject: ");
}

// [SAML-CORE 8.3.4]
TEST(SubjectMapping, SplitsAWindowsName)
{
    EXPECT_EQ(
        SubjectOf("opensaml-rsa", WithRules({Rule(SubjectForm::WINDOWS_NAME)})),
        "{Name: alice; Domain:EXAMPLE}");
}

TEST(SubjectMapping, NeedsADomainForNamesWithoutOne)
{
    EXPECT_EQ(
        SubjectOf("auth0-rsa", WithRules({Rule(SubjectForm::PLAIN)})),
        "The name 'auth0|17' has no domain, and there is no default");
    EXPECT_EQ(
        SubjectOf("auth0-rsa", InDefaultDomain(WithRules({Rule(SubjectForm::PLAIN)}))),
        "{Name: auth0|17; Domain:example.org}");
    EXPECT_EQ(
        SubjectOf("id-without-underscore", InDefaultDomain(WithRules({Rule(SubjectForm::PLAIN)}))),
        "{Name: alice; Domain:example.org}");
}

// [SAML-CORE 8.3.7]
TEST(SubjectMapping, TakesQualifiersForAPartOfTheName)
{
    SubjectRule rule = InDomain(Rule(SubjectForm::PERSISTENT), "cxf");
    EXPECT_EQ(
        SubjectOf("cxf-bearer-rsa", WithRules({rule})),
        "No rule fits the subject: the Format of its NameID is "
        "'urn:oasis:names:tc:SAML:2.0:nameid-format:persistent', the NameQualifier "
        "'http://cxf.apache.org/sts', the SPNameQualifier none");
    EXPECT_EQ(SubjectOf("azure-rsa", WithRules({rule})), "{Name: uq2h7s_persistent; Domain:cxf}");
    rule.nameQualifier = "http://cxf.apache.org/sts";
    EXPECT_EQ(SubjectOf("cxf-bearer-rsa", WithRules({rule})), "{Name: alice; Domain:cxf}");
    EXPECT_EQ(SubjectOf("azure-rsa", WithRules({rule})).substr(0, 24), "No rule fits the subject");
    rule.spNameQualifier = "x";
    EXPECT_EQ(
        SubjectOf("cxf-bearer-rsa", WithRules({rule})).substr(0, 24), "No rule fits the subject");
}

// [SAML-CORE 8.3.8]
TEST(SubjectMapping, NeverTakesATransientName)
{
    std::vector<SubjectRule> rules;
    for (const SubjectForm form :
         {SubjectForm::UPN,
          SubjectForm::EMAIL,
          SubjectForm::WINDOWS_NAME,
          SubjectForm::X509_SUBJECT,
          SubjectForm::PERSISTENT,
          SubjectForm::PLAIN}) {
        SubjectRule rule = Rule(form);
        rule.spNameQualifier = "https://app.example.com";
        rules.push_back(rule);
    }
    SubjectMapping mapping = InDefaultDomain(WithRules(rules));
    mapping.isOneDirectory = true;
    EXPECT_EQ(
        SubjectOf("simplesamlphp-rsa", mapping),
        "No rule fits the subject: the Format of its NameID is "
        "'urn:oasis:names:tc:SAML:2.0:nameid-format:transient', the NameQualifier none, the "
        "SPNameQualifier 'https://app.example.com'");
}

// [RFC 4514], [SAML-CORE 8.3.3]
TEST(SubjectMapping, TakesADistinguishedNameAsItIsWritten)
{
    SubjectRule rule = InDomain(Rule(SubjectForm::X509_SUBJECT), "certificates");
    rule.nameQualifier = "http://cxf.apache.org/sts";
    const auto token = Map("cxf-holder-of-key-rsa", WithRules({rule}));
    EXPECT_EQ(token->GetSubject(), PrincipalId("CN=service,O=Example", "certificates"));
    EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::CONFIRM_HOLDER_OF_KEY);
    ASSERT_NE(token->GetConfirmationCertificate(), nullptr);
    EXPECT_EQ(
        token->GetConfirmationCertificate()->GetEncoded(),
        GetTestCertificates("client").front()->GetEncoded());
}

TEST(SubjectMapping, TakesTheOneValueOfAnAttribute)
{
    EXPECT_EQ(
        SubjectOf(
            "group-values", WithRules({InDomain(FromAttribute("user", SubjectForm::PLAIN), "d")})),
        "{Name: alice; Domain:d}");
    EXPECT_EQ(
        SubjectOf(
            "group-values", WithRules({InDomain(FromAttribute("users", SubjectForm::PLAIN), "d")})),
        "Attribute 'users' has 2 values, expected the one of the subject");
    EXPECT_EQ(
        SubjectOf("group-values", WithRules({FromAttribute("user", SubjectForm::UPN)})),
        "The name 'alice' is not of the form name@domain");
}

TEST(SubjectMapping, TriesRulesInTheirOrder)
{
    EXPECT_EQ(
        SubjectOf(
            "group-values",
            WithRules(
                {InDomain(FromAttribute("none", SubjectForm::PLAIN), "d"),
                 InDomain(FromAttribute("missing", SubjectForm::PLAIN), "e"),
                 Rule(SubjectForm::UPN)})),
        "{Name: alice; Domain:Example.COM}");
}

TEST(SubjectMapping, RefusesValuesThatAreElements)
{
    EXPECT_EQ(
        SubjectOf(
            "element-values", WithRules({InDomain(FromAttribute("a", SubjectForm::PLAIN), "d")})),
        "A value of attribute 'a' is no text");
}

TEST(SubjectMapping, RefusesRulesThatMayGiveDifferentPeopleOneName)
{
    const char* const text =
        "Invalid argument : Two subject rules may give different people the same name; give one of "
        "them a domain, or say that they are of one directory";
    SubjectMapping mapping = WithRules({Rule(SubjectForm::UPN), Rule(SubjectForm::EMAIL)});
    EXPECT_EQ(ArgumentErrorOf(mapping), text);
    mapping.isOneDirectory = true;
    EXPECT_EQ(ArgumentErrorOf(mapping), "accepted");
    EXPECT_EQ(
        ArgumentErrorOf(WithRules(
            {Rule(SubjectForm::UPN),
             InDomain(Rule(SubjectForm::PERSISTENT), "a"),
             InDomain(Rule(SubjectForm::EMAIL), "A")})),
        text);
    EXPECT_EQ(
        ArgumentErrorOf(WithRules(
            {Rule(SubjectForm::UPN),
             InDomain(Rule(SubjectForm::PERSISTENT), "a"),
             InDomain(Rule(SubjectForm::EMAIL), "b")})),
        "accepted");
    EXPECT_EQ(
        ArgumentErrorOf(InDefaultDomain(WithRules(
            {Rule(SubjectForm::PLAIN), InDomain(Rule(SubjectForm::EMAIL), "EXAMPLE.org")}))),
        text);
}

TEST(SubjectMapping, RefusesADomainThatAnotherRuleGivesToOthers)
{
    const std::vector<SubjectRule> rules = {
        InDomain(Rule(SubjectForm::PERSISTENT), "EXAMPLE.com"), Rule(SubjectForm::UPN)};
    SubjectMapping mapping = WithRules(rules);
    EXPECT_EQ(
        SubjectOf("group-values", mapping),
        "The subject's domain 'Example.COM' is the one that another rule gives to other people");
    mapping.isOneDirectory = true;
    EXPECT_EQ(SubjectOf("group-values", mapping), "{Name: alice; Domain:Example.COM}");
}

TEST(SubjectMapping, RefusesRulesThatCannotWork)
{
    EXPECT_EQ(ArgumentErrorOf({}), "Invalid argument : The mapping has no subject rule");
    EXPECT_EQ(
        ArgumentErrorOf(WithRules({InDomain(Rule(SubjectForm::UPN), "")})),
        "Invalid argument : A subject rule has an empty domain");
    SubjectRule rule = FromAttribute("user", SubjectForm::PLAIN);
    rule.nameQualifier = "q";
    EXPECT_EQ(
        ArgumentErrorOf(WithRules({rule})),
        "Invalid argument : A subject rule demands qualifiers of an attribute, which has none");
    EXPECT_THROW(
        CreateSamlToken(boost::shared_ptr<const VerifiedAssertion>(), SubjectMapping()),
        Quillon::InvalidArgumentException);
}

TEST(SubjectMapping, RefusesASubjectWithoutAName)
{
    EXPECT_EQ(
        SubjectOf("subject-without-name", WithRules({Rule(SubjectForm::UPN)})),
        "No rule fits the subject: it has no NameID");
}

TEST(GroupMapping, SplitsAtTheSeparator)
{
    EXPECT_EQ(
        GroupsOf(WithGroups("qualified", GroupForm::QUALIFIED)),
        "Admins of EXAMPLE;A\\B of EXAMPLE;");
    EXPECT_EQ(GroupsOf(WithGroups("slashed", GroupForm::QUALIFIED, '/')), "Admins of EXAMPLE;");
    EXPECT_EQ(
        GroupsOf(WithGroups("slashed", GroupForm::QUALIFIED)),
        "The name 'EXAMPLE/Admins' is not of the form domain\\name");
}

TEST(GroupMapping, NeedsADomainForPlainNames)
{
    EXPECT_EQ(
        GroupsOf(WithGroups("plain", GroupForm::PLAIN)),
        "The name 'Staff' has no domain, and there is no default");
    EXPECT_EQ(
        GroupsOf(InDefaultDomain(WithGroups("plain", GroupForm::PLAIN))), "Staff of example.org;");
}

// [RFC 4514 2.4]
TEST(GroupMapping, KeepsTheWholeOfADistinguishedName)
{
    EXPECT_EQ(
        GroupsOf(WithGroups("distinguished", GroupForm::DISTINGUISHED_NAME)),
        "Admins of OU=IT,DC=example,DC=com;A\\,B of DC=example;");
    EXPECT_EQ(
        GroupsOf(WithGroups("plain", GroupForm::DISTINGUISHED_NAME)),
        "The group 'Staff' is not of the form CN=name,directory");
}

TEST(GroupMapping, PassesOverAttributesThatNoRuleNames)
{
    EXPECT_EQ(GroupsOf(WithGroups("missing", GroupForm::QUALIFIED)), "");
}

TEST(MappedToken, TellsWhatTheAssertionTells)
{
    SubjectMapping mapping = WithRules({Rule(SubjectForm::UPN)});
    mapping.givenNameAttribute = "given";
    mapping.surnameAttribute = "family";
    const auto assertion = VerifyFile("group-values");
    const auto token = CreateSamlToken(assertion, mapping);
    EXPECT_EQ(token->GetId(), assertion->GetFacts().id);
    EXPECT_EQ(token->GetStartDate(), assertion->GetStartDate());
    EXPECT_EQ(token->GetEndDate(), assertion->GetEndDate());
    EXPECT_EQ(token->ToXml(), assertion->ToXml());
    EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::CONFIRM_BEARER);
    EXPECT_EQ(token->GetConfirmationCertificate(), nullptr);
    EXPECT_FALSE(token->IsRenewable());
    EXPECT_FALSE(token->IsDelegable());
    EXPECT_FALSE(token->IsSolution());
    std::pair<std::string, std::string> name;
    token->GetFullName(name);
    EXPECT_EQ(name, std::make_pair(std::string("Alice"), std::string("Example")));
    std::vector<Advice> advice = {Advice{"left over", {}}};
    token->GetAdvice(advice);
    EXPECT_TRUE(advice.empty());
    EXPECT_EQ(GetAssertion(*token), assertion);
}

TEST(MappedToken, HasTheAudienceThatAllRestrictionsName)
{
    const SubjectMapping mapping = InDefaultDomain(WithRules({Rule(SubjectForm::PLAIN)}));
    std::set<std::string> audience;
    Map("two-restrictions", mapping)->GetAudience(audience);
    EXPECT_EQ(audience, std::set<std::string>({"https://app.example.com/service"}));
    EXPECT_EQ(
        SubjectOf("disjoint-audiences", mapping),
        "The audience restrictions have no audience in common");
    Map("no-conditions", mapping)->GetAudience(audience);
    EXPECT_TRUE(audience.empty());
}

TEST(MappedToken, FindsDelegatesByTheRulesOfTheSubject)
{
    SubjectMapping mapping = InDefaultDomain(WithRules({Rule(SubjectForm::PLAIN)}));
    EXPECT_EQ(
        SubjectOf("type-of-a-condition", mapping).substr(0, 30), "No rule fits the delegate: the");
    mapping.subjects.push_back(Rule(SubjectForm::UPN));
    std::vector<Delegate> chain;
    Map("type-of-a-condition", mapping)->GetDelegationChain(chain);
    ASSERT_EQ(chain.size(), 1U);
    EXPECT_EQ(chain.front().subject, PrincipalId("service", "example.com"));
    EXPECT_EQ(chain.front().delegationDate.ToString(), "2024-05-06T11:59:00.000Z");
    EXPECT_EQ(
        SubjectOf("delegate-without-instant", mapping), "A delegate has no DelegationInstant");
}

TEST(MappedToken, IsRenewableAndDelegableAsOftenAsRestrictionsSay)
{
    const SubjectMapping mapping = InDefaultDomain(WithRules({Rule(SubjectForm::PLAIN)}));
    EXPECT_TRUE(Map("renew-restriction", mapping)->IsRenewable());
    EXPECT_TRUE(Map("proxy-restriction-with-count", mapping)->IsDelegable());
    EXPECT_FALSE(Map("proxy-restriction-with-audience", mapping)->IsDelegable());
}

TEST(MappedToken, NeedsACertificateForTheHoldersKey)
{
    const SubjectMapping mapping = InDefaultDomain(WithRules({Rule(SubjectForm::PLAIN)}));
    for (const char* file : {"serial-number-alone", "rsa-key-value", "two-keys"}) {
        EXPECT_EQ(
            SubjectOf(file, mapping),
            std::string("A token cannot be made of a holder-of-key assertion with ")
                + (std::string(file) == "two-keys" ? "2" : "1")
                + " keys, expected one that is given by a certificate");
    }
    EXPECT_EQ(
        SubjectOf("other-method", mapping),
        "A token cannot be made of an assertion whose confirmation method is "
        "'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'");
}

TEST(GetAssertion, IsNullForATokenThatWasReadInTheNarrowWay)
{
    const FixedClock clock("2026-01-01T00:01:00Z");
    const auto token =
        CreateSamlToken(ReadTestData("tokens/accepted/bearer.xml"), GetTestCertificates("sts"));
    EXPECT_EQ(GetAssertion(*token), nullptr);
}
