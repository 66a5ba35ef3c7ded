#include "ssoClient/token/samlAssertion.h"

#include "unit/ssoClient/token/TokenText.h"

#include <gtest/gtest.h>

using namespace TokenText;

namespace {

constexpr char EndOfConfirmationData[] = "</saml:SubjectConfirmationData>";

/** Judges tokens at a time at which they are valid. */
class ReadAssertion : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

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

TEST_F(ReadAssertion, AcceptsBlanksAndCommentsInBearerData)
{
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

TEST_F(ReadHolderOfKey, AcceptsAnUnprefixedTypeInTheDefaultNamespace)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeReplaced(
            "xsi:type=\"saml:KeyInfo",
            "xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\" xsi:type=\"KeyInfo"));
}

TEST_F(ReadHolderOfKey, AcceptsABrokenBase64Line)
{
    EXPECT_EQ(
        ReachesSignature, JudgeReplaced("<ds:X509Certificate>M", "<ds:X509Certificate>\nM\n"));
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
    const std::string delegation = DelegationRestriction({"a@b"});
    EXPECT_EQ(duplicate + "Condition", JudgeConditions(delegation + renew + delegation));
}

TEST_F(ReadAssertion, DoesNotCheckTheAttributesOfAudiences)
{
    const auto judge = [](const std::string& content) {
        return JudgeConditions(
            "<saml:AudienceRestriction a=\"\">" + content + "</saml:AudienceRestriction>");
    };
    EXPECT_EQ(ReachesSignature, judge(""));
    EXPECT_EQ(ReachesSignature, judge("<saml:Audience b=\"\">a</saml:Audience>"));
}

TEST_F(ReadAssertion, IgnoresTheValuesOfOtherRenewOptions)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeConditions("<saml:Condition xsi:type=\"rsa:RenewRestrictionType\" Count=\"3\" "
                        "Postdatable=\"maybe\" RenewExpired=\"neither\"/>"));
}

TEST_F(ReadAssertion, AllowsOnlyAnAttributeStatementAfterTheAuthnStatement)
{
    const std::string statement =
        "<saml:AttributeStatement>" + Attribute("n", {"v"}) + "</saml:AttributeStatement>";
    const std::string end = "</saml:Assertion>";
    EXPECT_EQ(ReachesSignature, JudgeReplaced(end, statement + end));
    const std::string unexpected = "ParseException: Unexpected elements under Assertion";
    EXPECT_EQ(unexpected, JudgeReplaced(end, "<saml:AuthzDecisionStatement/>" + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "<rsa:AttributeStatement/>" + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "text" + end));
    EXPECT_EQ(unexpected, JudgeReplaced(end, "<?p i?>" + end));
}
