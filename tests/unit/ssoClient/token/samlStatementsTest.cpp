#include "ssoClient/token/samlStatements.h"

#include "unit/ssoClient/token/TokenText.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

using namespace SsoClient;
using namespace TokenText;

namespace {

constexpr char AuthnStatement[] = "<saml:AuthnStatement ";
constexpr char EndOfAssertion[] = "</saml:Assertion>";

class ReadStatements : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

std::string JudgeReplaced(const std::string& from, const std::string& to)
{
    return JudgeUnsigned(Replace(Bearer(), from, to));
}

std::string JudgeAdvice(const std::string& content)
{
    return JudgeUnsigned(
        InsertBefore(Bearer(), AuthnStatement, "<saml:Advice>" + content + "</saml:Advice>"));
}

std::string JudgeAttributes(const std::string& content)
{
    return JudgeUnsigned(InsertBefore(
        Bearer(),
        EndOfAssertion,
        "<saml:AttributeStatement>" + content + "</saml:AttributeStatement>"));
}

/** The values of an attribute with the given content, each in brackets. */
std::string ReadValues(const std::string& content)
{
    Quillon::Ref<Quillon::Xml::Document> document;
    ParseXML(
        "<saml:Attribute xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion' Name='n' "
        "NameFormat='f'>"
            + content + "</saml:Attribute>",
        document);
    NodeFilterIterator iterator(
        document->GetRootElement(), boost::make_shared<SkipWsAndCommentsFilter>());
    AttributeType attribute;
    ParseAttributeElement(iterator, attribute);
    std::string text;
    for (const std::string& value : attribute.AttributeValue) {
        text += "[" + value + "]";
    }
    return text;
}

} // namespace

TEST_F(ReadStatements, ReadsTheAuthnStatementStrictly)
{
    EXPECT_EQ(
        "ParseException: Unexpected attributes on element 'AuthnStatement'",
        JudgeReplaced(AuthnStatement, "<saml:AuthnStatement SessionIndex=\"1\" "));
    EXPECT_EQ(
        "ParseException: Node 'AuthnStatement is missing required attribute 'AuthnInstant'",
        JudgeReplaced(" AuthnInstant=\"2012-01-31T11:59:00Z\"", ""));
    EXPECT_EQ(
        "ParseException: AuthnStatement/@AuthnInstant is not a date",
        JudgeReplaced("AuthnInstant=\"2012-01-31T11:59:00Z\"", "AuthnInstant=\"\""));
    EXPECT_EQ(
        "ParseException: Expected element 'AuthnContext' not found.",
        JudgeReplaced("<saml:AuthnContext>", "<saml:SubjectLocality/><saml:AuthnContext>"));
    EXPECT_EQ(
        "ParseException: Unexpected elements after AuthnContext",
        JudgeReplaced("</saml:AuthnContext>", "</saml:AuthnContext><a/>"));
}

TEST_F(ReadStatements, ReadsTheAuthnContextStrictly)
{
    EXPECT_EQ(
        "ParseException: Unexpected attributes on element 'AuthnContext'",
        JudgeReplaced("<saml:AuthnContext>", "<saml:AuthnContext a=\"\">"));
    EXPECT_EQ(
        "ParseException: Expected element 'AuthnContextClassRef' not found.",
        JudgeReplaced("<saml:AuthnContext>", "<saml:AuthnContext><saml:AuthnContextDecl/>"));
    EXPECT_EQ(
        "ParseException: Unexpected elements after AuthnContextClassRef",
        JudgeReplaced("</saml:AuthnContextClassRef>", "</saml:AuthnContextClassRef><a/>"));
    EXPECT_EQ(
        "ParseException: Element 'AuthnContextClassRef' must only have textual content (but has "
        "extra children or is empty).",
        JudgeReplaced(">password<", "><"));
    EXPECT_EQ(
        ReachesSignature,
        JudgeReplaced("<saml:AuthnContextClassRef>", "<saml:AuthnContextClassRef a=\"\">"));
}

TEST_F(ReadStatements, ReadsTheAttributeStatementStrictly)
{
    EXPECT_EQ(ReachesSignature, JudgeAttributes(Attribute("n", {"v"}) + Attribute("m", {})));
    EXPECT_EQ("ParseException: Expected element 'Attribute' not found.", JudgeAttributes(""));
    EXPECT_EQ(
        "ParseException: Expected element 'Attribute' not found.",
        JudgeAttributes(Attribute("n", {"v"}) + "<saml:EncryptedAttribute/>"));
    EXPECT_EQ(
        "ParseException: Unexpected attributes on element 'AttributeStatement'",
        JudgeUnsigned(InsertBefore(Bearer(), EndOfAssertion, "<saml:AttributeStatement a=\"\"/>")));
}

TEST_F(ReadStatements, ReadsAttributesStrictly)
{
    const auto judge = [](const std::string& attributes, const std::string& content = "") {
        return JudgeAttributes(
            "<saml:Attribute" + attributes + ">" + content + "</saml:Attribute>");
    };
    const std::string both = R"( Name="n" NameFormat="f")";
    EXPECT_EQ(ReachesSignature, judge(both + " FriendlyName=\"g\""));
    EXPECT_EQ(
        "ParseException: Node 'Attribute is missing required attribute 'NameFormat'",
        judge(" Name=\"n\""));
    EXPECT_EQ(
        "ParseException: Node 'Attribute is missing required attribute 'Name'",
        judge(" NameFormat=\"f\""));
    EXPECT_EQ(
        "ParseException: Unexpected attributes on element 'Attribute'", judge(both + " a=\"\""));
    EXPECT_EQ(
        "ParseException: Expected element 'AttributeValue' not found.",
        judge(both, "<saml:AttributeValue>v</saml:AttributeValue><saml:Value/>"));
    EXPECT_EQ("ParseException: Expected element 'AttributeValue' not found.", judge(both, "v"));
}

TEST_F(ReadStatements, ReadsAdviceStrictly)
{
    const std::string attribute = Attribute("n", {"v"});
    const std::string advice =
        "<rsa:RSAAdvice AdviceSource=\"s\">" + attribute + "</rsa:RSAAdvice>";
    EXPECT_EQ(ReachesSignature, JudgeAdvice(advice + advice));
    EXPECT_EQ("ParseException: Expected element 'RSAAdvice' not found.", JudgeAdvice(""));
    EXPECT_EQ(
        "ParseException: Expected element 'RSAAdvice' not found.",
        JudgeAdvice(advice + "<saml:AssertionIDRef>a</saml:AssertionIDRef>"));
    EXPECT_EQ(
        "ParseException: Element 'RSAAdvice' has unexpected namespace",
        JudgeAdvice("<saml:RSAAdvice/>"));
    EXPECT_EQ(
        "ParseException: Node 'RSAAdvice is missing required attribute 'AdviceSource'",
        JudgeAdvice("<rsa:RSAAdvice/>"));
    EXPECT_EQ(
        "ParseException: Unexpected attributes on element 'RSAAdvice'",
        JudgeAdvice("<rsa:RSAAdvice AdviceSource=\"s\" a=\"\"/>"));
    EXPECT_EQ(
        "ParseException: Expected element 'Attribute' not found.",
        JudgeAdvice("<rsa:RSAAdvice AdviceSource=\"s\"/>"));
    EXPECT_EQ(
        "ParseException: Unexpected attributes on element 'Advice'",
        JudgeUnsigned(InsertBefore(Bearer(), AuthnStatement, "<saml:Advice a=\"\"/>")));
}

TEST(ParseAttributeElement, KeepsValuesInOrder)
{
    EXPECT_EQ("", ReadValues(""));
    EXPECT_EQ("", ReadValues(" <!-- c --> "));
    EXPECT_EQ(
        "[b][a]",
        ReadValues("<saml:AttributeValue>b</saml:AttributeValue> "
                   "<saml:AttributeValue>a</saml:AttributeValue>"));
}

TEST(ParseAttributeElement, BlankValuesAreEmptyAndOthersKeepTheirBlanks)
{
    EXPECT_EQ("[]", ReadValues("<saml:AttributeValue/>"));
    EXPECT_EQ("[]", ReadValues("<saml:AttributeValue> \n </saml:AttributeValue>"));
    EXPECT_EQ("[  x ]", ReadValues("<saml:AttributeValue>  x </saml:AttributeValue>"));
}

TEST(ParseAttributeElement, DoesNotCheckTheAttributesOfValues)
{
    EXPECT_EQ(
        "[v]",
        ReadValues("<saml:AttributeValue xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance' "
                   "xsi:type='xs:string'>v</saml:AttributeValue>"));
}

TEST_F(ReadStatements, RefusesElementsInsideAValue)
{
    EXPECT_EQ(
        "ParseException: Element 'AttributeValue' must only have textual content (but has extra "
        "children or is empty).",
        JudgeAttributes(Attribute("n", {"<a/>"})));
    EXPECT_EQ(
        "ParseException: Element 'AttributeValue' must only have textual content (but has extra "
        "children or is empty).",
        JudgeAttributes(Attribute("n", {"v<!-- -->w"})));
}
