#include "XmlSupport.h"

#include <gtest/gtest.h>

namespace Quillon::Xml {

namespace {

Ref<ElementNode> MakeElement(const char* prefix, const char* localName)
{
    Ref<ElementNode> element;
    CreateElementNode(prefix, localName, element);
    return element;
}

Ref<TextNode> MakeText(std::string_view content)
{
    Ref<TextNode> text;
    CreateTextNode(text);
    text->SetText(content);
    return text;
}

std::string ToUtf8(unsigned codePoint)
{
    const auto tail = [codePoint](int shift) {
        return static_cast<char>(0x80U | ((codePoint >> shift) & 0x3FU));
    };
    const auto lead = [codePoint](unsigned mark, int shift) {
        return static_cast<char>(mark | (codePoint >> shift));
    };
    if (codePoint < 0x80) {
        return {static_cast<char>(codePoint)};
    }
    if (codePoint < 0x800) {
        return {lead(0xC0, 6), tail(0)};
    }
    if (codePoint < 0x10000) {
        return {lead(0xE0, 12), tail(6), tail(0)};
    }
    return {lead(0xF0, 18), tail(12), tail(6), tail(0)};
}

/** What is said of a text that is refused; "accepted" if it is not. */
std::string GetTextFault(std::string_view content)
{
    try {
        MakeText(content);
    } catch (const InvalidArgumentException& error) {
        return error.what();
    }
    return "accepted";
}

std::string GetValueFault(std::string_view value)
{
    const Ref<ElementNode> element = MakeElement("", "e");
    element->DefineAttribute("p:name", "before");
    try {
        element->DefineAttribute("p:name", value);
    } catch (const InvalidArgumentException& error) {
        // What is refused changes nothing.
        return element->FindAttribute("p:name")->value == "before" ? error.what() : "changed";
    }
    return "accepted";
}

TEST(CreateElementNode, JoinsPrefixAndLocalName)
{
    const Ref<ElementNode> element = MakeElement("p", "local");
    EXPECT_EQ(element->GetName(), "p:local");
    EXPECT_EQ(element->GetPrefix(), "p");
    EXPECT_EQ(element->GetLocalName(), "local");
    EXPECT_EQ(element->GetLine(), 0U);
    EXPECT_EQ(element->GetColumn(), 0U);
}

TEST(CreateElementNode, GivesAnUnprefixedNameForAnEmptyPrefix)
{
    const Ref<ElementNode> element = MakeElement("", "local");
    EXPECT_EQ(element->GetName(), "local");
    EXPECT_EQ(element->GetPrefix(), "");
}

TEST(CreateTextNode, IsEmptyUntilItsTextIsSet)
{
    Ref<TextNode> text;
    CreateTextNode(text);
    EXPECT_EQ(text->GetText(), "");
    text->SetText("<&>");
    EXPECT_EQ(text->GetText(), "<&>");
}

// The parser's library is the judge: what it reads back, and nothing else, may be written.
TEST(SetText, TakesExactlyTheCharactersThatXmlAllows)
{
    std::vector<unsigned> codePoints;
    for (unsigned codePoint = 0; codePoint <= 0x10FFFF; ++codePoint) {
        // All of the first 1,024, and of the rest both ends of every 256.
        if (codePoint < 0x400 || (codePoint & 0xFFU) < 2 || (codePoint & 0xFFU) > 0xFC) {
            codePoints.push_back(codePoint);
        }
    }
    std::size_t acceptedCount = 0;
    for (const unsigned codePoint : codePoints) {
        const std::string text = ToUtf8(codePoint);
        const bool isMarkup = text == "<" || text == "&";
        const bool isAccepted = GetTextFault(text) == "accepted";
        ASSERT_EQ(isAccepted, isMarkup || GetParseError("<e>" + text + "</e>") == "accepted")
            << std::hex << codePoint;
        ASSERT_EQ(isAccepted, GetValueFault(text) == "accepted") << std::hex << codePoint;
        acceptedCount += isAccepted ? 1 : 0;
    }
    // [XML 2.2]: 29 control characters, the surrogates (five of each of 8 times 256) and two more.
    EXPECT_EQ(codePoints.size() - acceptedCount, 29U + 8U * 5U + 2U);
}

TEST(SetText, SaysWhereTheFirstForbiddenCharacterIs)
{
    const std::vector<std::string> forbidden{
        std::string(1, '\0'),
        "\x01",
        "\x08",
        "\x0B",
        "\x0C",
        "\x0E",
        "\x1B",
        "\x1F",
        "\xEF\xBF\xBE",
        "\xEF\xBF\xBF"};
    for (const std::string& character : forbidden) {
        for (std::size_t before = 0; before < 18; ++before) {
            const std::string text = std::string(before, 'a') + character + "b\x01 secret";
            const std::string where =
                "holds a character that XML does not allow at octet " + std::to_string(before);
            EXPECT_EQ(GetTextFault(text), "Invalid argument : The text " + where);
            EXPECT_EQ(
                GetValueFault(text), "Invalid argument : The value of attribute 'p:name' " + where);
        }
    }
}

// [RFC 3629 4]
TEST(SetText, SaysWhereItIsNotUtf8)
{
    const std::vector<std::string> malformed{
        "\x80",             // no lead
        "\xFC\xBC",         // Latin-1
        "\xC0\x80",         // NUL, overlong
        "\xC1\x81",         // overlong
        "\xE0\x9F\xBF",     // overlong
        "\xF0\x8F\xBF\xBF", // overlong
        "\xED\xA0\x80",     // a surrogate
        "\xED\xBF\xBF",     // a surrogate
        "\xF4\x90\x80\x80", // beyond U+10FFFF
        "\xC3(",            // a tail is missing
        "\xE2\x82 ",
        "\xF0\x9F\x98 ",
        "\xFE",
        "\xFF"};
    for (const std::string& octets : malformed) {
        for (std::size_t before = 0; before < 18; ++before) {
            const std::string text = std::string(before, 'a') + octets + "secret";
            const std::string where = "is not UTF-8 at octet " + std::to_string(before);
            EXPECT_EQ(GetTextFault(text), "Invalid argument : The text " + where);
            EXPECT_EQ(
                GetValueFault(text), "Invalid argument : The value of attribute 'p:name' " + where);
        }
    }
    // Cut by the end of the text.
    EXPECT_EQ(GetTextFault("\xC3"), "Invalid argument : The text is not UTF-8 at octet 0");
    EXPECT_EQ(GetTextFault("ab\xE2\x82"), "Invalid argument : The text is not UTF-8 at octet 2");
}

TEST(SetText, TakesWhatIsNextToTheForbidden)
{
    const std::string text = "\t\n\r ~\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80"
                             "\xEF\xBF\xBD\xF0\x90\x80\x80\xF0\x9F\xBF\xBF\xF4\x8F\xBF\xBF";
    for (std::size_t before = 0; before < 18; ++before) {
        EXPECT_EQ(GetTextFault(std::string(before, 'a') + text), "accepted");
        EXPECT_EQ(GetValueFault(std::string(before, 'a') + text), "accepted");
    }
}

TEST(SetText, NamesTheElementAroundTheTextAndKeepsTheOldText)
{
    const Ref<ElementNode> element = MakeElement("p", "e");
    const Ref<TextNode> text = MakeText("before");
    element->AppendChild(text.get());
    try {
        text->SetText("a\x02 secret");
        FAIL() << "accepted";
    } catch (const InvalidArgumentException& error) {
        EXPECT_STREQ(
            error.what(),
            "Invalid argument : The text of element 'p:e' "
            "holds a character that XML does not allow at octet 1");
    }
    EXPECT_EQ(text->GetText(), "before");
}

// A parser reads a plain carriage return as a line feed [XML 2.11].
TEST(Serialize, KeepsCarriageReturns)
{
    const Ref<ElementNode> element = MakeElement("", "e");
    element->DefineAttribute("a", "1\r2\r\n3\n\t");
    element->AppendChild(MakeText("x\ry\r\nz\n\t").get());
    const std::string written = SerializeToText(element.get());
    EXPECT_EQ(written, "<e a=\"1&#xD;2&#xD;&#xA;3&#xA;&#x9;\">x&#xD;y&#xD;\nz\n\t</e>");
    const Ref<Document> read = ParseText(written);
    EXPECT_EQ(read->GetRootElement()->FindAttribute("a")->value, "1\r2\r\n3\n\t");
    EXPECT_EQ(AsText(read->GetRootElement()->GetFirstChild())->GetText(), "x\ry\r\nz\n\t");
}

TEST(DefineAttribute, KeepsTheOrderAndReplacesInPlace)
{
    const Ref<ElementNode> element = MakeElement("", "e");
    for (const char* name : {"c", "a", "b", "d", "e"}) {
        element->DefineAttribute(name, "1");
    }
    element->DefineAttribute("a", "<&\"\t\n\r>");
    EXPECT_EQ(
        SerializeToText(element.get()),
        "<e c=\"1\" a=\"&lt;&amp;&quot;&#x9;&#xA;&#xD;>\" b=\"1\" d=\"1\" e=\"1\"/>");
}

TEST(DefineAttribute, MakesADeclarationThatIsLookedUp)
{
    const Ref<ElementNode> parent = MakeElement("p", "parent");
    const Ref<ElementNode> child = MakeElement("p", "child");
    parent->AppendChild(child.get());
    std::string_view uri = "untouched";
    EXPECT_FALSE(child->LookupNamespace("p", uri));
    EXPECT_EQ(uri, "untouched");
    parent->DefineAttribute("xmlns:p", "urn:p");
    EXPECT_TRUE(child->LookupNamespace("p", uri));
    EXPECT_EQ(uri, "urn:p");
    EXPECT_TRUE(child->HasQName("child", "urn:p"));
    EXPECT_FALSE(child->HasQName("child", "urn:q"));
    EXPECT_FALSE(child->HasQName("parent", "urn:p"));
}

// [XML Names 2.1]
TEST(DefineAttribute, ChangesNoOtherElementWithTheSameTag)
{
    for (unsigned changed = 0; changed < 3; ++changed) {
        const Ref<Document> document = ParseText("<r><a x='1'/><a x='1'/><a x='1'/></r>");
        ElementNode* element = document->GetRootElement()->FindChildElement("a");
        for (unsigned i = 0; i < changed; ++i) {
            element = AsElement(element->GetNextSibling());
        }
        element->DefineAttribute("x", "2");
        element->DefineAttribute("y", "3");
        std::string expected;
        for (unsigned i = 0; i < 3; ++i) {
            expected += i == changed ? "<a x=\"2\" y=\"3\"/>" : "<a x=\"1\"/>";
        }
        EXPECT_EQ("<r>" + expected + "</r>", SerializeToText(document->GetRootElement()));
    }
}

TEST(RepeatsTagOf, IsSaidOfSiblingsWithOneTag)
{
    const Ref<Document> document =
        ParseText("<r><a x='1'/><a x='1'/><a x='1'><a x='1'/></a><a x='2'/><b x='2'/></r>");
    std::vector<const ElementNode*> all;
    CollectElements(document->GetRootElement()->GetFirstChild(), all);
    EXPECT_TRUE(all[1]->RepeatsTagOf(*all[0]));
    EXPECT_TRUE(all[2]->RepeatsTagOf(*all[0]));
    EXPECT_FALSE(all[3]->RepeatsTagOf(*all[0])) << "its parent is another";
    EXPECT_FALSE(all[4]->RepeatsTagOf(*all[0]));
    EXPECT_FALSE(all[5]->RepeatsTagOf(*all[4]));
    document->GetRootElement()->FindChildElement("a")->DefineAttribute("x", "1");
    EXPECT_FALSE(all[1]->RepeatsTagOf(*all[0]));
}

TEST(HasQName, TakesAPrefixThatNobodyDeclaresForNoNamespaceAtAll)
{
    EXPECT_TRUE(MakeElement("", "child")->HasQName("child", ""));
    EXPECT_FALSE(MakeElement("p", "child")->HasQName("child", ""));
}

// [XML Names 3]
TEST(LookupNamespace, FindsTheNearestDeclaration)
{
    const Ref<Document> document = ParseText("<r xmlns='urn:d' xmlns:a='urn:1' xmlns:ab='urn:2'><m "
                                             "xmlns:a='urn:3' xmlns=''><e/></m></r>");
    const ElementNode* inner =
        document->GetRootElement()->FindChildElement("m")->FindChildElement("e");
    std::string_view uri;
    EXPECT_TRUE(inner->LookupNamespace("a", uri));
    EXPECT_EQ(uri, "urn:3");
    EXPECT_TRUE(inner->LookupNamespace("ab", uri));
    EXPECT_EQ(uri, "urn:2");
    EXPECT_TRUE(inner->LookupNamespace("", uri));
    EXPECT_EQ(uri, "");
    EXPECT_TRUE(inner->LookupNamespace("xml", uri));
    EXPECT_EQ(uri, "http://www.w3.org/XML/1998/namespace");
    EXPECT_FALSE(inner->LookupNamespace("b", uri));
    EXPECT_FALSE(inner->LookupNamespace("xmlns", uri));
}

TEST(FindAttribute, TellsRawFromExpandedNames)
{
    const Ref<Document> document =
        ParseText("<e xmlns:p='urn:p' xmlns='urn:d' p:a='1' a='2' q='3'/>");
    const ElementNode* element = document->GetRootElement();
    EXPECT_EQ(element->FindAttribute("p:a")->value, "1");
    EXPECT_EQ(element->FindAttribute("a")->value, "2");
    EXPECT_EQ(element->FindAttribute("b"), nullptr);
    EXPECT_EQ(element->FindAttribute("a", "urn:p")->value, "1");
    EXPECT_EQ(element->FindAttribute("a", "")->value, "2");
    // The default namespace does not apply to attributes [XML Names 6.2].
    EXPECT_EQ(element->FindAttribute("a", "urn:d"), nullptr);
    EXPECT_EQ(element->FindAttribute("p", ""), nullptr);
    std::string value = "untouched";
    EXPECT_FALSE(element->GetAttribute("p", value));
    EXPECT_EQ(value, "untouched");
    EXPECT_TRUE(element->GetAttribute("q", value));
    EXPECT_EQ(value, "3");
    EXPECT_EQ(
        element->GetAttributeMap(),
        (std::map<std::string, std::string>{
            {"a", "2"}, {"p:a", "1"}, {"q", "3"}, {"xmlns", "urn:d"}, {"xmlns:p", "urn:p"}}));
}

TEST(FindChildElement, FindsTheFirstByLocalNameOrByQName)
{
    const Ref<Document> document = ParseText(
        "<r>t<a:x xmlns:a='urn:a' n='1'/><x n='2'/><!--c--><a:x xmlns:a='urn:b' n='3'/></r>");
    const ElementNode* root = document->GetRootElement();
    EXPECT_EQ(root->FindChildElement("x")->FindAttribute("n")->value, "1");
    EXPECT_EQ(root->FindChildElement("x", "urn:b")->FindAttribute("n")->value, "3");
    EXPECT_EQ(root->FindChildElement("x", "")->FindAttribute("n")->value, "2");
    EXPECT_EQ(root->FindChildElement("y"), nullptr);
    EXPECT_EQ(root->FindChildElement("x", "urn:c"), nullptr);
}

TEST(AppendChild, KeepsAParsedTreeAliveInsideAComposedOne)
{
    const Ref<ElementNode> parent = MakeElement("", "parent");
    {
        const Ref<Document> document = ParseText("<!--before--><child a='1'>text</child><?after?>");
        parent->AppendChild(document->GetRootElement());
    }
    EXPECT_EQ(SerializeToText(parent.get()), "<parent><child a=\"1\">text</child></parent>");
    EXPECT_EQ(parent->GetFirstChild()->GetNextSibling(), nullptr);
}

TEST(AppendChild, TakesANodeBesideTheRootOutOfItsDocument)
{
    const Ref<ElementNode> parent = MakeElement("", "parent");
    const Ref<Document> document = ParseText("<?a?><!--b--><r/>");
    parent->AppendChild(document->GetFirstChild()->GetNextSibling());
    EXPECT_EQ(SerializeToText(parent.get()), "<parent><!--b--></parent>");
    EXPECT_EQ(document->GetFirstChild()->GetNodeType(), NodeType::PROCESSING_INSTRUCTION);
    EXPECT_EQ(document->GetFirstChild()->GetNextSibling(), document->GetRootElement());
}

TEST(AppendChild, KeepsTheWholeTreeAliveThroughARefToAnyNode)
{
    Ref<TextNode> text = MakeText("deep");
    {
        const Ref<ElementNode> root = MakeElement("p", "root");
        const Ref<ElementNode> middle = MakeElement("p", "middle");
        root->DefineAttribute("xmlns:p", "urn:p");
        middle->AppendChild(text.get());
        root->AppendChild(middle.get());
    }
    EXPECT_EQ(
        SerializeToText(text->GetParent()->GetParent()),
        "<p:root xmlns:p=\"urn:p\"><p:middle>deep</p:middle></p:root>");
}

TEST(AppendChild, MovesAChildFromItsOldParent)
{
    const Ref<ElementNode> first = MakeElement("", "first");
    const Ref<ElementNode> second = MakeElement("", "second");
    for (const char* name : {"a", "b", "c"}) {
        first->AppendChild(MakeElement("", name).get());
    }
    second->AppendChild(first->FindChildElement("c"));
    second->AppendChild(first->FindChildElement("a"));
    first->AppendChild(MakeElement("", "d").get());
    EXPECT_EQ(SerializeToText(first.get()), "<first><b/><d/></first>");
    EXPECT_EQ(SerializeToText(second.get()), "<second><c/><a/></second>");
}

TEST(AppendChild, MovesAChildToTheEndOfTheSameParent)
{
    const Ref<ElementNode> parent = MakeElement("", "p");
    const Ref<ElementNode> a = MakeElement("", "a");
    parent->AppendChild(a.get());
    parent->AppendChild(MakeElement("", "b").get());
    parent->AppendChild(a.get());
    EXPECT_EQ(SerializeToText(parent.get()), "<p><b/><a/></p>");
}

TEST(AppendChild, RefusesTheElementItselfAndItsAncestors)
{
    const Ref<ElementNode> parent = MakeElement("", "p");
    const Ref<ElementNode> child = MakeElement("", "c");
    parent->AppendChild(child.get());
    EXPECT_THROW(parent->AppendChild(parent.get()), InvalidArgumentException);
    EXPECT_THROW(child->AppendChild(parent.get()), InvalidArgumentException);
    EXPECT_EQ(SerializeToText(parent.get()), "<p><c/></p>");
}

TEST(Serialize, EscapesWhatXmlNeedsAndKeepsEveryKindOfNode)
{
    const Ref<Document> document =
        ParseText("<a:r xmlns:a='urn:a' a:x='&lt;\"&#10;'>&lt;&amp;&gt;&#13;<!-- c --><?pi "
                  "d?><![CDATA[<]]><e/></a:r>");
    EXPECT_EQ(
        SerializeToText(document->GetRootElement()),
        "<a:r xmlns:a=\"urn:a\" a:x=\"&lt;&quot;&#xA;\">"
        "&lt;&amp;&gt;&#xD;<!-- c --><?pi d?>&lt;<e/></a:r>");
}

TEST(NodeTypes, HaveNamesForMessages)
{
    EXPECT_STREQ(ToString(NodeType::ELEMENT), "element");
    EXPECT_STREQ(ToString(NodeType::TEXT), "text");
    EXPECT_STREQ(ToString(NodeType::COMMENT), "comment");
    EXPECT_STREQ(ToString(NodeType::PROCESSING_INSTRUCTION), "processing instruction");
}

TEST(AsNode, GivesNullForNullAndForOtherKinds)
{
    const Ref<TextNode> text = MakeText("t");
    const Ref<ElementNode> element = MakeElement("", "e");
    EXPECT_EQ(AsElement(static_cast<Node*>(nullptr)), nullptr);
    EXPECT_EQ(AsElement(static_cast<Node*>(text.get())), nullptr);
    EXPECT_EQ(AsElement(static_cast<Node*>(element.get())), element.get());
    EXPECT_EQ(AsText(nullptr), nullptr);
    EXPECT_EQ(AsText(element.get()), nullptr);
    EXPECT_EQ(AsText(text.get()), text.get());
    EXPECT_EQ(text->GetFirstChild(), nullptr);
}

} // namespace

} // namespace Quillon::Xml
