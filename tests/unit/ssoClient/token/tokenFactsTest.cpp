#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/token/SamlTokenImpl.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"
#include "unit/ssoClient/token/TokenText.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <functional>

// What a token answers, and what it leaves unread, to the letter.
using namespace SsoClient;
using namespace TokenText;
using Quillon::Ref;

namespace {

std::string ToUpper(std::string text)
{
    std::transform(text.begin(), text.end(), text.begin(), [](unsigned char letter) {
        return static_cast<char>(std::toupper(letter));
    });
    return text;
}

class TokenFacts : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

/** A way to make a token that takes no tolerance. */
struct Factory
{
    const char* name;
    std::function<void(const std::string&)> create;
};

std::ostream& operator<<(std::ostream& out, const Factory& factory)
{
    return out << factory.name;
}

void CreateFromDom(const std::string& xml)
{
    Ref<Quillon::Xml::Document> document;
    ParseXML(xml, document);
    CreateSamlTokenFromDom(document->GetRootElement(), TrustSts());
}

const std::vector<Factory> Factories{
    {"Text", [](const std::string& xml) { CreateSamlToken(xml, TrustSts()); }},
    {"TextAndOneCertificate",
     [](const std::string& xml) { CreateSamlToken(xml, StsKey().GetCertificate().get()); }},
    {"Dom", CreateFromDom},
};

std::string NameOf(const testing::TestParamInfo<Factory>& tested)
{
    return tested.param.name;
}

class DefaultTolerance : public testing::TestWithParam<Factory>
{
protected:
    /** What the factory says at `now` of a token that is valid from 11:55 to 12:05. */
    static std::string JudgeAt(const std::string& now)
    {
        const FixedClock clock(now);
        try {
            GetParam().create(StsKey().Sign(Bearer()));
            return "accepted";
        } catch (const ParseException& error) {
            return error.what();
        }
    }
};

/** Goes on by a day each time that it is read. */
class MovingClock final : public Quillon::System::Clock
{
public:
    explicit MovingClock(const std::string& start)
        : _start(Quillon::System::DateTime(start).GetUtcTime())
        , _previous(Quillon::System::ReplaceClock(this))
    {}
    ~MovingClock() { Quillon::System::ReplaceClock(_previous); }
    MovingClock(const MovingClock&) = delete;
    MovingClock& operator=(const MovingClock&) = delete;

    Quillon::System::DateTime Now() const override
    {
        constexpr long long Day = 86'400'000'000;
        return Quillon::System::DateTimeFromUtc(_start + Day * _reads++, false);
    }

    int GetReads() const { return _reads; }

private:
    long long _start;
    mutable int _reads = 0;
    const Quillon::System::Clock* _previous;
};

SamlAssertionType ReadModel(const std::string& assertion)
{
    Ref<Quillon::Xml::Document> document;
    ParseXML(WithDummySignature(assertion), document);
    NodeFilterIterator iterator(
        document->GetRootElement(), boost::make_shared<SkipWsAndCommentsFilter>());
    SamlAssertionType model;
    ParseSamlAssertionElement(iterator, model);
    return model;
}

} // namespace

TEST_P(DefaultTolerance, IsSixHundredSecondsAtTheStart)
{
    EXPECT_EQ("accepted", JudgeAt("2012-01-31T11:45:00Z"));
    EXPECT_EQ(
        "Token start date is in the future: 2012-01-31T11:55:00.000Z",
        JudgeAt("2012-01-31T11:44:59.999999Z"));
}

TEST_P(DefaultTolerance, IsSixHundredSecondsAtTheEnd)
{
    EXPECT_EQ("accepted", JudgeAt("2012-01-31T12:14:59.999999Z"));
    EXPECT_EQ(
        "The token has expired at: 2012-01-31T12:05:00.000Z", JudgeAt("2012-01-31T12:15:00Z"));
}

INSTANTIATE_TEST_SUITE_P(Of, DefaultTolerance, testing::ValuesIn(Factories), NameOf);

TEST(Clock, IsReadOncePerCheck)
{
    // At the second reading the token would have expired.
    const MovingClock clock("2012-01-31T12:00:00Z");
    EXPECT_EQ(ReachesSignature, JudgeUnsigned(Bearer(), 0));
    EXPECT_EQ(1, clock.GetReads());
}

TEST_F(TokenFacts, SubjectValidityIsComparedToTheMicrosecond)
{
    const auto judge = [](const std::string& end) {
        return JudgeUnsigned(Replace(
            Bearer(),
            "<saml:SubjectConfirmationData NotOnOrAfter=\"2012-01-31T12:05:00Z\">",
            "<saml:SubjectConfirmationData NotOnOrAfter=\"" + end + "\">"));
    };
    EXPECT_EQ(ReachesSignature, judge("2012-01-31T12:05:00Z"));
    EXPECT_EQ(
        "ParseException: Invalid token subject validity", judge("2012-01-31T12:04:59.999999Z"));
    EXPECT_EQ(
        "ParseException: Invalid token subject validity",
        JudgeUnsigned(Replace(
            Bearer(),
            "NotOnOrAfter=\"2012-01-31T12:05:00Z\"></saml:Conditions>",
            "NotOnOrAfter=\"2012-01-31T12:05:00.000001Z\"></saml:Conditions>")));
}

TEST_F(TokenFacts, TheLastSolutionFlagCounts)
{
    const auto isSolution = [](const char* first, const char* second) {
        return MakeToken(WithAttributes(
                             Attribute(Wire::IsSolutionAttribute, {first})
                             + Attribute(Wire::IsSolutionAttribute, {second})))
            ->IsSolution();
    };
    EXPECT_TRUE(isSolution("false", "true"));
    EXPECT_FALSE(isSolution("true", "false"));
}

TEST_F(TokenFacts, ABlankBesideTrueIsNotTrue)
{
    for (const char* value : {"true ", " true", "true\n"}) {
        EXPECT_FALSE(
            MakeToken(WithAttributes(Attribute(Wire::IsSolutionAttribute, {value})))->IsSolution())
            << value;
    }
}

TEST_F(TokenFacts, TheFirstOfSeveralNamesCountsEvenIfItIsEmpty)
{
    const auto token = MakeToken(WithAttributes(
        Attribute(Wire::GivenNameClaim, {"", "Ann"}) + Attribute(Wire::SurnameClaim, {"", "Lee"})));
    std::pair<std::string, std::string> name("old", "old");
    token->GetFullName(name);
    EXPECT_EQ(std::make_pair(std::string(), std::string()), name);
}

TEST_F(TokenFacts, AttributeNamesAreComparedWithTheirCase)
{
    for (const char* name :
         {Wire::GroupIdentityAttribute,
          Wire::IsSolutionAttribute,
          Wire::GivenNameClaim,
          Wire::SurnameClaim}) {
        const AttributeType upper{ToUpper(name), "", "", {}};
        EXPECT_FALSE(SamlAttributeIsGroupIdentity(upper)) << name;
        EXPECT_FALSE(SamlAttributeIsSolution(upper)) << name;
        EXPECT_FALSE(SamlAttributeIsGivenName(upper)) << name;
        EXPECT_FALSE(SamlAttributeIsSurName(upper)) << name;
    }
}

TEST_F(TokenFacts, NameIdFormatsAreComparedWithTheirCase)
{
    EXPECT_EQ(
        "ParseException: Invalid or unsupported NameId format '" + ToUpper(Wire::UpnClaim) + "'",
        Judge(
            StsKey().Sign(Replace(Bearer(), Wire::UpnClaim, ToUpper(Wire::UpnClaim))), TrustSts()));
}

TEST_F(TokenFacts, DelegatesAreComparedToTheLetter)
{
    const auto judge = [](const std::string& nameId) {
        return JudgeUnsigned(InsertBefore(
            WithConditions(DelegationRestriction({"b@d"})),
            "<saml:SubjectConfirmationData ",
            nameId));
    };
    const std::string mismatch = "ParseException: The SubjectConfirmation delegate id does not "
                                 "match the id of the last delegate";
    EXPECT_EQ(ReachesSignature, judge(NameId("b@d")));
    EXPECT_EQ(mismatch, judge(NameId("B@d")));
    EXPECT_EQ(mismatch, judge(NameId("b@d ")));
    EXPECT_EQ(mismatch, judge(NameId("b@")));
    EXPECT_EQ(mismatch, judge(Replace(NameId("b@d"), Wire::UpnClaim, ToUpper(Wire::UpnClaim))));
}

TEST_F(TokenFacts, DelegatesKeepTheirBlanks)
{
    const auto token = MakeToken(InsertBefore(
        WithConditions(DelegationRestriction({" b@d "})),
        "<saml:SubjectConfirmationData ",
        NameId(" b@d ")));
    std::vector<Delegate> chain;
    token->GetDelegationChain(chain);
    ASSERT_EQ(1U, chain.size());
    EXPECT_EQ(PrincipalId(" b", "d "), chain.front().subject);
}

TEST_F(TokenFacts, AudiencesKeepTheirBlanks)
{
    const auto token = MakeToken(WithConditions(
        "<saml:AudienceRestriction><saml:Audience>a</saml:Audience><saml:Audience>a "
        "</saml:Audience><saml:Audience> a</saml:Audience></saml:AudienceRestriction>"));
    std::set<std::string> audience;
    token->GetAudience(audience);
    EXPECT_EQ((std::set<std::string>{"a", "a ", " a"}), audience);
}

TEST_F(TokenFacts, TypeNamespacesAreComparedWithTheirCase)
{
    const auto judge = [](const std::string& namespaceUri, const std::string& type) {
        return JudgeUnsigned(WithConditions(
            "<saml:Condition xmlns:t=\"" + namespaceUri + "\" xsi:type=\"t:" + type + "\"/>"));
    };
    const std::string unknown =
        "ParseException: Unknown or duplicate restriction node under Conditions: Condition";
    EXPECT_EQ(ReachesSignature, judge(Wire::RsaNamespace, "RenewRestrictionType"));
    EXPECT_EQ(unknown, judge(ToUpper(Wire::RsaNamespace), "RenewRestrictionType"));
    EXPECT_EQ(unknown, judge(Wire::RsaNamespace, "renewRestrictionType"));
    EXPECT_EQ(
        "ParseException: Expected element 'Delegate' not found.",
        judge(Wire::DelegationNamespace, "DelegationRestrictionType"));
    EXPECT_EQ(unknown, judge(ToUpper(Wire::DelegationNamespace), "DelegationRestrictionType"));
    EXPECT_EQ(
        "ParseException: Invalid SubjectConfirmationData type: '{" + ToUpper(Wire::SamlNamespace)
            + "}KeyInfoConfirmationDataType'",
        JudgeUnsigned(Replace(
            HolderOfKey("AAAA"),
            "xsi:type=\"saml:",
            "xmlns:t=\"" + ToUpper(Wire::SamlNamespace) + "\" xsi:type=\"t:")));
}

TEST_F(TokenFacts, ACountOfMinusZeroIsZero)
{
    const auto token = MakeToken(WithConditions(
        "<saml:ProxyRestriction Count=\"-0\"></saml:ProxyRestriction>"
        "<saml:Condition Count=\"-0\" xsi:type=\"rsa:RenewRestrictionType\"></saml:Condition>"));
    EXPECT_FALSE(token->IsDelegable());
    EXPECT_FALSE(token->IsRenewable());
}

TEST_F(TokenFacts, WhatHasNoMeaningHereMayBeEmpty)
{
    const auto token = MakeToken(InsertBefore(
        Replace(
            WithAttributes("<saml:Attribute Name=\"\" NameFormat=\"\"></saml:Attribute>"),
            "Format=\"urn:oasis:names:tc:SAML:2.0:nameid-format:entity\"",
            "Format=\"\""),
        "<saml:AuthnStatement ",
        "<saml:Advice><rsa:RSAAdvice AdviceSource=\"\">" + Attribute("", {""})
            + "</rsa:RSAAdvice></saml:Advice>"));
    std::vector<Advice> advice;
    token->GetAdvice(advice);
    ASSERT_EQ(1U, advice.size());
    EXPECT_EQ("", advice[0].source);
    ASSERT_EQ(1U, advice[0].attributes.size());
    EXPECT_EQ("", advice[0].attributes[0].name);
    EXPECT_EQ(std::vector<std::string>{""}, advice[0].attributes[0].values);
}

TEST_F(TokenFacts, DatesWithoutMeaningHereMayBeAny)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeUnsigned(Replace(Bearer(), "2012-01-31T11:59:00.000Z", "9999-01-01T00:00:00Z")));
    EXPECT_EQ(
        ReachesSignature,
        JudgeUnsigned(Replace(
            Bearer(),
            "AuthnInstant=\"2012-01-31T11:59:00Z\"",
            "AuthnInstant=\"0001-01-01T00:00:00Z\"")));
}

// No operation of a token gives these, but the model has them for those who read it.
TEST(AssertionModel, HoldsWhatTheTokenDoesNotGive)
{
    const SamlAssertionType model = ReadModel(InsertBefore(
        Bearer(),
        "</saml:Assertion>",
        "<saml:AttributeStatement><saml:Attribute FriendlyName=\"friend\" Name=\"n\""
        " NameFormat=\"format\"/><saml:Attribute Name=\"m\" NameFormat=\"f\"/>"
        "</saml:AttributeStatement>"));
    EXPECT_EQ("2.0", model.Version);
    EXPECT_EQ("_token", model.ID);
    EXPECT_EQ("2012-01-31T11:59:00.000Z", model.IssueInstant.ToString());
    EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:nameid-format:entity", model.Issuer.Format);
    EXPECT_EQ("https://sts.example.com", model.Issuer.Value);
    EXPECT_EQ("2012-01-31T11:59:00.000Z", model.AuthnStatement.AuthnInstant.ToString());
    EXPECT_EQ("password", model.AuthnStatement.AuthnContext.AuthnContextClassRef);
    EXPECT_EQ(
        "2012-01-31T12:05:00.000Z",
        model.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter.ToString());
    ASSERT_TRUE(model.AttributeStatement);
    ASSERT_EQ(2U, model.AttributeStatement->Attribute.size());
    EXPECT_EQ("friend", model.AttributeStatement->Attribute[0].FriendlyName);
    EXPECT_EQ("format", model.AttributeStatement->Attribute[0].NameFormat);
    EXPECT_EQ("", model.AttributeStatement->Attribute[1].FriendlyName);
}

namespace {

// A comment is not signed, so whoever passes the token on may put one beside a blank; the blank is
// then not part of the value any more.
class CommentBesideABlank : public TokenFacts
{
protected:
    static boost::shared_ptr<const SamlToken> MakeCommented(
        const std::string& assertion, const std::string& from, const std::string& to)
    {
        return CreateSamlToken(Replace(StsKey().Sign(assertion), from, to), TrustSts());
    }
};

} // namespace

TEST_F(CommentBesideABlank, TurnsTheSolutionFlag)
{
    const std::string assertion = WithAttributes(Attribute(Wire::IsSolutionAttribute, {"true "}));
    EXPECT_FALSE(MakeToken(assertion)->IsSolution());
    EXPECT_TRUE(MakeCommented(assertion, ">true <", ">true<!-- --> <")->IsSolution());
}

TEST_F(CommentBesideABlank, TakesTheBlankOffAnAudience)
{
    const std::string assertion = WithConditions(
        "<saml:AudienceRestriction><saml:Audience>a </saml:Audience></saml:AudienceRestriction>");
    std::set<std::string> audience;
    MakeCommented(assertion, ">a <", ">a<!-- --> <")->GetAudience(audience);
    EXPECT_EQ(std::set<std::string>{"a"}, audience);
}

TEST_F(CommentBesideABlank, TakesTheBlankOffADelegate)
{
    const std::string assertion = InsertBefore(
        WithConditions(DelegationRestriction({"b@d "})),
        "<saml:SubjectConfirmationData ",
        NameId("b@d"));
    EXPECT_EQ(
        "ParseException: The SubjectConfirmation delegate id does not match the id of the last "
        "delegate",
        Judge(StsKey().Sign(assertion), TrustSts()));
    std::vector<Delegate> chain;
    MakeCommented(assertion, ">b@d <", ">b@d<!-- --> <")->GetDelegationChain(chain);
    ASSERT_EQ(1U, chain.size());
    EXPECT_EQ(PrincipalId("b", "d"), chain.front().subject);
}

TEST_F(CommentBesideABlank, IsRefusedInATree)
{
    const std::string signedText =
        StsKey().Sign(WithAttributes(Attribute(Wire::IsSolutionAttribute, {"true "})));
    const auto judge = [&](const std::string& value) {
        try {
            CreateFromDom(Replace(signedText, ">true <", ">" + value + "<"));
            return std::string("accepted");
        } catch (const ParseException& error) {
            return std::string(error.what());
        }
    };
    EXPECT_EQ("accepted", judge("true "));
    EXPECT_EQ("accepted", judge("true <!-- -->"));
    EXPECT_EQ("accepted", judge("<!-- -->true "));
    EXPECT_EQ(
        "Element 'AttributeValue' must only have textual content (but has extra children or is "
        "empty).",
        judge("true<!-- --> "));
}

// Blanks mean nothing in Base64, so that both readings of a certificate are one.
TEST_F(CommentBesideABlank, MayStandInACertificateOfATree)
{
    const std::string signedText =
        StsKey().Sign(HolderOfKey(StsKey().GetCertificateBase64() + "\n"));
    EXPECT_NO_THROW(CreateFromDom(Replace(
        signedText,
        "\n</ds:X509Certificate></ds:X509Data></ds:KeyInfo></saml:Subject",
        "<!-- -->\n</ds:X509Certificate></ds:X509Data></ds:KeyInfo></saml:Subject")));
}

// [XML Schema 2, 4.3.6]
TEST_F(TokenFacts, AnIdHasNoWhiteSpace)
{
    const auto judge = [](const std::string& id) {
        return Judge(
            StsKey().Sign(Replace(Bearer(), "\"_token\"", "\"" + id + "\""), "#" + id), TrustSts());
    };
    EXPECT_EQ("accepted", judge("_to.ken-1"));
    for (const std::string id : {"_token ", "_to ken"}) {
        EXPECT_EQ(
            "InvalidSignatureException: Signature verification error. Reference '#" + id
                + "' has white space in its ID",
            judge(id));
    }
}
