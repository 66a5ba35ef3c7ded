#include "ssoClient/token/samlAssertion.h"

#include "ssoClient/wire/wireNames.h"
#include "unit/ssoClient/token/TokenText.h"

#include <gtest/gtest.h>

using namespace TokenText;
namespace Wire = SsoClient::Wire;

namespace {

constexpr char EmptyConditions[] = "NotOnOrAfter=\"2012-01-31T12:05:00Z\"></saml:Conditions>";
constexpr char BearerMethod[] = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr char ConfirmationData[] =
    "<saml:SubjectConfirmationData NotOnOrAfter=\"2012-01-31T12:05:00Z\">";
constexpr char EndOfConfirmationData[] = "</saml:SubjectConfirmationData>";

/** Judges tokens at a time at which they are valid. */
class ReadAssertion : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

/** A bearer assertion with `conditions` as the children of its Conditions. */
std::string WithConditions(const std::string& conditions)
{
    return Replace(
        Bearer(),
        EmptyConditions,
        "NotOnOrAfter=\"2012-01-31T12:05:00Z\">" + conditions + "</saml:Conditions>");
}

std::string JudgeConditions(const std::string& conditions)
{
    return JudgeUnsigned(WithConditions(conditions));
}

std::string JudgeReplaced(const std::string& from, const std::string& to)
{
    return JudgeUnsigned(Replace(Bearer(), from, to));
}

std::string Expected(const std::string& element)
{
    return "ParseException: Expected element '" + element + "' not found.";
}

std::string UnexpectedAttributes(const std::string& element)
{
    return "ParseException: Unexpected attributes on element '" + element + "'";
}

std::string Missing(const std::string& element, const std::string& attribute)
{
    return "ParseException: Node '" + element + " is missing required attribute '" + attribute
           + "'";
}

} // namespace

TEST_F(ReadAssertion, AcceptsTheBearerShape)
{
    EXPECT_EQ(ReachesSignature, JudgeUnsigned(Bearer()));
}

TEST_F(ReadAssertion, AcceptsBlanksAndCommentsBetweenElements)
{
    std::string text = WithDummySignature(Bearer());
    text = Replace(text, "<saml:Subject>", " <!-- c -->\n<saml:Subject>\t");
    text = Replace(text, "<saml:Conditions", "<!-- c --><saml:Conditions");
    text = Replace(text, "</saml:Assertion>", "\n</saml:Assertion>");
    EXPECT_EQ(ReachesSignature, Judge(text));
}

TEST_F(ReadAssertion, AcceptsOtherPrefixes)
{
    std::string text = WithDummySignature(Bearer());
    for (const auto& [from, to] : {std::pair("xmlns:saml=", "xmlns="), std::pair("saml:", "")}) {
        for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from)) {
            text.replace(at, std::string(from).size(), to);
        }
    }
    EXPECT_EQ(ReachesSignature, Judge(text));
}

TEST_F(ReadAssertion, RefusesAnotherRoot)
{
    EXPECT_EQ(Expected("Assertion"), Judge("<a/>"));
    EXPECT_EQ(
        "ParseException: Element 'Assertion' has unexpected namespace",
        Judge("<Assertion xmlns='urn:oasis:names:tc:SAML:1.0:assertion'/>"));
    EXPECT_EQ("XMLParseException", Judge("no XML").substr(0, 17));
}

TEST_F(ReadAssertion, RequiresTheAttributesOfTheAssertion)
{
    EXPECT_EQ(Missing("Assertion", "Version"), JudgeReplaced(" Version=\"2.0\"", ""));
    EXPECT_EQ(Missing("Assertion", "ID"), JudgeReplaced(" ID=\"_token\"", ""));
    EXPECT_EQ(
        Missing("Assertion", "IssueInstant"),
        JudgeReplaced(" IssueInstant=\"2012-01-31T11:59:00.000Z\"", ""));
    EXPECT_EQ(
        UnexpectedAttributes("Assertion"),
        JudgeReplaced(" ID=", " xsi:schemaLocation=\"a b\" ID="));
    EXPECT_EQ(
        "ParseException: Assertion/@IssueInstant is not a date",
        JudgeReplaced("2012-01-31T11:59:00.000Z", "2012-01-31"));
}

TEST_F(ReadAssertion, RequiresTheIssuerFirst)
{
    const std::string text = WithDummySignature(Bearer());
    EXPECT_EQ(
        Expected("Issuer"), Judge(InsertBefore(text, "<saml:Issuer ", NameId("user@example.com"))));
    EXPECT_EQ(Expected("Issuer"), Judge(InsertBefore(text, "<saml:Issuer ", "text")));
}

TEST_F(ReadAssertion, ReadsNameIdsStrictly)
{
    const std::string format = R"(Format="urn:oasis:names:tc:SAML:2.0:nameid-format:entity")";
    EXPECT_EQ(Missing("Issuer", "Format"), JudgeReplaced(" " + format, ""));
    EXPECT_EQ(
        UnexpectedAttributes("Issuer"), JudgeReplaced(format, format + " NameQualifier=\"q\""));
    EXPECT_EQ(
        "ParseException: Element 'Issuer' must only have textual content (but has extra children "
        "or is empty).",
        JudgeReplaced("https://sts.example.com", " "));
    EXPECT_EQ(
        "ParseException: Element 'NameID' must only have textual content (but has extra children "
        "or is empty).",
        JudgeReplaced("user@example.com", "user<!-- -->@example.com"));
    EXPECT_EQ(
        Missing("NameID", "Format"),
        JudgeReplaced(std::string("NameID Format=\"") + Wire::UpnClaim + "\"", "NameID"));
}

TEST_F(ReadAssertion, RequiresTheSignatureAfterTheIssuer)
{
    const std::string text = WithDummySignature(Bearer());
    EXPECT_EQ(
        "ParseException: Expected element ds:Signature not found",
        Judge(InsertBefore(text, "<ds:Signature ", "text")));
    EXPECT_EQ(
        "ParseException: Signature syntax error: Expected element 'Signature', found "
        "'saml:Subject'",
        Judge(Bearer()));
    EXPECT_EQ(
        "ParseException: Expected element ds:Signature not found",
        Judge(text.substr(0, text.find("<ds:Signature ")) + "</saml:Assertion>"));
}

TEST_F(ReadAssertion, WrapsTheErrorsOfTheSignaturesShape)
{
    const std::string text = WithDummySignature(Bearer());
    EXPECT_EQ(
        "ParseException: Signature syntax error: 'Reference' has no attribute 'URI'",
        Judge(Replace(text, " URI=\"#_token\"", "")));
}

TEST_F(ReadAssertion, RequiresAReferenceToTheWholeToken)
{
    const std::string text = WithDummySignature(Bearer());
    EXPECT_EQ(ReachesSignature, Judge(Replace(text, "URI=\"#_token\"", "URI=\"\"")));
    for (const char* uri :
         {"#_other", "_token", "x_token", "#", "#_token2", "##_token", "#_TOKEN"}) {
        EXPECT_EQ(
            "ParseException: Token's signature must cover the entire token",
            Judge(Replace(text, "URI=\"#_token\"", std::string("URI=\"") + uri + "\"")))
            << uri;
    }
}

TEST_F(ReadAssertion, ReadsTheSubjectStrictly)
{
    EXPECT_EQ(
        UnexpectedAttributes("Subject"), JudgeReplaced("<saml:Subject>", "<saml:Subject a=\"\">"));
    EXPECT_EQ(Expected("Subject"), JudgeReplaced("<saml:Subject>", "<saml:Advice/><saml:Subject>"));
    EXPECT_EQ(Expected("NameID"), JudgeReplaced(NameId("user@example.com"), ""));
    EXPECT_EQ(
        Expected("SubjectConfirmation"),
        JudgeReplaced(NameId("user@example.com"), NameId("a@b") + NameId("c@d")));
    EXPECT_EQ(
        "ParseException: Unexpected elements after SubjectConfirmation",
        JudgeReplaced("</saml:Subject>", "<saml:SubjectConfirmation/></saml:Subject>"));
}

TEST_F(ReadAssertion, KnowsTwoConfirmationMethods)
{
    EXPECT_EQ(
        "ParseException: Unknown subject confirmation method: "
        "'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'",
        JudgeReplaced(BearerMethod, "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches"));
    EXPECT_EQ(
        "ParseException: Unknown subject confirmation method: "
        "'urn:oasis:names:tc:SAML:2.0:cm:Bearer'",
        JudgeReplaced(BearerMethod, "urn:oasis:names:tc:SAML:2.0:cm:Bearer"));
    EXPECT_EQ(
        Missing("SubjectConfirmation", "Method"),
        JudgeReplaced(" Method=\"" + std::string(BearerMethod) + "\"", ""));
    EXPECT_EQ(
        UnexpectedAttributes("SubjectConfirmation"),
        JudgeReplaced(" Method=", " Address=\"a\" Method="));
}

TEST_F(ReadAssertion, RequiresConfirmationData)
{
    const std::string data = std::string(ConfirmationData) + EndOfConfirmationData;
    EXPECT_EQ(Expected("SubjectConfirmationData"), JudgeReplaced(data, ""));
    EXPECT_EQ(
        "ParseException: Unexpected elements after SubjectConfirmationData",
        JudgeReplaced(data, data + data));
    EXPECT_EQ(
        Expected("SubjectConfirmationData"),
        JudgeReplaced(data, NameId("a@b") + NameId("c@d") + data));
}

TEST_F(ReadAssertion, ReadsBearerDataStrictly)
{
    const std::string attribute = "NotOnOrAfter=\"2012-01-31T12:05:00Z\">";
    const std::string data = "<saml:SubjectConfirmationData ";
    EXPECT_EQ(
        UnexpectedAttributes("SubjectConfirmationData"),
        JudgeReplaced(data, data + "Recipient=\"r\" "));
    EXPECT_EQ(
        Missing("SubjectConfirmationData", "NotOnOrAfter"),
        JudgeReplaced(data + attribute, data + ">"));
    EXPECT_EQ(
        "ParseException: SubjectConfirmationData/@NotOnOrAfter is not a date",
        JudgeReplaced(data + "NotOnOrAfter=\"2012", data + "NotOnOrAfter=\"12"));
    EXPECT_EQ(
        "ParseException: Element 'SubjectConfirmationData' must be empty",
        JudgeReplaced(EndOfConfirmationData, "<a/></saml:SubjectConfirmationData>"));
    EXPECT_EQ(
        ReachesSignature,
        JudgeReplaced(EndOfConfirmationData, " <!-- c --></saml:SubjectConfirmationData>"));
}

/** Judges tokens with a holder-of-key confirmation. */
class ReadHolderOfKey : public ReadAssertion
{
protected:
    std::string Token() const { return HolderOfKey(_key.GetCertificateBase64()); }

    std::string JudgeReplaced(const std::string& from, const std::string& to) const
    {
        return JudgeUnsigned(Replace(Token(), from, to));
    }

    const SigningKey& _key = StsKey(); // NOLINT(readability-identifier-naming)
};

TEST_F(ReadHolderOfKey, AcceptsTheShape)
{
    EXPECT_EQ(ReachesSignature, JudgeUnsigned(Token()));
}

TEST_F(ReadHolderOfKey, AcceptsTheTypeThroughAnyPrefix)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeReplaced(
            "xsi:type=\"saml:",
            "xmlns:other=\"urn:oasis:names:tc:SAML:2.0:assertion\" xsi:type=\"other:"));
}

TEST_F(ReadHolderOfKey, AcceptsAnUnprefixedTypeOnlyInTheDefaultNamespace)
{
    const std::string unprefixed = "xsi:type=\"KeyInfo";
    EXPECT_EQ(
        "ParseException: Invalid SubjectConfirmationData type: 'KeyInfoConfirmationDataType'",
        JudgeReplaced("xsi:type=\"saml:KeyInfo", unprefixed));
    EXPECT_EQ(
        "ParseException: Invalid SubjectConfirmationData type: "
        "'{urn:x}KeyInfoConfirmationDataType'",
        JudgeReplaced("xsi:type=\"saml:KeyInfo", "xmlns=\"urn:x\" " + unprefixed));
    EXPECT_EQ(
        ReachesSignature,
        JudgeReplaced(
            "xsi:type=\"saml:KeyInfo",
            "xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\" " + unprefixed));
}

TEST_F(ReadHolderOfKey, RefusesAnotherType)
{
    EXPECT_EQ(
        "ParseException: Invalid SubjectConfirmationData type: "
        "'{urn:oasis:names:tc:SAML:2.0:assertion}SubjectConfirmationDataType'",
        JudgeReplaced("KeyInfoConfirmationDataType", "SubjectConfirmationDataType"));
    const std::string undeclared = JudgeReplaced("xsi:type=\"saml:", "xsi:type=\"nope:");
    EXPECT_EQ("ParseException: Element SubjectConfirmationDataat 1,", undeclared.substr(0, 52));
    EXPECT_NE(std::string::npos, undeclared.find(" uses undefined prefix: `nope'"));
}

TEST_F(ReadHolderOfKey, RequiresTheTypeAndNothingElse)
{
    const std::string type = " xsi:type=\"saml:KeyInfoConfirmationDataType\"";
    EXPECT_EQ(
        Missing("SubjectConfirmationData", "http://www.w3.org/2001/XMLSchema-instance:type"),
        JudgeReplaced(type, ""));
    EXPECT_EQ(
        "ParseException: Unexpected attribute 'NotOnOrAfter' on element 'SubjectConfirmationData'",
        JudgeReplaced(type, type + " NotOnOrAfter=\"2012-01-31T12:05:00Z\""));
    EXPECT_EQ(
        "ParseException: Unexpected attribute 'type' on element 'SubjectConfirmationData'",
        JudgeReplaced(" xsi:type=", " type="));
}

TEST_F(ReadHolderOfKey, RefusesTwoAttributesOfOneName)
{
    const std::string text = Replace(
        Token(),
        "xsi:type=\"saml:",
        "xmlns:x=\"http://www.w3.org/2001/XMLSchema-instance\" x:type=\"saml:Other\" "
        "xsi:type=\"saml:");
    EXPECT_EQ("XMLParseException", JudgeUnsigned(text).substr(0, 17));
}

TEST_F(ReadHolderOfKey, ReadsTheKeyInfoStrictly)
{
    EXPECT_EQ(
        Expected("KeyInfo"),
        JudgeReplaced("KeyInfoConfirmationDataType\">", "KeyInfoConfirmationDataType\"><a/>"));
    EXPECT_EQ(
        "ParseException: Unexpected elements after SubjectConfirmationData/KeyInfo",
        JudgeReplaced("</ds:KeyInfo>", "</ds:KeyInfo><a/>"));
    EXPECT_EQ(
        UnexpectedAttributes("KeyInfo"), JudgeReplaced("<ds:KeyInfo ", "<ds:KeyInfo Id=\"a\" "));
    EXPECT_EQ(Expected("X509Data"), JudgeReplaced("<ds:X509Data>", "<ds:KeyName/><ds:X509Data>"));
    EXPECT_EQ(
        "ParseException: Unexpected elements after X509Data",
        JudgeReplaced("</ds:X509Data>", "</ds:X509Data><ds:X509Data/>"));
    EXPECT_EQ(
        UnexpectedAttributes("X509Data"), JudgeReplaced("<ds:X509Data>", "<ds:X509Data a=\"\">"));
}

TEST_F(ReadHolderOfKey, ReadsTheCertificateStrictly)
{
    const std::string certificate = "<ds:X509Certificate>" + _key.GetCertificateBase64();
    EXPECT_EQ(
        Expected("X509Certificate"),
        JudgeReplaced("<ds:X509Certificate>", "<ds:X509SKI/><ds:X509Certificate>"));
    EXPECT_EQ(
        "ParseException: Unexpected elements after X509Certificate",
        JudgeReplaced("</ds:X509Certificate>", "</ds:X509Certificate><ds:X509Certificate/>"));
    EXPECT_EQ(
        UnexpectedAttributes("X509Certificate"),
        JudgeReplaced("<ds:X509Certificate>", "<ds:X509Certificate a=\"\">"));
    EXPECT_EQ(
        "ParseException: Element 'X509Certificate' must only have textual content (but has extra "
        "children or is empty).",
        JudgeReplaced(certificate, "<ds:X509Certificate>"));
}

TEST_F(ReadHolderOfKey, LetsTheDecodersErrorsPass)
{
    const std::string certificate = "<ds:X509Certificate>" + _key.GetCertificateBase64();
    EXPECT_EQ(
        "Base64FormatException: ",
        JudgeReplaced(certificate, "<ds:X509Certificate>!").substr(0, 23));
    EXPECT_EQ(
        "CryptoException: ", JudgeReplaced(certificate, "<ds:X509Certificate>AAAA").substr(0, 17));
}

TEST_F(ReadHolderOfKey, AcceptsABrokenBase64Line)
{
    EXPECT_EQ(
        ReachesSignature, JudgeReplaced("<ds:X509Certificate>M", "<ds:X509Certificate>\nM\n"));
}

TEST_F(ReadAssertion, ReadsConditionsStrictly)
{
    EXPECT_EQ(
        Missing("Conditions", "NotBefore"),
        JudgeReplaced(
            "NotBefore=\"2012-01-31T11:55:00Z\" NotOnOrAfter=\"2012-01-31T12:05:00Z\"",
            "NotOnOrAfter=\"x\""));
    EXPECT_EQ(
        Missing("Conditions", "NotOnOrAfter"),
        JudgeReplaced(
            " NotOnOrAfter=\"2012-01-31T12:05:00Z\"></saml:Conditions>", "></saml:Conditions>"));
    EXPECT_EQ(
        "ParseException: Conditions/@NotBefore is not a date",
        JudgeReplaced("NotBefore=\"2012-01-31T11:55:00Z\"", "NotBefore=\"\""));
    EXPECT_EQ(
        "ParseException: Conditions/@NotOnOrAfter is not a date",
        JudgeReplaced(EmptyConditions, "NotOnOrAfter=\"12:05\"></saml:Conditions>"));
    EXPECT_EQ(
        UnexpectedAttributes("Conditions"), JudgeReplaced(" NotBefore=", " a=\"\" NotBefore="));
}

TEST_F(ReadAssertion, AcceptsEachRestrictionOnceInAnyOrder)
{
    const std::string audience =
        "<saml:AudienceRestriction><saml:Audience>a</saml:Audience></saml:AudienceRestriction>";
    const std::string proxy = "<saml:ProxyRestriction Count=\"1\"/>";
    const std::string renew = "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\"/>";
    EXPECT_EQ(ReachesSignature, JudgeConditions(audience + proxy + renew));
    EXPECT_EQ(ReachesSignature, JudgeConditions(renew + " <!-- c -->" + audience + proxy));
    const std::string duplicate =
        "ParseException: Unknown or duplicate restriction node under Conditions: ";
    EXPECT_EQ(duplicate + "AudienceRestriction", JudgeConditions(audience + proxy + audience));
    EXPECT_EQ(duplicate + "ProxyRestriction", JudgeConditions(proxy + proxy));
    EXPECT_EQ(duplicate + "Condition", JudgeConditions(renew + renew));
    const std::string delegation = DelegationRestriction({"a@b"});
    EXPECT_EQ(duplicate + "Condition", JudgeConditions(delegation + renew + delegation));
}

TEST_F(ReadAssertion, RefusesUnknownRestrictions)
{
    const std::string unknown =
        "ParseException: Unknown or duplicate restriction node under Conditions";
    EXPECT_EQ(unknown + ": OneTimeUse", JudgeConditions("<saml:OneTimeUse/>"));
    EXPECT_EQ(unknown + ": Condition", JudgeConditions("<saml:Condition/>"));
    EXPECT_EQ(unknown + ": Condition", JudgeConditions("<saml:Condition xsi:type=\"del:Other\"/>"));
    EXPECT_EQ(unknown, JudgeConditions("text"));
    EXPECT_EQ(unknown + ": AudienceRestriction", JudgeConditions("<rsa:AudienceRestriction/>"));
}

TEST_F(ReadAssertion, ReadsAudiences)
{
    const auto judge = [](const std::string& content) {
        return JudgeConditions(
            "<saml:AudienceRestriction a=\"\">" + content + "</saml:AudienceRestriction>");
    };
    EXPECT_EQ(ReachesSignature, judge(""));
    EXPECT_EQ(ReachesSignature, judge("<saml:Audience b=\"\">a</saml:Audience>"));
    EXPECT_EQ(Expected("Audience"), judge("<saml:Audience>a</saml:Audience><saml:Other/>"));
    EXPECT_EQ(Expected("Audience"), judge("text"));
    EXPECT_EQ(
        "ParseException: Element 'Audience' must only have textual content (but has extra "
        "children or is empty).",
        judge("<saml:Audience></saml:Audience>"));
}

TEST_F(ReadAssertion, ReadsDelegatesStrictly)
{
    const std::string one = DelegationRestriction({"a@b"});
    const auto judge = [&one](const std::string& from, const std::string& to) {
        return JudgeConditions(Replace(one, from, to));
    };
    EXPECT_EQ(Expected("Delegate"), JudgeConditions(DelegationRestriction({})));
    EXPECT_EQ(Expected("Delegate"), judge("</saml:Condition>", "<a/></saml:Condition>"));
    EXPECT_EQ(
        "ParseException: Unexpected attribute 'a' on element 'Condition'",
        judge("<saml:Condition ", "<saml:Condition a=\"\" "));
    EXPECT_EQ(
        Missing("Delegate", "DelegationInstant"),
        judge(" DelegationInstant=\"2012-01-31T11:00:00Z\"", ""));
    EXPECT_EQ(
        UnexpectedAttributes("Delegate"),
        judge(" DelegationInstant", " ConfirmationMethod=\"m\" DelegationInstant"));
    EXPECT_EQ(
        "ParseException: Delegate/@DelegationInstant is not a date",
        judge("2012-01-31T11:00:00Z", "now"));
    EXPECT_EQ(Expected("NameID"), judge(NameId("a@b"), ""));
    EXPECT_EQ(
        "ParseException: Unexpected elements after NameID",
        judge("</del:Delegate>", NameId("c@d") + "</del:Delegate>"));
    EXPECT_EQ(
        "ParseException: Element 'Delegate' has unexpected namespace",
        JudgeConditions("<saml:Condition xsi:type=\"del:DelegationRestrictionType\">"
                        "<saml:Delegate/></saml:Condition>"));
}

TEST_F(ReadAssertion, ReadsTheProxyRestrictionStrictly)
{
    EXPECT_EQ(Missing("ProxyRestriction", "Count"), JudgeConditions("<saml:ProxyRestriction/>"));
    EXPECT_EQ(
        UnexpectedAttributes("ProxyRestriction"),
        JudgeConditions("<saml:ProxyRestriction Count=\"1\" a=\"\"/>"));
    EXPECT_EQ(
        "ParseException: ProxyRestriction/@Count is not a non-negative integer.",
        JudgeConditions("<saml:ProxyRestriction Count=\"-1\"/>"));
    EXPECT_EQ(
        "ParseException: Element 'ProxyRestriction' must be empty",
        JudgeConditions("<saml:ProxyRestriction Count=\"1\"><saml:Audience>a</saml:Audience>"
                        "</saml:ProxyRestriction>"));
}

TEST_F(ReadAssertion, ReadsTheRenewRestrictionStrictly)
{
    const auto judge = [](const std::string& attributes, const std::string& content = "") {
        return JudgeConditions(
            "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\"" + attributes + ">" + content
            + "</saml:Condition>");
    };
    EXPECT_EQ(
        ReachesSignature, judge(" Count=\"3\" Postdatable=\"maybe\" RenewExpired=\"neither\""));
    EXPECT_EQ(
        "ParseException: Unexpected attribute 'Other' on element 'Condition'",
        judge(" Other=\"1\""));
    EXPECT_EQ(
        "ParseException: Condition/@Count is not a non-negative integer.", judge(" Count=\"x\""));
    EXPECT_EQ("ParseException: Element 'Condition' must be empty", judge("", "<a/>"));
}

TEST_F(ReadAssertion, ReportsAnUndefinedTypePrefix)
{
    const std::string error = JudgeConditions("<saml:Condition xsi:type=\"nope:T\"/>");
    EXPECT_EQ("ParseException: Element Conditionat 1,", error.substr(0, 38));
    EXPECT_NE(std::string::npos, error.find(" uses undefined prefix: `nope'"));
}

TEST_F(ReadAssertion, RequiresConditionsAndAuthnStatement)
{
    EXPECT_EQ(
        Expected("Conditions"),
        JudgeReplaced("<saml:Conditions", "<saml:Advice/><saml:Conditions"));
    EXPECT_EQ(
        Expected("AuthnStatement"),
        JudgeReplaced("<saml:AuthnStatement ", "<saml:AttributeStatement/><saml:AuthnStatement "));
}

TEST_F(ReadAssertion, AllowsNothingAfterOneAttributeStatement)
{
    const std::string statement =
        "<saml:AttributeStatement>" + Attribute("n", {"v"}) + "</saml:AttributeStatement>";
    const std::string end = "</saml:Assertion>";
    EXPECT_EQ(ReachesSignature, JudgeReplaced(end, statement + end));
    const std::string unexpected = "ParseException: Unexpected elements under Assertion";
    EXPECT_EQ(unexpected, JudgeReplaced(end, statement + statement + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "<saml:AuthzDecisionStatement/>" + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "<rsa:AttributeStatement/>" + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "text" + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "<?p i?>" + end));
}
