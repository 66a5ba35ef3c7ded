#include "ssoClient/token/samlStatements.h"

#include "ssoClient/Exceptions.h"

#include "unit/ssoClient/token/TokenText.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

using namespace SsoClient;
using namespace TokenText;

namespace {

class ReadStatements : public testing::Test
{
protected:
    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

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

TEST_F(ReadStatements, DoesNotCheckTheAttributesOfTheClassReference)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeUnsigned(Replace(
            Bearer(), "<saml:AuthnContextClassRef>", "<saml:AuthnContextClassRef a=\"\">")));
}

// [SAML-CORE 2.7]
TEST_F(ReadStatements, AcceptsSeveralAttributes)
{
    EXPECT_EQ(ReachesSignature, JudgeAttributes(Attribute("n", {"v"}) + Attribute("m", {})));
}

// [SAML-CORE 2.7.3.1]
TEST_F(ReadStatements, AttributesMayHaveAFriendlyName)
{
    EXPECT_EQ(
        ReachesSignature,
        JudgeAttributes(
            R"(<saml:Attribute Name="n" NameFormat="f" FriendlyName="g"></saml:Attribute>)"));
}

// [SAML-CORE 2.6]
TEST_F(ReadStatements, AcceptsAdviceOfSeveralSources)
{
    const std::string advice =
        "<rsa:RSAAdvice AdviceSource=\"s\">" + Attribute("n", {"v"}) + "</rsa:RSAAdvice>";
    EXPECT_EQ(
        ReachesSignature,
        JudgeUnsigned(InsertBefore(
            Bearer(),
            "<saml:AuthnStatement ",
            "<saml:Advice>" + advice + advice + "</saml:Advice>")));
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

TEST(ParseAttributeElement, ChecksTheNameOfEachValue)
{
    const std::string value = "<saml:AttributeValue>v</saml:AttributeValue>";
    EXPECT_EQ("[v][v][v]", ReadValues(value + value + value));
    for (const char* wrong :
         {"<saml:Value>v</saml:Value>",
          "<AttributeValue>v</AttributeValue>",
          "<saml:AttributeValue xmlns:saml='urn:other'>v</saml:AttributeValue>",
          "v"}) {
        EXPECT_THROW(ReadValues(value + value + wrong), ParseException) << wrong;
        EXPECT_THROW(ReadValues(value + wrong + wrong), ParseException) << wrong;
    }
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
