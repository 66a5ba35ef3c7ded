#include "ssoClient/wire/wireNames.h"
#include "unit/ssoClient/token/TokenText.h"

#include <gtest/gtest.h>

// A token with several things wrong is refused for the first of them. Callers and operators see
// one text per token, so which one it is stays as it is.
using namespace TokenText;
namespace Wire = SsoClient::Wire;

namespace {

constexpr char ConfirmationData[] =
    "<saml:SubjectConfirmationData NotOnOrAfter=\"2012-01-31T12:05:00Z\">";

class CheckOrder : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

std::string JudgeSigned(const std::string& assertion)
{
    return Judge(StsKey().Sign(assertion), {StsKey().GetCertificate()});
}

std::string UnexpectedAttributes(const std::string& element)
{
    return "ParseException: Unexpected attributes on element '" + element + "'";
}

std::string UnexpectedAttribute(const std::string& element)
{
    return "ParseException: Unexpected attribute 'a' on element '" + element + "'";
}

std::string Expected(const std::string& element)
{
    return "ParseException: Expected element '" + element + "' not found.";
}

} // namespace

TEST_F(CheckOrder, ShapeComesBeforeVersionAndId)
{
    std::string text = Replace(Bearer(), "Version=\"2.0\"", "Version=\"1.1\"");
    EXPECT_EQ("ParseException: Invalid token version", JudgeUnsigned(text));
    EXPECT_EQ(
        "ParseException: Unexpected elements under Assertion",
        JudgeUnsigned(InsertBefore(text, "</saml:Assertion>", "<a/>")));
}

TEST_F(CheckOrder, AttributesOfTheAssertionComeBeforeItsChildren)
{
    EXPECT_EQ(
        UnexpectedAttributes("Assertion"), JudgeUnsigned(Replace(Bearer(), " ID=", " a=\"\" ID=")));
    EXPECT_EQ(
        UnexpectedAttributes("Assertion"),
        JudgeUnsigned(
            InsertBefore(Replace(Bearer(), " ID=", " a=\"\" ID="), "<saml:Issuer ", "<a/>")));
    EXPECT_EQ(
        "ParseException: Assertion/@IssueInstant is not a date",
        JudgeUnsigned(InsertBefore(
            Replace(Bearer(), "2012-01-31T11:59:00.000Z", "now"), "<saml:Issuer ", "<a/>")));
}

TEST_F(CheckOrder, AttributesOfTheSubjectComeBeforeItsChildren)
{
    EXPECT_EQ(Expected("NameID"), JudgeReplaced("<saml:Subject>", "<saml:Subject><a/>"));
    EXPECT_EQ(
        UnexpectedAttributes("Subject"),
        JudgeReplaced("<saml:Subject>", "<saml:Subject a=\"\"><a/>"));
}

TEST_F(CheckOrder, AttributesOfANameIdComeBeforeItsText)
{
    EXPECT_EQ(
        UnexpectedAttributes("NameID"),
        JudgeReplaced(
            NameId("user@example.com"), "<saml:NameID a=\"\" Format=\"f\"><a/></saml:NameID>"));
}

TEST_F(CheckOrder, AttributesAndMethodOfTheConfirmationComeBeforeItsChildren)
{
    const std::string method = "Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\">";
    EXPECT_EQ(
        UnexpectedAttributes("SubjectConfirmation"),
        JudgeReplaced(method, "a=\"\" Method=\"m\"><saml:NameID/>"));
    EXPECT_EQ(
        "ParseException: Unknown subject confirmation method: 'm'",
        JudgeReplaced(method, "Method=\"m\"><saml:NameID/>"));
    EXPECT_EQ(
        "ParseException: Node 'NameID is missing required attribute 'Format'",
        JudgeReplaced(method, method + "<saml:NameID/>"));
}

TEST_F(CheckOrder, ContentOfBearerDataComesBeforeItsAttributes)
{
    EXPECT_EQ(
        "ParseException: Element 'SubjectConfirmationData' must be empty",
        JudgeReplaced(ConfirmationData, "<saml:SubjectConfirmationData a=\"\"><a/>"));
    EXPECT_EQ(
        "ParseException: Node 'SubjectConfirmationData is missing required attribute "
        "'NotOnOrAfter'",
        JudgeReplaced(ConfirmationData, "<saml:SubjectConfirmationData a=\"\">"));
}

TEST_F(CheckOrder, TypeOfHolderOfKeyDataComesBeforeItsKey)
{
    const std::string text = HolderOfKey("AAAA");
    EXPECT_EQ("CryptoException: ", JudgeUnsigned(text).substr(0, 17));
    EXPECT_EQ(
        "ParseException: Invalid SubjectConfirmationData type: 'Other'",
        JudgeUnsigned(Replace(text, "saml:KeyInfoConfirmationDataType", "Other")));
    EXPECT_EQ(
        UnexpectedAttribute("SubjectConfirmationData"),
        JudgeUnsigned(Replace(
            text, "xsi:type=\"saml:KeyInfoConfirmationDataType", "a=\"\" xsi:type=\"Other")));
}

TEST_F(CheckOrder, KeyInfoComesBeforeX509DataBeforeX509Certificate)
{
    std::string text = HolderOfKey("AAAA");
    text = Replace(text, "<ds:X509Certificate>", "<ds:X509Certificate a=\"\">");
    EXPECT_EQ(UnexpectedAttributes("X509Certificate"), JudgeUnsigned(text));
    text = Replace(text, "<ds:X509Data>", "<ds:X509Data a=\"\">");
    EXPECT_EQ(UnexpectedAttributes("X509Data"), JudgeUnsigned(text));
    text = Replace(text, "<ds:KeyInfo ", "<ds:KeyInfo a=\"\" ");
    EXPECT_EQ(UnexpectedAttributes("KeyInfo"), JudgeUnsigned(text));
}

TEST_F(CheckOrder, AttributesOfX509CertificateComeBeforeItsText)
{
    const std::string text =
        Replace(HolderOfKey("AAAA"), "<ds:X509Certificate>", "<ds:X509Certificate a=\"\"><a/>");
    EXPECT_EQ(UnexpectedAttributes("X509Certificate"), JudgeUnsigned(text));
}

TEST_F(CheckOrder, CertificateComesBeforeWhatFollowsIt)
{
    const auto judge = [](const std::string& certificate) {
        const std::string text =
            Replace(HolderOfKey(certificate), "</ds:X509Certificate>", "</ds:X509Certificate><a/>");
        return JudgeUnsigned(InsertBefore(text, "</ds:KeyInfo>", "<a/>"));
    };
    EXPECT_EQ("CryptoException: ", judge("AAAA").substr(0, 17));
    EXPECT_EQ(
        "ParseException: Unexpected elements after X509Certificate",
        judge(StsKey().GetCertificateBase64()));
}

TEST_F(CheckOrder, NameOfAnElementComesBeforeItsAttributes)
{
    const auto judge = [](const std::string& text, const std::string& startTag) {
        return JudgeUnsigned(InsertBefore(text, startTag, "<a b=\"\"/>"));
    };
    EXPECT_EQ(Expected("Subject"), judge(Bearer(), "<saml:Subject>"));
    EXPECT_EQ(Expected("SubjectConfirmation"), judge(Bearer(), "<saml:SubjectConfirmation "));
    EXPECT_EQ(Expected("Conditions"), judge(Bearer(), "<saml:Conditions "));
    EXPECT_EQ(Expected("AuthnStatement"), judge(Bearer(), "<saml:AuthnStatement "));
    EXPECT_EQ(Expected("AuthnContext"), judge(Bearer(), "<saml:AuthnContext>"));
    const std::string withKey = HolderOfKey("AAAA");
    EXPECT_EQ(Expected("KeyInfo"), judge(withKey, "<ds:KeyInfo "));
    EXPECT_EQ(Expected("X509Data"), judge(withKey, "<ds:X509Data>"));
    EXPECT_EQ(Expected("X509Certificate"), judge(withKey, "<ds:X509Certificate>"));
    EXPECT_EQ(
        Expected("Delegate"),
        JudgeConditions("<saml:Condition xsi:type=\"del:DelegationRestrictionType\"><a b=\"\"/>"
                        "</saml:Condition>"));
    EXPECT_EQ(
        Expected("RSAAdvice"),
        JudgeReplaced(
            "<saml:AuthnStatement ",
            "<saml:Advice><a b=\"\"/></saml:Advice><saml:AuthnStatement "));
    EXPECT_EQ(
        Expected("Attribute"),
        JudgeReplaced(
            "</saml:Assertion>",
            "<saml:AttributeStatement><a b=\"\"/></saml:AttributeStatement></saml:Assertion>"));
}

TEST_F(CheckOrder, AttributesAndDatesOfConditionsComeBeforeTheirChildren)
{
    const std::string start = "NotBefore=\"2012-01-31T11:55:00Z\"";
    const std::string text = InsertBefore(Bearer(), "</saml:Conditions>", "<a/>");
    EXPECT_EQ(
        UnexpectedAttributes("Conditions"),
        JudgeUnsigned(Replace(text, start, "a=\"\" NotBefore=\"x\"")));
    EXPECT_EQ(
        "ParseException: Conditions/@NotBefore is not a date",
        JudgeUnsigned(Replace(text, start, "NotBefore=\"x\"")));
    EXPECT_EQ(
        "ParseException: Conditions/@NotBefore is not a date",
        JudgeUnsigned(Replace(
            Bearer(),
            start + " NotOnOrAfter=\"2012-01-31T12:05:00Z\"",
            "NotBefore=\"x\" NotOnOrAfter=\"y\"")));
}

TEST_F(CheckOrder, AttributesAndInstantOfADelegateComeBeforeItsName)
{
    const std::string one = DelegationRestriction({"a@b"});
    const auto judge = [&one](const std::string& attributes) {
        std::string text = Replace(one, " DelegationInstant=\"2012-01-31T11:00:00Z\"", attributes);
        return JudgeConditions(Replace(text, NameId("a@b"), "<a/>"));
    };
    EXPECT_EQ(UnexpectedAttributes("Delegate"), judge(" a=\"\" DelegationInstant=\"x\""));
    EXPECT_EQ(
        "ParseException: Delegate/@DelegationInstant is not a date",
        judge(" DelegationInstant=\"x\""));
    EXPECT_EQ(Expected("NameID"), judge(" DelegationInstant=\"2012-01-31T11:00:00Z\""));
}

TEST_F(CheckOrder, AttributesOfTheDelegationRestrictionComeBeforeItsDelegates)
{
    EXPECT_EQ(
        UnexpectedAttribute("Condition"),
        JudgeConditions("<saml:Condition a=\"\" xsi:type=\"del:DelegationRestrictionType\"><a/>"
                        "</saml:Condition>"));
}

// [SAML-CORE 2.5.1.6]
TEST_F(CheckOrder, AttributesThenCountThenContentOfTheProxyRestriction)
{
    const std::string count =
        "ParseException: ProxyRestriction/@Count is not a non-negative integer.";
    EXPECT_EQ(
        UnexpectedAttributes("ProxyRestriction"),
        JudgeConditions("<saml:ProxyRestriction a=\"\" Count=\"x\"><a/></saml:ProxyRestriction>"));
    EXPECT_EQ(
        count, JudgeConditions("<saml:ProxyRestriction Count=\"x\"><a/></saml:ProxyRestriction>"));
    EXPECT_EQ(
        "ParseException: Element 'ProxyRestriction' must be empty",
        JudgeConditions("<saml:ProxyRestriction Count=\"1\"><a/></saml:ProxyRestriction>"));
}

TEST_F(CheckOrder, AttributesThenCountThenContentOfTheRenewRestriction)
{
    const auto judge = [](const std::string& attributes) {
        return JudgeConditions(
            "<saml:Condition" + attributes
            + " xsi:type=\"rsa:RenewRestrictionType\"><a/></saml:Condition>");
    };
    EXPECT_EQ(UnexpectedAttribute("Condition"), judge(" a=\"\" Count=\"x\""));
    EXPECT_EQ(
        "ParseException: Condition/@Count is not a non-negative integer.", judge(" Count=\"x\""));
    EXPECT_EQ("ParseException: Element 'Condition' must be empty", judge(" Count=\"1\""));
}

TEST_F(CheckOrder, AttributesOfStatementsAndAdviceComeBeforeTheirChildren)
{
    const auto judgeAdvice = [](const std::string& advice) {
        return JudgeReplaced("<saml:AuthnStatement ", advice + "<saml:AuthnStatement ");
    };
    EXPECT_EQ(
        UnexpectedAttributes("Advice"), judgeAdvice("<saml:Advice a=\"\"><a/></saml:Advice>"));
    EXPECT_EQ(
        UnexpectedAttributes("RSAAdvice"),
        judgeAdvice("<saml:Advice><rsa:RSAAdvice a=\"\" AdviceSource=\"s\"><a/></rsa:RSAAdvice>"
                    "</saml:Advice>"));
    EXPECT_EQ(
        UnexpectedAttributes("AuthnContext"),
        JudgeReplaced("<saml:AuthnContext>", "<saml:AuthnContext a=\"\"><a/>"));

    const std::string instant = "AuthnInstant=\"2012-01-31T11:59:00Z\">";
    EXPECT_EQ(
        UnexpectedAttributes("AuthnStatement"),
        JudgeReplaced(instant, "a=\"\" AuthnInstant=\"x\"><a/>"));
    EXPECT_EQ(
        "ParseException: AuthnStatement/@AuthnInstant is not a date",
        JudgeReplaced(instant, "AuthnInstant=\"x\"><a/>"));

    const auto judgeStatement = [](const std::string& statement) {
        return JudgeReplaced("</saml:Assertion>", statement + "</saml:Assertion>");
    };
    EXPECT_EQ(
        UnexpectedAttributes("AttributeStatement"),
        judgeStatement("<saml:AttributeStatement a=\"\"><a/></saml:AttributeStatement>"));
    EXPECT_EQ(
        UnexpectedAttributes("Attribute"),
        judgeStatement("<saml:AttributeStatement>"
                       "<saml:Attribute a=\"\" Name=\"n\" NameFormat=\"f\"><a/></saml:Attribute>"
                       "</saml:AttributeStatement>"));
}

TEST_F(CheckOrder, SubjectComesBeforeAttributesBeforeDelegates)
{
    const auto withFormat = [](const std::string& text) {
        return Replace(text, Wire::UpnClaim, "other");
    };
    const std::string delegate = withFormat(NameId("b@d"));
    std::string text = InsertBefore(Bearer(), "<saml:SubjectConfirmationData ", delegate);
    text = InsertBefore(text, "</saml:Conditions>", withFormat(DelegationRestriction({"b@d"})));
    EXPECT_EQ("ParseException: Invalid or unsupported NameId format 'other'", JudgeSigned(text));
    text = InsertBefore(
        text,
        "</saml:Assertion>",
        "<saml:AttributeStatement>" + Attribute(Wire::GroupIdentityAttribute, {"Admins"})
            + "</saml:AttributeStatement>");
    EXPECT_EQ(
        "ParseException: Failed to parse Group Identity value: `Admins'; domain or group missing",
        JudgeSigned(text));
    text = Replace(text, "user@example.com", "user");
    EXPECT_EQ(
        "ParseException: Failed to parse the UPN NameID: `user'; name or domain part is missing.",
        JudgeSigned(text));
}

TEST_F(CheckOrder, SignatureComesBeforeSubject)
{
    EXPECT_EQ(ReachesSignature, JudgeReplaced("user@example.com", "user"));
}
