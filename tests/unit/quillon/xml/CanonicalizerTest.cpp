#include "XmlSupport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Quillon::Xml {

namespace {

using Security::ExclusiveC14n;
using Security::InclusiveC14n;
using Security::XmlSecurityException;

std::string CanonicalizeDocument(const char* identifier, std::string_view text)
{
    return CanonicalizeToText(identifier, ParseText(text).get());
}

/** The canonical form of the first child element with that name, anywhere below the root. */
std::string CanonicalizeNested(
    const char* identifier,
    std::string_view text,
    const std::vector<const char*>& path,
    const std::vector<std::string>& prefixes = {})
{
    const Ref<Document> document = ParseText(text);
    const ElementNode* element = document->GetRootElement();
    for (const char* name : path) {
        element = element->FindChildElement(name);
    }
    return CanonicalizeToText(identifier, element, prefixes);
}

std::string GetCanonicalizeError(const char* identifier, std::string_view text)
{
    try {
        CanonicalizeDocument(identifier, text);
    } catch (const XmlSecurityException& error) {
        return error.what();
    }
    return "accepted";
}

// [C14N 3.1], without the document type declaration.
// [C14N 2.1]
TEST(CanonicalizeExample, ProcessingInstructionsAndCommentsOutsideTheRoot)
{
    EXPECT_EQ(
        CanonicalizeDocument(
            InclusiveC14n,
            "<?xml version=\"1.0\"?>\n\n<?xml-stylesheet   href=\"doc.xsl\"\n   type=\"text/xsl\"  "
            " ?>\n\n"
            "<doc>Hello, world!<!-- Comment 1 --></doc>\n\n"
            "<?pi-without-data     ?>\n\n<!-- Comment 2 -->\n\n<!-- Comment 3 -->\n"),
        "<?xml-stylesheet href=\"doc.xsl\"\n   type=\"text/xsl\"   ?>\n"
        "<doc>Hello, world!</doc>\n<?pi-without-data?>");
}

// [C14N 3.2]
// [C14N 2.3]
TEST(CanonicalizeExample, WhitespaceInContent)
{
    const char* const Text =
        "<doc>\n   <clean>   </clean>\n   <dirty>   A   B   </dirty>\n   <mixed>\n"
        "      A\n      <clean>   </clean>\n      B\n      <dirty>   A   B   </dirty>\n"
        "      C\n   </mixed>\n</doc>";
    EXPECT_EQ(CanonicalizeDocument(InclusiveC14n, Text), Text);
    EXPECT_EQ(CanonicalizeDocument(ExclusiveC14n, Text), Text);
}

// [C14N 3.3], without the attribute that a document type declaration adds.
constexpr char StartAndEndTags[] =
    "<doc>\n   <e1   />\n   <e2   ></e2>\n   <e3   name = \"elem3\"   id=\"elem3\"   />\n"
    "   <e4   name=\"elem4\"   id=\"elem4\"   ></e4>\n"
    "   <e5 a:attr=\"out\" b:attr=\"sorted\" attr2=\"all\" attr=\"I'm\"\n"
    "      xmlns:b=\"http://www.ietf.org\"\n      xmlns:a=\"http://www.w3.org\"\n"
    "      xmlns=\"http://example.org\"/>\n"
    "   <e6 xmlns=\"\" xmlns:a=\"http://www.w3.org\">\n      <e7 xmlns=\"http://www.ietf.org\">\n"
    "         <e8 xmlns=\"\" xmlns:a=\"http://www.w3.org\">\n"
    "            <e9 xmlns=\"\" xmlns:a=\"http://www.ietf.org\"/>\n"
    "         </e8>\n      </e7>\n   </e6>\n</doc>";

// [C14N 2.2]
TEST(CanonicalizeExample, StartAndEndTags)
{
    EXPECT_EQ(
        CanonicalizeDocument(InclusiveC14n, StartAndEndTags),
        "<doc>\n   <e1></e1>\n   <e2></e2>\n   <e3 id=\"elem3\" name=\"elem3\"></e3>\n"
        "   <e4 id=\"elem4\" name=\"elem4\"></e4>\n"
        "   <e5 xmlns=\"http://example.org\" xmlns:a=\"http://www.w3.org\" "
        "xmlns:b=\"http://www.ietf.org\" attr=\"I'm\" attr2=\"all\" b:attr=\"sorted\" "
        "a:attr=\"out\"></e5>\n"
        "   <e6 xmlns:a=\"http://www.w3.org\">\n      <e7 xmlns=\"http://www.ietf.org\">\n"
        "         <e8 xmlns=\"\">\n            <e9 xmlns:a=\"http://www.ietf.org\"></e9>\n"
        "         </e8>\n      </e7>\n   </e6>\n</doc>");
}

TEST(CanonicalizeExample, StartAndEndTagsExclusive)
{
    EXPECT_EQ(
        CanonicalizeDocument(ExclusiveC14n, StartAndEndTags),
        "<doc>\n   <e1></e1>\n   <e2></e2>\n   <e3 id=\"elem3\" name=\"elem3\"></e3>\n"
        "   <e4 id=\"elem4\" name=\"elem4\"></e4>\n"
        "   <e5 xmlns=\"http://example.org\" xmlns:a=\"http://www.w3.org\" "
        "xmlns:b=\"http://www.ietf.org\" attr=\"I'm\" attr2=\"all\" b:attr=\"sorted\" "
        "a:attr=\"out\"></e5>\n"
        "   <e6>\n      <e7 xmlns=\"http://www.ietf.org\">\n"
        "         <e8 xmlns=\"\">\n            <e9></e9>\n         </e8>\n      </e7>\n   "
        "</e6>\n</doc>");
}

// [C14N 3.4], without the attributes whose type a document type declaration gives.
// [C14N 2.3]
TEST(CanonicalizeExample, CharacterModifications)
{
    EXPECT_EQ(
        CanonicalizeDocument(
            InclusiveC14n,
            "<doc>\n   <text>First line&#x0d;&#10;Second line</text>\n   <value>&#x32;</value>\n"
            "   <compute><![CDATA[value>\"0\" && value<\"10\" ?\"valid\":\"error\"]]></compute>\n"
            "   <compute expr='value>\"0\" &amp;&amp; value&lt;\"10\" "
            "?\"valid\":\"error\"'>valid</compute>\n"
            "   <norm attr=' &apos;   &#x20;&#13;&#xa;&#9;   &apos; '/>\n</doc>"),
        "<doc>\n   <text>First line&#xD;\nSecond line</text>\n   <value>2</value>\n"
        "   <compute>value&gt;\"0\" &amp;&amp; value&lt;\"10\" ?\"valid\":\"error\"</compute>\n"
        "   <compute expr=\"value>&quot;0&quot; &amp;&amp; value&lt;&quot;10&quot; "
        "?&quot;valid&quot;:&quot;error&quot;\">valid</compute>\n"
        "   <norm attr=\" '    &#xD;&#xA;&#x9;   ' \"></norm>\n</doc>");
}

// [C14N 3.6], with a character reference in place of the other encoding.
TEST(CanonicalizeExample, Utf8Encoding)
{
    EXPECT_EQ(CanonicalizeDocument(InclusiveC14n, "<doc>&#169;</doc>"), "<doc>\xC2\xA9</doc>");
}

// [EXC-C14N 2.2]: the same element in two contexts.
constexpr char FirstContext[] =
    "<n0:local xmlns:n0=\"http://foobar.org\" xmlns:n3=\"ftp://example.org\">"
    "<n1:elem2 xmlns:n1=\"http://example.net\" xml:lang=\"en\">"
    "<n3:stuff xmlns:n3=\"ftp://example.org\"/></n1:elem2></n0:local>";
constexpr char SecondContext[] =
    "<n2:pdu xmlns:n1=\"http://example.com\" xmlns:n2=\"http://foo.example\" "
    "xml:lang=\"fr\" xml:space=\"retain\">"
    "<n1:elem2 xmlns:n1=\"http://example.net\" xml:lang=\"en\">"
    "<n3:stuff xmlns:n3=\"ftp://example.org\"/></n1:elem2></n2:pdu>";

TEST(CanonicalizeExample, InclusiveFormDependsOnTheContext)
{
    EXPECT_EQ(
        CanonicalizeNested(InclusiveC14n, FirstContext, {"elem2"}),
        "<n1:elem2 xmlns:n0=\"http://foobar.org\" xmlns:n1=\"http://example.net\" "
        "xmlns:n3=\"ftp://example.org\" xml:lang=\"en\"><n3:stuff></n3:stuff></n1:elem2>");
    EXPECT_EQ(
        CanonicalizeNested(InclusiveC14n, SecondContext, {"elem2"}),
        "<n1:elem2 xmlns:n1=\"http://example.net\" xmlns:n2=\"http://foo.example\" xml:lang=\"en\" "
        "xml:space=\"retain\"><n3:stuff xmlns:n3=\"ftp://example.org\"></n3:stuff></n1:elem2>");
}

// [EXC-C14N 1.1]
TEST(CanonicalizeExample, ExclusiveFormDoesNot)
{
    const char* const Expected = "<n1:elem2 xmlns:n1=\"http://example.net\" xml:lang=\"en\">"
                                 "<n3:stuff xmlns:n3=\"ftp://example.org\"></n3:stuff></n1:elem2>";
    EXPECT_EQ(CanonicalizeNested(ExclusiveC14n, FirstContext, {"elem2"}), Expected);
    EXPECT_EQ(CanonicalizeNested(ExclusiveC14n, SecondContext, {"elem2"}), Expected);
}

// [EXC-C14N 2.1]
TEST(Canonicalize, TreatsListedPrefixesAsTheInclusiveFormDoes)
{
    EXPECT_EQ(
        CanonicalizeNested(ExclusiveC14n, SecondContext, {"elem2"}, {"n2", "#default", "none"}),
        "<n1:elem2 xmlns:n1=\"http://example.net\" xmlns:n2=\"http://foo.example\" xml:lang=\"en\">"
        "<n3:stuff xmlns:n3=\"ftp://example.org\"></n3:stuff></n1:elem2>");
    const char* const Default = "<r xmlns='urn:d' xmlns:a='urn:a'><a:e><a:f xmlns=''/></a:e></r>";
    EXPECT_EQ(
        CanonicalizeNested(ExclusiveC14n, Default, {"e"}, {"#default"}),
        "<a:e xmlns=\"urn:d\" xmlns:a=\"urn:a\"><a:f xmlns=\"\"></a:f></a:e>");
    EXPECT_EQ(
        CanonicalizeNested(ExclusiveC14n, Default, {"e"}),
        "<a:e xmlns:a=\"urn:a\"><a:f></a:f></a:e>");
}

TEST(Canonicalize, EscapesNamespaceUris)
{
    EXPECT_EQ(
        CanonicalizeDocument(InclusiveC14n, "<r xmlns='http://a.example/?b=1&amp;c=2'/>"),
        "<r xmlns=\"http://a.example/?b=1&amp;c=2\"></r>");
}

// [C14N 2.3]
TEST(Canonicalize, NeverRendersTheXmlPrefix)
{
    EXPECT_EQ(
        CanonicalizeDocument(
            InclusiveC14n, "<r xmlns:xml='http://www.w3.org/XML/1998/namespace' xml:lang='en'/>"),
        "<r xml:lang=\"en\"></r>");
}

TEST(Canonicalize, AgreesWithItselfOnComposedAndParsedTrees)
{
    Ref<ElementNode> root;
    Ref<ElementNode> child;
    Ref<TextNode> text;
    CreateElementNode("p", "root", root);
    CreateElementNode("p", "child", child);
    CreateTextNode(text);
    text->SetText("a<&>\r");
    root->DefineAttribute("xmlns:p", "urn:p");
    root->AppendChild(child.get());
    child->AppendChild(text.get());
    EXPECT_EQ(
        CanonicalizeToText(ExclusiveC14n, static_cast<const ElementNode*>(child.get())),
        "<p:child xmlns:p=\"urn:p\">a&lt;&amp;&gt;&#xD;</p:child>");
}

// What is written goes through a buffer of 4,096 octets.
TEST(Canonicalize, WritesTagsWhereverTheyMeetTheEndOfTheBuffer)
{
    for (std::size_t length = 4'060; length < 4'110; ++length) {
        std::string text = "<r>" + std::string(length, 'x');
        for (int i = 0; i < 800; ++i) {
            text += i % 2 == 0 ? "<name a=\"v\"><n></n></name>"
                               : "<longerThanSixteenOctets></longerThanSixteenOctets>";
        }
        text += "</r>";
        EXPECT_EQ(
            text, CanonicalizeToText(Security::ExclusiveC14n, ParseText(text)->GetRootElement()));
    }
}

TEST(Canonicalize, RefusesUndeclaredPrefixes)
{
    for (const char* identifier : {InclusiveC14n, ExclusiveC14n}) {
        EXPECT_EQ(
            GetCanonicalizeError(identifier, "<p:r/>"),
            "Element 'p:r' uses the undeclared prefix 'p'");
        EXPECT_EQ(
            GetCanonicalizeError(identifier, "<r><e q:a='1'/></r>"),
            "Element 'e' uses the undeclared prefix 'q'");
        EXPECT_EQ(
            GetCanonicalizeError(identifier, "<r><p:e xmlns:p='urn:p'/><p:f/></r>"),
            "Element 'p:f' uses the undeclared prefix 'p'");
    }
}

// [C14N 1.3]
// [RFC 3986 3.1]
TEST(Canonicalize, RefusesRelativeNamespaceUris)
{
    for (const char* identifier : {InclusiveC14n, ExclusiveC14n}) {
        for (const char* uri : {"relative", "../up", "/path", "#fragment", "a/b:c"}) {
            EXPECT_EQ(
                GetCanonicalizeError(identifier, std::string("<r xmlns:p='") + uri + "'/>"),
                std::string("The namespace URI '") + uri + "' is relative");
        }
        EXPECT_EQ(
            GetCanonicalizeError(identifier, "<r xmlns:p='a+b-c.1:x' xmlns=''/>"), "accepted");
    }
}

TEST(CreateCanonicalizer, AcceptsTheTwoFormsWithoutComments)
{
    const Ref<Document> document = ParseText("<r><!--c--></r>");
    const std::string withHash = std::string(InclusiveC14n) + "#";
    EXPECT_EQ(CanonicalizeToText(withHash.c_str(), document.get()), "<r></r>");
    EXPECT_EQ(CanonicalizeToText(ExclusiveC14n, document.get()), "<r></r>");
}

TEST(CreateCanonicalizer, RefusesEveryOtherAlgorithm)
{
    for (const char* identifier :
         {"",
          "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#WithComments",
          "http://www.w3.org/2001/10/xml-exc-c14n#WithComments",
          "http://www.w3.org/2001/10/xml-exc-c14n",
          "http://www.w3.org/2006/12/xml-c14n11"}) {
        try {
            Security::CreateCanonicalizer(identifier);
            ADD_FAILURE() << identifier;
        } catch (const XmlSecurityException& error) {
            EXPECT_EQ(
                error.what(),
                "Canonicalization '" + std::string(identifier) + "' is not supported");
        }
    }
}

} // namespace

} // namespace Quillon::Xml
