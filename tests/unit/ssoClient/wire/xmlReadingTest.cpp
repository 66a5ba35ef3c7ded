#include "ssoClient/wire/xmlReading.h"

#include "quillon/xml/Parser.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <functional>

using namespace SsoClient;
using Quillon::Ref;
using Quillon::Xml::AsElement;
using Quillon::Xml::Document;
using Quillon::Xml::ElementNode;
using Quillon::Xml::QName;

namespace {

constexpr char XsiDeclaration[] = "xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance'";

/** A parsed text and an iterator on its root. */
struct Parsed
{
    explicit Parsed(const std::string& text)
        : iterator(nullptr, nullptr)
    {
        ParseXML(text, document);
        root = document->GetRootElement();
        iterator = NodeFilterIterator(root, boost::make_shared<SkipWsAndCommentsFilter>());
    }

    Ref<Document> document;
    ElementNode* root = nullptr;
    NodeFilterIterator iterator;
};

std::string ErrorOf(const std::function<void()>& action)
{
    try {
        action();
        return "no error";
    } catch (const ParseException& error) {
        return error.what();
    }
}

std::string LocalNameAt(const NodeFilterIterator& iterator)
{
    const ElementNode* element = IteratorToElement(iterator);
    return element == nullptr ? "(none)" : std::string(element->GetLocalName());
}

std::string TextualContent(const std::string& xml)
{
    const Parsed parsed(xml);
    std::string text = "old";
    RequireTextualContent(parsed.iterator, text);
    return text;
}

std::string TextualContentError(const std::string& xml)
{
    return ErrorOf([&] { TextualContent(xml); });
}

bool ReadBool(const std::string& value)
{
    const Parsed parsed("<e b='" + value + "'/>");
    bool out = false;
    GetBoolAttribute(parsed.root, "b", out);
    return out;
}

std::string BoolError(const std::string& value)
{
    return ErrorOf([&] { ReadBool(value); });
}

unsigned long long ReadULong(const std::string& value)
{
    const Parsed parsed("<e Count='" + value + "'/>");
    boost::optional<unsigned long long> out;
    GetULongOptionalAttribute(parsed.root, "Count", out);
    return out.get();
}

std::string ULongError(const std::string& value)
{
    return ErrorOf([&] { ReadULong(value); });
}

} // namespace

TEST(MoveToChild, SkipsCommentsAndWhiteSpace)
{
    const Parsed parsed("<r>\n\t<!-- c --> \r\n<a/><b/></r>");
    EXPECT_EQ("a", LocalNameAt(parsed.iterator.GetChild()));
    EXPECT_EQ("r", LocalNameAt(parsed.iterator));
}

TEST(MoveToChild, IsAtEndWithoutAcceptedChild)
{
    EXPECT_TRUE(Parsed("<r/>").iterator.MoveToChild().IsAtEnd());
    EXPECT_TRUE(Parsed("<r> <!-- c --> </r>").iterator.MoveToChild().IsAtEnd());
}

TEST(MoveToSibling, SkipsCommentsAndWhiteSpaceUntilTheEnd)
{
    const Parsed parsed("<r><a/> <!-- c --><b/> </r>");
    NodeFilterIterator child = parsed.iterator.GetChild();
    EXPECT_EQ("b", LocalNameAt(child.MoveToSibling()));
    EXPECT_TRUE(child.MoveToSibling().IsAtEnd());
}

TEST(MoveToSibling, SeesTextBetweenElements)
{
    const Parsed parsed("<r><a/>a<b/></r>");
    NodeFilterIterator child = parsed.iterator.GetChild();
    child.MoveToSibling();
    EXPECT_FALSE(child.IsAtEnd());
    EXPECT_EQ(nullptr, IteratorToElement(child));
}

TEST(MoveToSibling, SeesProcessingInstructions)
{
    const Parsed parsed("<r><?p i?><b/></r>");
    NodeFilterIterator child = parsed.iterator.GetChild();
    EXPECT_FALSE(child.IsAtEnd());
    EXPECT_EQ(nullptr, IteratorToElement(child));
    EXPECT_EQ("b", LocalNameAt(child.MoveToSibling()));
}

TEST(SkipWsAndCommentsFilter, OnlyKnowsTheFourBlanksOfXml)
{
    EXPECT_FALSE(Parsed("<r>\xC2\xA0</r>").iterator.GetChild().IsAtEnd());
    EXPECT_TRUE(Parsed("<r>&#9;&#10;&#13;&#32;</r>").iterator.GetChild().IsAtEnd());
}

TEST(NodeFilterIterator, StandsOnItsStartUnfiltered)
{
    const Parsed parsed("<r> <a/></r>");
    const NodeFilterIterator iterator(
        parsed.root->GetFirstChild(), boost::make_shared<SkipWsAndCommentsFilter>());
    EXPECT_EQ(parsed.root->GetFirstChild(), iterator.GetNode());
}

TEST(LocalName, HasNoNamespace)
{
    EXPECT_EQ(QName("", "Count"), LocalName("Count"));
}

TEST(ElementQNameIs, ComparesLocalNameAndNamespace)
{
    const Parsed parsed("<p:e xmlns:p='urn:a' xmlns='urn:b'><e/><q:e/></p:e>");
    EXPECT_TRUE(ElementQNameIs(parsed.root, "e", "urn:a"));
    EXPECT_FALSE(ElementQNameIs(parsed.root, "e", "urn:b"));
    EXPECT_FALSE(ElementQNameIs(parsed.root, "f", "urn:a"));
    EXPECT_FALSE(ElementQNameIs(nullptr, "e", "urn:a"));

    const auto* child = AsElement(parsed.root->GetFirstChild());
    EXPECT_TRUE(ElementQNameIs(child, "e", "urn:b"));
    const auto* undeclared = AsElement(child->GetNextSibling());
    EXPECT_FALSE(ElementQNameIs(undeclared, "e", "urn:a"));
    EXPECT_FALSE(ElementQNameIs(undeclared, "e", ""));
}

TEST(RequireElementQName, TellsNameFromNamespace)
{
    const Parsed parsed("<p:Assertion xmlns:p='urn:a'/>");
    RequireElementQName(parsed.root, "Assertion", "urn:a");
    EXPECT_EQ("Expected element 'Assertion' not found.", ErrorOf([] {
                  RequireElementQName(nullptr, "Assertion", "urn:a");
              }));
    EXPECT_EQ("Expected element 'Issuer' not found.", ErrorOf([&] {
                  RequireElementQName(parsed.root, "Issuer", "urn:a");
              }));
    EXPECT_EQ("Element 'Assertion' has unexpected namespace", ErrorOf([&] {
                  RequireElementQName(parsed.root, "Assertion", "urn:b");
              }));
}

TEST(RequireElementQName, UndeclaredPrefixIsAnUnexpectedNamespace)
{
    const Parsed parsed("<p:Assertion/>");
    EXPECT_EQ("Element 'Assertion' has unexpected namespace", ErrorOf([&] {
                  RequireElementQName(parsed.root, "Assertion", "urn:b");
              }));
}

TEST(ResolveQName, UsesDeclarationsInScope)
{
    const Parsed parsed("<r xmlns:p='urn:outer'><e xmlns:q='urn:inner'/></r>");
    const auto* element = AsElement(parsed.root->GetFirstChild());
    QName name;
    ResolveQName(element, "p:a", "urn:default", name);
    EXPECT_EQ(QName("urn:outer", "a"), name);
    ResolveQName(element, "q:a", "urn:default", name);
    EXPECT_EQ(QName("urn:inner", "a"), name);
    ResolveQName(element, "a", "urn:default", name);
    EXPECT_EQ(QName("urn:default", "a"), name);
    ResolveQName(element, "p:a:b", "", name);
    EXPECT_EQ(QName("urn:outer", "a:b"), name);
}

TEST(ResolveQName, TellsWhereAnUndefinedPrefixStands)
{
    const Parsed parsed("<r>\n\n                <Assertion/></r>");
    const auto* element = AsElement(parsed.root->GetFirstChild()->GetNextSibling());
    QName name;
    EXPECT_EQ("Element Assertionat 3,17 uses undefined prefix: `foo'", ErrorOf([&] {
                  ResolveQName(element, "foo:bar", "", name);
              }));
}

TEST(ElementXsiTypeIs, ResolvesTheTypeName)
{
    const QName type("urn:t", "T");
    const auto is = [&](const std::string& attributes) {
        const Parsed parsed("<e " + std::string(XsiDeclaration) + " " + attributes + "/>");
        return ElementXsiTypeIs(parsed.root, type);
    };
    EXPECT_TRUE(is("xmlns:p='urn:t' xsi:type='p:T'"));
    EXPECT_FALSE(is("xmlns:p='urn:t' xsi:type='p:U'"));
    EXPECT_FALSE(is("xmlns:p='urn:u' xsi:type='p:T'"));
    EXPECT_TRUE(is("xmlns='urn:t' xsi:type='T'"));
    EXPECT_FALSE(is("xsi:type='T'"));
    EXPECT_FALSE(is("xmlns:p='urn:t' type='p:T'"));
    EXPECT_FALSE(is("xmlns:p='urn:t'"));
}

TEST(ElementXsiTypeIs, FindsTheAttributeByItsNamespace)
{
    const Parsed parsed("<e xmlns:x='http://www.w3.org/2001/XMLSchema-instance' xmlns:xsi='urn:o'"
                        " xmlns:p='urn:t' x:type='p:T' xsi:type='p:U'/>");
    EXPECT_TRUE(ElementXsiTypeIs(parsed.root, QName("urn:t", "T")));
}

TEST(ElementXsiTypeIs, RefusesAnUndefinedPrefix)
{
    const Parsed parsed("<e " + std::string(XsiDeclaration) + " xsi:type='p:T'/>");
    EXPECT_EQ("Element eat 1,1 uses undefined prefix: `p'", ErrorOf([&] {
                  ElementXsiTypeIs(parsed.root, QName("urn:t", "T"));
              }));
}

TEST(RequireEmptyElement, AllowsWhiteSpaceAndComments)
{
    RequireEmptyElement(Parsed("<e/>").iterator);
    const Parsed blank("<e> <!-- c -->\n</e>");
    RequireEmptyElement(blank.iterator);
    for (const char* content : {"a", "<a/>", "<?p i?>"}) {
        const Parsed parsed(std::string("<e>") + content + "</e>");
        EXPECT_EQ(
            "Element 'e' must be empty", ErrorOf([&] { RequireEmptyElement(parsed.iterator); }));
    }
}

TEST(RequireTextualContent, KeepsBlanks)
{
    EXPECT_EQ("  v  ", TextualContent("<e>  v  </e>"));
    EXPECT_EQ("a&b<c>", TextualContent("<e>a&amp;b<![CDATA[<c>]]></e>"));
}

TEST(RequireTextualContent, SkipsComments)
{
    EXPECT_EQ("v", TextualContent("<e><!-- c -->v</e>"));
    EXPECT_EQ("v", TextualContent("<e>v<!-- c --> </e>"));
}

TEST(RequireTextualContent, RefusesOtherContent)
{
    for (const char* content :
         {"",
          "  ",
          "<!-- c -->",
          "<a/>",
          "v<a/>",
          "<a/>v",
          "v<!-- c -->w",
          "v<?p i?>",
          "<?p i?>"}) {
        EXPECT_EQ(
            "Element 'e' must only have textual content (but has extra children or is empty).",
            TextualContentError(std::string("<p:e xmlns:p='urn:a'>") + content + "</p:e>"))
            << content;
    }
}

TEST(RequireNothingAfter, NamesThePredecessor)
{
    const Parsed parsed("<r><a/></r>");
    NodeFilterIterator child = parsed.iterator.GetChild();
    EXPECT_EQ("Unexpected elements after X", ErrorOf([&] { RequireNothingAfter(child, "X"); }));
    RequireNothingAfter(child.MoveToSibling(), "X");
}

TEST(RequireElementAttributesNames, ChecksTheSetAsWritten)
{
    const auto check = [](const std::string& attributes) {
        const Parsed parsed("<p:Node xmlns:p='urn:a' " + attributes + "/>");
        return ErrorOf([&] { RequireElementAttributesNames(parsed.root, {"A", "B"}, {"C", "D"}); });
    };
    EXPECT_EQ("no error", check("B='' A=''"));
    EXPECT_EQ("no error", check("A='' B='' C='' D='' xmlns='urn:b' xmlns:foo='urn:c'"));
    EXPECT_EQ("Node 'Node is missing required attribute 'A'", check(""));
    EXPECT_EQ("Node 'Node is missing required attribute 'A'", check("E=''"));
    EXPECT_EQ("Node 'Node is missing required attribute 'B'", check("A='' E=''"));
    EXPECT_EQ("Node 'Node is missing required attribute 'A'", check("p:A='' B=''"));
    EXPECT_EQ("Unexpected attributes on element 'Node'", check("A='' B='' E=''"));
    EXPECT_EQ("Unexpected attributes on element 'Node'", check("A='' B='' p:C=''"));
    EXPECT_EQ("Unexpected attributes on element 'Node'", check("A='' B='' xml:lang='en'"));
    EXPECT_EQ("Unexpected attributes on element 'Node'", check("A='' B='' xmlnsfoo=''"));
}

TEST(RequireNoAttributes, AllowsOnlyDeclarations)
{
    const auto check = [](const std::string& attributes) {
        const Parsed parsed("<e " + attributes + "/>");
        return ErrorOf([&] { RequireNoAttributes(parsed.root); });
    };
    EXPECT_EQ("no error", check("xmlns:foo='urn:a'"));
    EXPECT_EQ("Unexpected attributes on element 'e'", check("a=''"));
}

TEST(RequireElementAttributesQNames, ChecksTheSetByExpandedNames)
{
    const auto check = [](const std::string& attributes) {
        const Parsed parsed("<p:Node xmlns:p='urn:a' xmlns='urn:d' " + attributes + "/>");
        const std::vector<QName> required = {QName("urn:a", "r"), QName("", "s")};
        const std::vector<QName> optional = {QName("", "o")};
        return ErrorOf([&] { RequireElementAttributesQNames(parsed.root, required, optional); });
    };
    EXPECT_EQ("no error", check("p:r='' s=''"));
    EXPECT_EQ("no error", check("s='' o='' q:r='' xmlns:q='urn:a'"));
    EXPECT_EQ("Node 'Node is missing required attribute 'urn:a:r'", check(""));
    EXPECT_EQ("Node 'Node is missing required attribute 'urn:a:r'", check("s=''"));
    EXPECT_EQ("Node 'Node is missing required attribute 's'", check("p:r=''"));
    EXPECT_EQ("Unexpected attribute 'r' on element 'Node'", check("r='' s=''"));
    EXPECT_EQ("Unexpected attribute '{urn:a}o' on element 'Node'", check("p:o='' p:r='' s=''"));
}

TEST(RequireElementAttributesQNames, ReportsTheFirstByRawName)
{
    const auto check = [](const std::string& attributes) {
        const Parsed parsed("<Node xmlns:p='urn:a' " + attributes + "/>");
        return ErrorOf([&] { RequireElementAttributesQNames(parsed.root, {LocalName("r")}, {}); });
    };
    EXPECT_EQ("Unexpected attribute 'b' on element 'Node'", check("z='' p:a='' b=''"));
    EXPECT_EQ("Unexpected attribute '{urn:a}a' on element 'Node'", check("z='' p:a=''"));
    EXPECT_EQ("Element Nodeat 1,1 uses undefined prefix: `foo'", check("z='' foo:bar=''"));
    EXPECT_EQ("Unexpected attribute 'a' on element 'Node'", check("foo:bar='' a=''"));
}

TEST(RequireElementAttributesQNamesDeathTest, StopsTheProcessIfNothingIsMissing)
{
    const Parsed parsed("<a b=''/>");
    EXPECT_DEATH(
        RequireElementAttributesQNames(parsed.root, {LocalName("b"), LocalName("b")}, {}),
        "^PanicVerify failed: missing != required\\.end\\(\\) "
        "\\(lib/ssoClient/xmlReading:65\\)\n$");
}

TEST(GetDateAttribute, ReadsADate)
{
    const Parsed parsed("<Conditions NotBefore='2012-01-31T12:00:00Z'/>");
    Quillon::System::DateTime date;
    GetDateAttribute(parsed.root, "NotBefore", date);
    EXPECT_EQ("2012-01-31T12:00:00.000Z", date.ToString());
}

TEST(GetDateAttribute, RefusesAnythingElse)
{
    for (const char* attribute : {"", "NotBefore=''", "NotBefore='today'"}) {
        const Parsed parsed(std::string("<p:Conditions xmlns:p='urn:a' ") + attribute + "/>");
        Quillon::System::DateTime date;
        EXPECT_EQ("Conditions/@NotBefore is not a date", ErrorOf([&] {
                      GetDateAttribute(parsed.root, "NotBefore", date);
                  }));
    }
}

TEST(GetBoolAttribute, ReadsBothFormsInAnyCase)
{
    for (const char* value : {"1", "true", "TRUE", "tRue"}) {
        EXPECT_TRUE(ReadBool(value)) << value;
    }
    for (const char* value : {"0", "false", "False"}) {
        EXPECT_FALSE(ReadBool(value)) << value;
    }
}

TEST(GetBoolAttribute, RefusesAnythingElse)
{
    for (const char* value : {"", "yes", "2", " true", "10"}) {
        EXPECT_EQ("e/@b is not a Boolean", BoolError(value)) << value;
    }
    const Parsed absent("<e/>");
    bool out = false;
    EXPECT_EQ("e/@b is not a Boolean", ErrorOf([&] { GetBoolAttribute(absent.root, "b", out); }));
}

TEST(GetULongOptionalAttribute, ReadsNonNegativeIntegers)
{
    EXPECT_EQ(0U, ReadULong("0"));
    EXPECT_EQ(7U, ReadULong("007"));
    EXPECT_EQ(7U, ReadULong("+7"));
    EXPECT_EQ(9223372036854775807U, ReadULong("9223372036854775807"));
}

TEST(GetULongOptionalAttribute, LeavesOutUnsetIfAbsent)
{
    const Parsed parsed("<e/>");
    boost::optional<unsigned long long> out;
    GetULongOptionalAttribute(parsed.root, "Count", out);
    EXPECT_FALSE(out);
}

TEST(GetULongOptionalAttribute, RefusesAnythingElse)
{
    for (const char* value :
         {"-1",
          "1.5",
          "9223372036854775808",
          "18446744073709551615",
          "99999999999999999999999999",
          "",
          " 1",
          "1 ",
          "+",
          "-",
          "+-1",
          "+-5",
          "+-0", // no sign of the number that is left tells this one
          "++1",
          "0x1",
          "1e3",
          "one"}) {
        EXPECT_EQ("e/@Count is not a non-negative integer.", ULongError(value)) << value;
    }
}

TEST(ParseXML, ReplacesTheDocument)
{
    Ref<Document> document;
    ParseXML("<a/>", document);
    ParseXML(Quillon::CreateStringReader("<b/>").get(), document);
    EXPECT_EQ("b", document->GetRootElement()->GetName());
}

TEST(ParseXML, LetsTheParsersErrorPass)
{
    Ref<Document> document;
    EXPECT_THROW(ParseXML("<a>", document), Quillon::Xml::XMLParseException);
    EXPECT_THROW(
        ParseXML(Quillon::CreateStringReader("").get(), document), Quillon::Xml::XMLParseException);
    EXPECT_EQ(nullptr, document);
}

TEST(GetTextNode, IsTheVeryFirstChildIfThatIsText)
{
    EXPECT_EQ(nullptr, GetTextNode(nullptr));
    EXPECT_EQ(nullptr, GetTextNode(Parsed("<e/>").root));
    const Parsed comment("<e><!-- c -->v</e>");
    EXPECT_EQ(nullptr, GetTextNode(comment.root));
    const Parsed text("<e> v<a/></e>");
    EXPECT_EQ(" v", GetText(GetTextNode(text.root)));
}

TEST(GetText, OfNothingIsEmpty)
{
    EXPECT_EQ("", GetText(nullptr));
}
