#include "ssoClient/token/SamlTokenImpl.h"

#include "quillon/xml/Parser.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"
#include "unit/ssoClient/token/TokenText.h"

#include <gtest/gtest.h>

#include <limits>

using namespace SsoClient;
using namespace TokenText;
using Quillon::Ref;
using Quillon::Crypto::Certificate;

namespace {

constexpr char StartAttribute[] = "NotBefore=\"2012-01-31T11:55:00Z\"";
constexpr char ConfirmationEnd[] =
    "NotOnOrAfter=\"2012-01-31T12:05:00Z\"></saml:SubjectConfirmationData>";

/** A token on behalf of `delegateId` with the given chain; no delegate id if it is empty. */
std::string Delegated(const std::string& delegateId, const std::vector<std::string>& delegates)
{
    const std::string text =
        delegates.empty() ? Bearer() : WithConditions(DelegationRestriction(delegates));
    return delegateId.empty()
               ? text
               : InsertBefore(text, "<saml:SubjectConfirmationData ", NameId(delegateId));
}

template <class Action>
std::string ParseErrorOf(const Action& action)
{
    try {
        action();
        return "accepted";
    } catch (const ParseException& error) {
        return error.what();
    }
}

AttributeType MakeAttribute(const std::string& name, const std::vector<std::string>& values)
{
    return {name, "", "", values};
}

class TokenTest : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

using CreateSamlTokenTest = TokenTest;
using CheckTokenPropertiesTest = TokenTest;
using SamlTokenTest = TokenTest;

} // namespace

TEST_F(CreateSamlTokenTest, VerifiesABearerToken)
{
    const std::string xml = StsKey().Sign(Bearer());
    const auto token = CreateSamlToken(xml, TrustSts());
    EXPECT_EQ("_token", token->GetId());
    EXPECT_EQ(PrincipalId("user", "example.com"), token->GetSubject());
    EXPECT_EQ("2012-01-31T11:55:00.000Z", token->GetStartDate().ToString());
    EXPECT_EQ("2012-01-31T12:05:00.000Z", token->GetEndDate().ToString());
    EXPECT_EQ(SamlToken::CONFIRM_BEARER, token->GetConfirmationMethod());
    EXPECT_EQ(nullptr, token->GetConfirmationCertificate());
    EXPECT_EQ(xml, token->ToXml());
    EXPECT_FALSE(token->IsRenewable());
    EXPECT_FALSE(token->IsDelegable());
    EXPECT_FALSE(token->IsSolution());
}

TEST_F(CreateSamlTokenTest, VerifiesAHolderOfKeyToken)
{
    const SigningKey holder;
    const auto token = MakeToken(HolderOfKey(holder.GetCertificateBase64()));
    EXPECT_EQ(SamlToken::CONFIRM_HOLDER_OF_KEY, token->GetConfirmationMethod());
    ASSERT_NE(nullptr, token->GetConfirmationCertificate());
    EXPECT_EQ(
        holder.GetCertificate()->GetEncoded(), token->GetConfirmationCertificate()->GetEncoded());
}

TEST_F(CreateSamlTokenTest, KeepsTheTextAsGiven)
{
    const std::string xml =
        "<?xml version='1.0' encoding='UTF-8'?>\n" + StsKey().Sign(Bearer()) + "\n<!-- end -->";
    EXPECT_EQ(xml, CreateSamlToken(xml, TrustSts())->ToXml());
}

TEST_F(CreateSamlTokenTest, TakesOneCertificate)
{
    const std::string xml = StsKey().Sign(Bearer());
    EXPECT_EQ("_token", CreateSamlToken(xml, StsKey().GetCertificate().get())->GetId());
    const SigningKey foreign;
    EXPECT_THROW(CreateSamlToken(xml, foreign.GetCertificate().get()), InvalidSignatureException);
    const Certificate* none = nullptr;
    EXPECT_THROW(CreateSamlToken(xml, none), Quillon::InvalidArgumentException);
}

TEST_F(CreateSamlTokenTest, AcceptsAnyOfSeveralTrustedCertificates)
{
    const SigningKey other;
    const std::string xml = StsKey().Sign(Bearer());
    EXPECT_EQ("accepted", Judge(xml, {other.GetCertificate(), StsKey().GetCertificate()}));
    EXPECT_EQ("accepted", Judge(xml, {StsKey().GetCertificate(), other.GetCertificate()}));
}

TEST_F(CreateSamlTokenTest, AllowsCommentsThatTheSignatureDoesNotCover)
{
    const std::string xml = StsKey().Sign(Bearer());
    EXPECT_EQ("accepted", Judge(InsertBefore(xml, "<saml:Subject>", "<!-- c -->"), TrustSts()));
}

TEST_F(CreateSamlTokenTest, AcceptsAnEmptyReferenceForTheWholeDocument)
{
    EXPECT_EQ("accepted", Judge(StsKey().Sign(Bearer(), ""), TrustSts()));
}

TEST_F(CreateSamlTokenTest, UsesTenMinutesOfToleranceByDefault)
{
    const std::string xml = StsKey().Sign(Bearer());
    for (const char* time :
         {"2012-01-31T11:45:00Z", "2012-01-31T11:46:00Z", "2012-01-31T12:14:59.999999Z"}) {
        const FixedClock clock(time);
        EXPECT_EQ("_token", CreateSamlToken(xml, TrustSts())->GetId()) << time;
    }
    {
        const FixedClock clock("2012-01-31T11:44:00Z");
        EXPECT_EQ("Token start date is in the future: 2012-01-31T11:55:00.000Z", ParseErrorOf([&] {
                      CreateSamlToken(xml, TrustSts());
                  }));
    }
    const FixedClock clock("2012-01-31T12:16:00Z");
    EXPECT_EQ("The token has expired at: 2012-01-31T12:05:00.000Z", ParseErrorOf([&] {
                  CreateSamlToken(xml, StsKey().GetCertificate().get());
              }));
}

TEST_F(CheckTokenPropertiesTest, AMicrosecondIsLongEnough)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeUnsigned(
            Replace(Bearer(), StartAttribute, "NotBefore=\"2012-01-31T12:04:59.999999Z\"")));
}

// [SAML-CORE 2.5.1.2]
TEST_F(CheckTokenPropertiesTest, TellsTheStartWithItsFraction)
{
    const auto judge = [](const std::string& start) {
        return JudgeUnsigned(Replace(Bearer(), StartAttribute, "NotBefore=\"" + start + "\""), 60);
    };
    EXPECT_EQ(ReachesSignature, judge("2012-01-31T12:01:00Z"));
    EXPECT_EQ(
        "ParseException: Token start date is in the future: 2012-01-31T12:01:00.000001Z",
        judge("2012-01-31T12:01:00.000001Z"));
    EXPECT_EQ(
        "ParseException: Token start date is in the future: 2012-01-31T12:01:00.001Z",
        judge("2012-01-31T12:01:00.001Z"));
}

TEST_F(CheckTokenPropertiesTest, EnormousTolerancesDoNotOverflow)
{
    const FixedClock clock("9999-12-31T23:59:59Z");
    constexpr long long Max = std::numeric_limits<long long>::max();
    constexpr long long Min = std::numeric_limits<long long>::min();
    EXPECT_EQ(ReachesSignature, JudgeUnsigned(Bearer(), Max));
    EXPECT_EQ(
        "ParseException: Token start date is in the future: 2012-01-31T11:55:00.000Z",
        JudgeUnsigned(Bearer(), Min));
}

TEST_F(CheckTokenPropertiesTest, BearerConfirmationMayLastLongerThanTheToken)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeUnsigned(Replace(
            Bearer(),
            ConfirmationEnd,
            "NotOnOrAfter=\"2012-01-31T12:05:01Z\"></saml:SubjectConfirmationData>")));
}

TEST_F(CheckTokenPropertiesTest, ChecksTheConfirmationsEndBeforeTheDelegation)
{
    const std::string text = Delegated("a@d", {"a@d", "b@d"});
    EXPECT_EQ(
        "ParseException: The SubjectConfirmation delegate id does not match the id of the last "
        "delegate",
        JudgeUnsigned(text));
    EXPECT_EQ(
        "ParseException: Invalid token subject validity",
        JudgeUnsigned(Replace(
            text,
            ConfirmationEnd,
            "NotOnOrAfter=\"2012-01-31T12:04:59Z\"></saml:SubjectConfirmationData>")));
}

TEST_F(CheckTokenPropertiesTest, ChecksDelegationOfHolderOfKeyTokens)
{
    const std::string plain = HolderOfKey(StsKey().GetCertificateBase64());
    const std::string restricted =
        InsertBefore(plain, EndOfConditions, DelegationRestriction({"a@d", "b@d"}));
    const auto judge = [&restricted](const std::string& id) {
        return JudgeUnsigned(
            InsertBefore(restricted, "<saml:SubjectConfirmationData ", NameId(id)));
    };
    EXPECT_EQ(ReachesSignature, judge("b@d"));
    EXPECT_EQ(
        "ParseException: The SubjectConfirmation delegate id does not match the id of the last "
        "delegate",
        judge("a@d"));
}

TEST_F(SamlTokenTest, IsRenewableAsFarAsItsCountAllows)
{
    const auto isRenewable = [](const std::string& attributes) {
        return MakeToken(WithConditions(
                             "<saml:Condition" + attributes
                             + " xsi:type=\"rsa:RenewRestrictionType\"></saml:Condition>"))
            ->IsRenewable();
    };
    EXPECT_TRUE(isRenewable(" Count=\"1\""));
    EXPECT_FALSE(isRenewable(" Count=\"0\""));
    EXPECT_FALSE(isRenewable(""));
    EXPECT_FALSE(isRenewable(" Postdatable=\"true\" RenewExpired=\"true\""));
}

TEST_F(SamlTokenTest, IsDelegableAsFarAsItsCountAllows)
{
    const auto isDelegable = [](const std::string& count) {
        return MakeToken(
                   WithConditions(
                       "<saml:ProxyRestriction Count=\"" + count + "\"></saml:ProxyRestriction>"))
            ->IsDelegable();
    };
    EXPECT_TRUE(isDelegable("1"));
    EXPECT_FALSE(isDelegable("0"));
}

TEST_F(SamlTokenTest, GathersGroupsOfAllAttributes)
{
    const auto token = MakeToken(WithAttributes(
        Attribute(Wire::GroupIdentityAttribute, {"D\\Users", "D\\G\\H"})
        + Attribute("other", {"D\\Nobody"})
        + Attribute(Wire::GroupIdentityAttribute, {"E\\Admins"})));
    std::vector<PrincipalId> groups = {PrincipalId("old", "old")};
    token->GetGroups(groups);
    EXPECT_EQ(
        (std::vector<PrincipalId>{
            PrincipalId("Users", "D"), PrincipalId("G\\H", "D"), PrincipalId("Admins", "E")}),
        groups);
}

TEST_F(SamlTokenTest, TakesTheLastNamesAndSolutionFlag)
{
    const auto token = MakeToken(WithAttributes(
        Attribute(Wire::GivenNameClaim, {"First"})
        + Attribute(Wire::GivenNameClaim, {"Ann", "Second"})
        + Attribute(Wire::SurnameClaim, {"Smith"}) + Attribute(Wire::SurnameClaim, {"Miller"})
        + Attribute(Wire::IsSolutionAttribute, {"false"})
        + Attribute(Wire::IsSolutionAttribute, {"TRUE"})));
    std::pair<std::string, std::string> name("old", "old");
    token->GetFullName(name);
    EXPECT_EQ(std::make_pair(std::string("Ann"), std::string("Miller")), name);
    EXPECT_TRUE(token->IsSolution());
}

TEST_F(SamlTokenTest, NamesAreEmptyWithoutValues)
{
    const auto token = MakeToken(WithAttributes(
        Attribute(Wire::GivenNameClaim, {"Ann"}) + Attribute(Wire::GivenNameClaim, {})));
    std::pair<std::string, std::string> name("old", "old");
    token->GetFullName(name);
    EXPECT_EQ(std::make_pair(std::string(), std::string()), name);
}

TEST_F(SamlTokenTest, GivesTheDelegationChain)
{
    const auto token = MakeToken(Delegated("b@e", {"a@d", "b@e"}));
    std::vector<Delegate> chain;
    token->GetDelegationChain(chain);
    ASSERT_EQ(2U, chain.size());
    EXPECT_EQ(PrincipalId("a", "d"), chain[0].subject);
    EXPECT_EQ("2012-01-31T11:00:00.000Z", chain[0].delegationDate.ToString());
    EXPECT_EQ(PrincipalId("b", "e"), chain[1].subject);
}

TEST_F(SamlTokenTest, GivesTheAudienceOnce)
{
    const auto token = MakeToken(WithConditions(
        "<saml:AudienceRestriction><saml:Audience>b</saml:Audience><saml:Audience>a</"
        "saml:Audience><saml:Audience>b</saml:Audience></saml:AudienceRestriction>"));
    std::set<std::string> audience = {"old"};
    token->GetAudience(audience);
    EXPECT_EQ((std::set<std::string>{"a", "b"}), audience);
}

TEST_F(SamlTokenTest, GivesAdviceInOrder)
{
    const auto advice = [](const std::string& source, const std::string& attributes) {
        return "<rsa:RSAAdvice AdviceSource=\"" + source + "\">" + attributes + "</rsa:RSAAdvice>";
    };
    const auto token = MakeToken(InsertBefore(
        Bearer(),
        "<saml:AuthnStatement ",
        "<saml:Advice>" + advice("z", Attribute("n", {"2", "1"}) + Attribute("m", {}))
            + advice("a", Attribute("o", {"3"})) + "</saml:Advice>"));
    std::vector<Advice> all = {Advice()};
    token->GetAdvice(all);
    ASSERT_EQ(2U, all.size());
    EXPECT_EQ("z", all[0].source);
    ASSERT_EQ(2U, all[0].attributes.size());
    EXPECT_EQ("n", all[0].attributes[0].name);
    EXPECT_EQ((std::vector<std::string>{"2", "1"}), all[0].attributes[0].values);
    EXPECT_EQ("m", all[0].attributes[1].name);
    EXPECT_TRUE(all[0].attributes[1].values.empty());
    EXPECT_EQ("a", all[1].source);
}

TEST_F(SamlTokenTest, OutParametersAreEmptiedIfTheTokenHasNothing)
{
    const auto token = MakeToken(Bearer());
    std::vector<PrincipalId> groups = {PrincipalId("old", "old")};
    std::vector<Delegate> chain = {{PrincipalId("old", "old"), Quillon::System::DateTime()}};
    std::set<std::string> audience = {"old"};
    std::vector<Advice> advice = {Advice()};
    token->GetGroups(groups);
    token->GetDelegationChain(chain);
    token->GetAudience(audience);
    token->GetAdvice(advice);
    EXPECT_TRUE(groups.empty());
    EXPECT_TRUE(chain.empty());
    EXPECT_TRUE(audience.empty());
    EXPECT_TRUE(advice.empty());
}

namespace {

/** A SOAP-like document around `content`; the assertion is the first child of the body. */
struct Envelope
{
    explicit Envelope(const std::string& content)
    {
        ParseXML(
            "<e:Envelope xmlns:e=\"urn:envelope\" xmlns:extra=\"urn:extra\"><e:Body>" + content
                + "</e:Body></e:Envelope>",
            document);
        body = document->GetRootElement()->FindChildElement("Body");
        assertion = body->FindChildElement("Assertion");
    }

    Ref<Quillon::Xml::Document> document;
    Quillon::Xml::ElementNode* body = nullptr;
    Quillon::Xml::ElementNode* assertion = nullptr;
};

std::string SignatureErrorOf(Quillon::Xml::ElementNode* assertion)
{
    try {
        CreateSamlTokenFromDom(assertion, TrustSts());
        return "accepted";
    } catch (const InvalidSignatureException& error) {
        return error.what();
    }
}

using CreateSamlTokenFromDomTest = TokenTest;

} // namespace

TEST_F(CreateSamlTokenFromDomTest, VerifiesAnAssertionInsideALargerDocument)
{
    const auto token =
        CreateSamlTokenFromDom(Envelope(StsKey().Sign(Bearer())).assertion, TrustSts());
    EXPECT_EQ("_token", token->GetId());
    EXPECT_EQ(PrincipalId("user", "example.com"), token->GetSubject());
}

TEST_F(CreateSamlTokenFromDomTest, KeepsTheInclusiveCanonicalForm)
{
    const std::string xml = StsKey().Sign(Bearer());
    const auto token = CreateSamlTokenFromDom(Envelope(xml).assertion, TrustSts(), 0);
    // [C14N 2.4]: the namespaces of the ancestors come along, sorted by prefix.
    const std::string canonical = Replace(
        xml, " xmlns:rsa=", " xmlns:e=\"urn:envelope\" xmlns:extra=\"urn:extra\" xmlns:rsa=");
    EXPECT_EQ(canonical, token->ToXml());
    EXPECT_EQ("accepted", Judge(token->ToXml(), TrustSts()));
}

TEST_F(CreateSamlTokenFromDomTest, RefusesAnEmptyReferenceInsideALargerDocument)
{
    // The reference's digest is that of the whole document, so nothing else can be wrong.
    const std::string canonical =
        "<e:Envelope xmlns:e=\"urn:envelope\"><e:Body>" + Bearer() + "</e:Body></e:Envelope>";
    Ref<Quillon::Xml::Document> document;
    ParseXML(StsKey().Sign(canonical, ""), document);
    Quillon::Xml::ElementNode* body = document->GetRootElement()->FindChildElement("Body");
    EXPECT_EQ(
        "Signature verification error. The reference covers a whole document of which the signed "
        "element is a part",
        SignatureErrorOf(body->FindChildElement("Assertion")));
}

TEST_F(CreateSamlTokenFromDomTest, RefusesASecondElementWithTheId)
{
    const std::string xml = StsKey().Sign(Bearer());
    EXPECT_EQ(
        "Signature verification error. Reference '#_token' names 2 elements of the document",
        SignatureErrorOf(Envelope(xml + "<other ID=\"_token\"/>").assertion));
}

TEST_F(CreateSamlTokenFromDomTest, RefusesAForgedAssertionBesideTheSignedOne)
{
    const std::string xml = StsKey().Sign(Bearer());
    std::string forged = Replace(xml, " ID=\"_token\"", " ID=\"_forged\"");
    forged = Replace(forged, "user@example.com", "root@example.com");
    const Envelope envelope(forged + xml);
    EXPECT_EQ("Token's signature must cover the entire token", ParseErrorOf([&] {
                  CreateSamlTokenFromDom(envelope.assertion, TrustSts());
              }));
}

TEST_F(CreateSamlTokenFromDomTest, AppliesTheTolerance)
{
    const FixedClock later("2012-01-31T12:05:00Z");
    const Envelope envelope(StsKey().Sign(Bearer()));
    EXPECT_EQ("_token", CreateSamlTokenFromDom(envelope.assertion, TrustSts())->GetId());
    EXPECT_EQ("The token has expired at: 2012-01-31T12:05:00.000Z", ParseErrorOf([&] {
                  CreateSamlTokenFromDom(envelope.assertion, TrustSts(), 0);
              }));
}

TEST_F(CreateSamlTokenFromDomTest, RefusesAnotherElementAndNone)
{
    const Envelope envelope("<a/>");
    for (Quillon::Xml::ElementNode* element : {envelope.body, envelope.assertion}) {
        EXPECT_EQ("Expected element 'Assertion' not found.", ParseErrorOf([&] {
                      CreateSamlTokenFromDom(element, TrustSts());
                  }));
    }
}

TEST(ParseSamlNameId, SplitsAtTheLastAt)
{
    const auto parse = [](const std::string& value) {
        return ParseSamlNameId({Wire::UpnClaim, value}).ToString();
    };
    EXPECT_EQ("{Name: user; Domain:dom}", parse("user@dom"));
    EXPECT_EQ("{Name: a@b; Domain:c}", parse("a@b@c"));
}

TEST(ParseSamlNameId, ChecksTheFormatFirst)
{
    EXPECT_EQ("Invalid or unsupported NameId format 'f'", ParseErrorOf([] {
                  ParseSamlNameId({"f", "@"});
              }));
}

TEST(ParseGroupIdentity, SplitsAtTheFirstBackslash)
{
    EXPECT_EQ("{Name: Admins; Domain:DOMAIN}", ParseGroupIdentity("DOMAIN\\Admins").ToString());
    EXPECT_EQ("{Name: G\\H; Domain:D}", ParseGroupIdentity("D\\G\\H").ToString());
    EXPECT_EQ(
        "Failed to parse Group Identity value: `\\D\\G'; domain or group missing",
        ParseErrorOf([] { ParseGroupIdentity("\\D\\G"); }));
}

TEST(ParseToDelegate, TakesNameAndInstant)
{
    const Delegate delegate = ParseToDelegate(
        {Quillon::System::DateTime("2012-01-31T11:00:00Z"), {Wire::UpnClaim, "a@b"}});
    EXPECT_EQ(PrincipalId("a", "b"), delegate.subject);
    EXPECT_EQ("2012-01-31T11:00:00.000Z", delegate.delegationDate.ToString());
}

TEST(ParseIsSolutionAttribute, IsTrueOnlyForTrueInAnyCase)
{
    EXPECT_TRUE(ParseIsSolutionAttribute(MakeAttribute("", {"true"})));
    EXPECT_TRUE(ParseIsSolutionAttribute(MakeAttribute("", {"TRUE"})));
    for (const char* value : {"1", "false", "", " true", "yes"}) {
        EXPECT_FALSE(ParseIsSolutionAttribute(MakeAttribute("", {value}))) << value;
    }
}

TEST(ParsePrincipalNameAttribute, IsTheFirstValueOrEmpty)
{
    EXPECT_EQ("a", ParsePrincipalNameAttribute(MakeAttribute("", {"a", "b"})));
    EXPECT_EQ("", ParsePrincipalNameAttribute(MakeAttribute("", {})));
}

TEST(SamlAttributePredicates, CompareNamesExactly)
{
    EXPECT_TRUE(SamlAttributeIsGroupIdentity(MakeAttribute(Wire::GroupIdentityAttribute, {})));
    EXPECT_TRUE(SamlAttributeIsSolution(MakeAttribute(Wire::IsSolutionAttribute, {})));
    EXPECT_TRUE(SamlAttributeIsGivenName(MakeAttribute(Wire::GivenNameClaim, {})));
    EXPECT_TRUE(SamlAttributeIsSurName(MakeAttribute(Wire::SurnameClaim, {})));

    const AttributeType other = MakeAttribute(std::string(Wire::GroupIdentityAttribute) + "/", {});
    EXPECT_FALSE(SamlAttributeIsGroupIdentity(other));
    EXPECT_FALSE(SamlAttributeIsSolution(other));
    EXPECT_FALSE(SamlAttributeIsGivenName(other));
    EXPECT_FALSE(SamlAttributeIsSurName(MakeAttribute(Wire::GivenNameClaim, {})));
}
