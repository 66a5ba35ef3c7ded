#include "XmlSupport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <malloc.h>
#include <thread>
#include <vector>

namespace Quillon::Xml {

namespace {

std::string Repeat(std::string_view text, std::size_t count)
{
    std::string result;
    result.reserve(text.size() * count);
    for (std::size_t i = 0; i < count; ++i) {
        result.append(text);
    }
    return result;
}

/** `count` attributes of distinct names. */
std::string MakeAttributes(std::size_t count, const std::string& namePrefix = "a")
{
    std::string text;
    for (std::size_t i = 0; i < count; ++i) {
        text += " " + namePrefix + std::to_string(i) + "=\"urn:" + std::to_string(i) + "\"";
    }
    return text;
}

/** Kinds and contents of the children of the root, for example `text(a) comment(b)`. */
std::string DescribeChildren(std::string_view text)
{
    std::string description;
    const Ref<Document> document = ParseText(text);
    for (const Node* node = document->GetRootElement()->GetFirstChild(); node != nullptr;
         node = node->GetNextSibling()) {
        description += description.empty() ? "" : " ";
        description += ToString(node->GetNodeType());
        if (const TextNode* content = AsText(node)) {
            description += "(" + std::string(content->GetText()) + ")";
        } else if (const ElementNode* element = AsElement(node)) {
            description += "(" + std::string(element->GetName()) + ")";
        } else if (node->GetNodeType() == NodeType::COMMENT) {
            description +=
                "(" + std::string(static_cast<const CommentNode*>(node)->GetText()) + ")";
        } else {
            const auto* instruction = static_cast<const ProcessingInstructionNode*>(node);
            description += "(" + std::string(instruction->GetTarget()) + "|"
                           + std::string(instruction->GetData()) + ")";
        }
    }
    return description;
}

TEST(Parse, KeepsNamesAndAttributesAsWritten)
{
    const Ref<Document> document = ParseText(
        "<p:r  b = '2'\n xmlns:p=\"urn:p\" a='1' xmlns = 'urn:d' p:c='&#x33;'  ><x/></p:r >");
    EXPECT_EQ(
        SerializeToText(document->GetRootElement()),
        "<p:r b=\"2\" xmlns:p=\"urn:p\" a=\"1\" xmlns=\"urn:d\" p:c=\"3\"><x/></p:r>");
}

TEST(Parse, NormalisesLineEndsAndAttributeBlanks)
{
    const Ref<Document> document = ParseText("<r a='x\r\ny\tz\n&#13;&#10;&#9;'>l\r\nm\rn&#13;</r>");
    EXPECT_EQ(document->GetRootElement()->FindAttribute("a")->value, "x y z \r\n\t");
    EXPECT_EQ(AsText(document->GetRootElement()->GetFirstChild())->GetText(), "l\nm\nn\r");
}

TEST(Parse, MakesOneNodeOfAdjacentTextCDataAndReferences)
{
    EXPECT_EQ(
        DescribeChildren("<r>a&amp;b<![CDATA[<c>]]>d&#x65;\xC3\xA4</r>"), "text(a&b<c>de\xC3\xA4)");
    EXPECT_EQ(DescribeChildren("<r>plain</r>"), "text(plain)");
    EXPECT_EQ(DescribeChildren("<r>&lt;</r>"), "text(<)");
    EXPECT_EQ(DescribeChildren("<r><![CDATA[]]></r>"), "");
}

TEST(Parse, KeepsCommentsAndProcessingInstructionsAsNodes)
{
    EXPECT_EQ(
        DescribeChildren("<r>a<!--b-->c<?d e f?><g/> </r>"),
        "text(a) comment(b) text(c) processing instruction(d|e f) element(g) text( )");
}

TEST(Parse, KeepsLongTextWhole)
{
    for (const char* piece : {"abcdefghij", "\xC3\xA4\xE2\x82\xAC", "a&amp;", "\n"}) {
        const std::string text = Repeat(piece, 20000);
        const Ref<Document> document = ParseText("<r>" + text + "</r>");
        const Node* child = document->GetRootElement()->GetFirstChild();
        const std::string expected = std::string(piece) == "a&amp;" ? Repeat("a&", 20000) : text;
        EXPECT_EQ(AsText(child)->GetText(), expected);
        EXPECT_EQ(child->GetNextSibling(), nullptr);
    }
}

TEST(Parse, TellsWhereATagStarts)
{
    const Ref<Document> document = ParseText("<r>\n  <a\n   x='1'/><b/></r>");
    const ElementNode* root = document->GetRootElement();
    EXPECT_EQ(root->GetLine(), 1U);
    EXPECT_EQ(root->GetColumn(), 1U);
    EXPECT_EQ(root->FindChildElement("a")->GetLine(), 2U);
    EXPECT_EQ(root->FindChildElement("a")->GetColumn(), 3U);
    EXPECT_EQ(root->FindChildElement("b")->GetLine(), 3U);
    EXPECT_EQ(root->FindChildElement("b")->GetColumn(), 11U);
}

TEST(Parse, TellsTagsThatRepeatFromThoseThatNearlyDo)
{
    const std::string text =
        "<r><a x=\"1\"/><a x=\"1\">t</a><a x=\"2\"/><b x=\"2\"/><b x=\"2\" /><b x='2'/><b y=\"2\"/>"
        "<c z=\"&amp;&#x9;\"/><c z=\"&amp;&#x9;\"><c z=\"&amp;&#x9;\"/></c><d/><d/><d e=\"\"/></r>";
    EXPECT_EQ(
        "<r><a x=\"1\"/><a x=\"1\">t</a><a x=\"2\"/><b x=\"2\"/><b x=\"2\"/><b x=\"2\"/><b "
        "y=\"2\"/>"
        "<c z=\"&amp;&#x9;\"/><c z=\"&amp;&#x9;\"><c z=\"&amp;&#x9;\"/></c><d/><d/><d e=\"\"/></r>",
        SerializeToText(ParseText(text)->GetRootElement()));
}

TEST(Parse, TellsWhereATagStartsThatRepeats)
{
    const Ref<Document> document = ParseText("<r><a x='1'/>\n <a x='1'/></r>");
    std::vector<const ElementNode*> elements;
    CollectElements(document->GetRootElement()->GetFirstChild(), elements);
    EXPECT_EQ(1U, elements[0]->GetLine());
    EXPECT_EQ(4U, elements[0]->GetColumn());
    EXPECT_EQ(2U, elements[1]->GetLine());
    EXPECT_EQ(2U, elements[1]->GetColumn());
}

TEST(Parse, CountsTheNamespacesOfATagThatRepeats)
{
    const std::string tag = "<a" + MakeAttributes(40, "xmlns:n") + ">";
    EXPECT_EQ("accepted", GetParseError("<r>" + Repeat(tag, 6) + Repeat("</a>", 6) + "</r>"));
    EXPECT_THAT(
        GetParseError("<r>" + Repeat(tag, 7) + Repeat("</a>", 7) + "</r>"),
        testing::StartsWith("More than 256 namespaces in scope"));
    EXPECT_EQ("accepted", GetParseError("<r>" + Repeat(tag + "</a>", 7) + "</r>"));
}

/** The tree as text, or why there is none. */
std::string DescribeParse(const std::string& text)
{
    try {
        return SerializeToText(ParseText(text)->GetRootElement());
    } catch (const XMLParseException& error) {
        return error.what();
    }
}

/** What becomes of `text` on a thread that has read `before` last; empty for nothing at all. */
std::string DescribeParseAfter(const std::string& before, const std::string& text)
{
    std::string description;
    std::thread thread([&] {
        if (!before.empty()) {
            DescribeParse(before);
        }
        description = DescribeParse(text);
    });
    thread.join();
    return description;
}

TEST(Parse, DependsOnNothingThatTheThreadHasReadBefore)
{
    const std::vector<std::string> texts{
        "<r xmlns='urn:d' xmlns:p='urn:p'><p:a p:b='1'/></r>",
        "<p:r><p:a p:b='1' p:b='2'/></p:r>",
        "<p:r/>",
        "<r xmlns:p='urn:p'><p:a>",
        "<?xml version='1.0' encoding='UTF-8' standalone='yes'?><r/>",
        "<r/>",
        "<r>" + Repeat("<a>", 200),
        "<r xml:space='preserve'> &amp; </r>",
        "<!DOCTYPE r [<!ENTITY e 'f'>]><r>&e;</r>",
        "<r>&e;</r>",
        "<r" + MakeAttributes(200) + "/>",
        "\xEF\xBB\xBF<r>\xC3\xA4</r>"};
    for (const std::string& text : texts) {
        const std::string alone = DescribeParseAfter("", text);
        for (const std::string& before : texts) {
            EXPECT_EQ(alone, DescribeParseAfter(before, text)) << "after " << before;
        }
    }
}

TEST(Parse, KeepsNoLargeDictionary)
{
    const auto measure = [] { return mallinfo2().uordblks; }; // nothing, with a sanitizer
    ParseText("<r/>");
    const std::size_t before = measure();
    std::string text = "<r>";
    for (int i = 0; i < 200'000; ++i) {
        text += "<name-" + std::to_string(i) + "/>";
    }
    ParseText(text + "</r>");
    text = std::string();
    EXPECT_LT(measure(), before + 1'000'000);
}

TEST(ParseInPlace, PointsIntoTheTextAsItIs)
{
    const std::string text = "<?p d?><r a='v'><b>one</b>&amp;</r>";
    const auto isInText = [&text](std::string_view part) {
        return part.data() >= text.data() && part.data() + part.size() <= text.data() + text.size();
    };
    const Ref<Document> document = ParseInPlace(text);
    const ElementNode* root = document->GetRootElement();
    EXPECT_EQ("<r a=\"v\"><b>one</b>&amp;</r>", SerializeToText(root));
    EXPECT_TRUE(isInText(root->GetName()));
    EXPECT_TRUE(isInText(root->FindAttribute("a")->value));
    EXPECT_TRUE(isInText(AsText(root->GetFirstChild()->GetFirstChild())->GetText()));
    EXPECT_EQ(8U, root->GetColumn());
    EXPECT_EQ(NodeType::PROCESSING_INSTRUCTION, document->GetFirstChild()->GetNodeType());
}

TEST(ParseInPlace, RefusesWhatParseRefuses)
{
    const std::string tooLong(ParserLimits::MaxDocumentBytes + 1, ' ');
    for (const std::string& text :
         {std::string(),
          std::string("<r>"),
          std::string("<!DOCTYPE r><r/>"),
          std::string("<r>\0</r>", 8),
          std::string("<r>\xFF</r>"),
          std::string("<a b"),
          tooLong}) {
        std::string error = "accepted";
        try {
            ParseInPlace(text);
        } catch (const XMLParseException& failure) {
            error = failure.what();
        }
        EXPECT_EQ(GetParseError(text), error);
        EXPECT_NE("accepted", error);
    }
}

TEST(Parse, KnowsWhatTheXmlPrefixIsHoweverItIsDeclared)
{
    const Ref<Document> document =
        ParseText("<r xmlns:xml='http://www.w3.org/XML/1998/name&#115;pace' xml:lang='en'/>");
    ASSERT_NE(document->GetRootElement()->FindAttribute("lang", XmlNamespace), nullptr);
    EXPECT_EQ(GetParseError(SerializeToText(document->GetRootElement())), "accepted");
}

TEST(Parse, LeavesAnUndeclaredPrefixReadable)
{
    const Ref<Document> document = ParseText("<p:r q:a='1'/>");
    EXPECT_EQ(document->GetRootElement()->GetName(), "p:r");
    EXPECT_EQ(document->GetRootElement()->FindAttribute("q:a")->value, "1");
}

TEST(Parse, KeepsWhatStandsBesideTheRoot)
{
    const Ref<Document> document = ParseText("<?xml version='1.0'?><?a?><!--b--><r/><?c d?>");
    const Node* node = document->GetFirstChild();
    EXPECT_EQ(node->GetNodeType(), NodeType::PROCESSING_INSTRUCTION);
    node = node->GetNextSibling();
    EXPECT_EQ(node->GetNodeType(), NodeType::COMMENT);
    node = node->GetNextSibling();
    EXPECT_EQ(node, document->GetRootElement());
    node = node->GetNextSibling();
    EXPECT_EQ(node->GetNodeType(), NodeType::PROCESSING_INSTRUCTION);
    EXPECT_EQ(node->GetNextSibling(), nullptr);
}

TEST(Parse, ReadsAReaderAndKeepsTheTreeAfterThat)
{
    const Ref<DocumentHandler> handler = CreateXMLDocumentHandler();
    {
        const Ref<Reader> reader = CreateStringReader("<r>" + Repeat("text ", 5000) + "</r>");
        CreateXMLParser(handler.get())->Parse(reader.get());
    }
    EXPECT_EQ(
        AsText(handler->GetDocument()->GetRootElement()->GetFirstChild())->GetText(),
        Repeat("text ", 5000));
}

TEST(GetDocument, RefusesWhenNothingWasParsed)
{
    EXPECT_THROW(CreateXMLDocumentHandler()->GetDocument(), TypeMismatchException);
}

TEST(Parse, AcceptsUtf8InEveryDeclaredSpelling)
{
    EXPECT_EQ(GetParseError("<?xml version='1.0' encoding='UTF-8'?><r/>"), "accepted");
    EXPECT_EQ(
        GetParseError("<?xml version='1.0' encoding='utf-8' standalone='yes'?><r/>"), "accepted");
    EXPECT_EQ(GetParseError("\xEF\xBB\xBF<r/>"), "accepted");
    EXPECT_EQ(GetParseError(" \n<r/>"), "accepted");
}

TEST(Parse, RefusesOtherEncodings)
{
    EXPECT_THAT(
        GetParseError("<?xml version='1.0' encoding='ISO-8859-1'?><r/>"),
        testing::HasSubstr("Encoding 'ISO-8859-1' is not UTF-8"));
    EXPECT_THAT(
        GetParseError("<?xml version='1.0' encoding='UTF-16'?><r/>"),
        testing::Not(testing::HasSubstr("accepted")));
}

// [XML F.1]
TEST(Parse, SaysThatItReadsNoWideCharacters)
{
    using namespace std::string_view_literals;
    for (const std::string_view text :
         {"\xFF\xFE<\0r\0/\0>\0"sv,
          "\xFE\xFF\0<\0r\0/\0>"sv,
          "<\0r\0/\0>\0"sv,
          "\0<\0r\0/\0>"sv,
          "\xFF\xFE"sv}) {
        EXPECT_EQ(GetParseError(text), "The document is in UTF-16; only UTF-8 is read");
    }
    for (const std::string_view text :
         {"\xFF\xFE\0\0<\0\0\0"sv,
          "\0\0\xFE\xFF\0\0\0<"sv,
          "<\0\0\0r\0\0\0"sv,
          "\0\0\0<\0\0\0r"sv}) {
        EXPECT_EQ(GetParseError(text), "The document is in UTF-32; only UTF-8 is read");
    }
}

TEST(Parse, TakesWhatIsDamagedForNoOtherEncoding)
{
    using namespace std::string_view_literals;
    EXPECT_EQ(GetParseError("<r\0/>"sv), "NUL character at octet 2");
    EXPECT_EQ(GetParseError("<r/>\0"sv), "NUL character at octet 4");
    EXPECT_EQ(GetParseError("<\0r/>"sv), "NUL character at octet 1");
    for (const std::string_view text :
         {"\0<r/>"sv, "\0<"sv, "\0"sv, "\0\0<r/>"sv, "\xFF<r/>"sv, "\xFE"sv}) {
        EXPECT_EQ(GetParseError(text), "Start tag expected, '<' not found at octet 0");
    }
}

TEST(Parse, RefusesAnotherXmlVersion)
{
    EXPECT_THAT(
        GetParseError("<?xml version='1.1'?><r/>"),
        testing::HasSubstr("XML version '1.1' is not supported"));
}

TEST(Parse, SaysNoMoreThanALineOfADocumentThatItRefuses)
{
    const std::string name = Repeat("a", 49'000);
    for (const std::string& text :
         {"<?xml version='1." + Repeat("1", 100'000) + "'?><r/>",
          "<?xml version='1.0' encoding='" + name + "'?><r/>",
          "<" + name + "></r>",
          "<r>&" + name + ";</r>",
          "<r " + name + "='' " + name + "=''/>"}) {
        const std::string error = GetParseError(text);
        EXPECT_NE(error, "accepted");
        EXPECT_LT(error.size(), 600U) << error.substr(0, 100);
    }
}

TEST(Parse, CutsNoCharacterOfADocumentThatItRefuses)
{
    for (const std::string shift : {"", "a"}) {
        const std::string error = GetParseError("<" + shift + Repeat("\xC3\xA9", 2'000) + "></r>");
        EXPECT_EQ(GetParseError("<r><![CDATA[" + error + "]]></r>"), "accepted") << error;
    }
}

// [RFC 3629]
TEST(Parse, RefusesOctetsThatAreNotUtf8)
{
    const std::vector<std::string> malformed{
        "\x80",
        "\xC0\xAF",
        "\xC1\x81",
        "\xC3",
        "\xC3(",
        "\xE0\x80\xAF",
        "\xE2\x82",
        "\xED\xA0\x80",
        "\xED\xBF\xBF",
        "\xF0\x80\x80\xAF",
        "\xF4\x90\x80\x80",
        "\xF5\x80\x80\x80",
        "\xFE",
        "\xFF"};
    for (const std::string& octets : malformed) {
        for (std::size_t padding = 0; padding < 9; ++padding) {
            const std::string text = "<r>" + std::string(padding, 'a') + octets + "</r>";
            EXPECT_EQ(
                GetParseError(text),
                "The text is not UTF-8 at octet " + std::to_string(3 + padding));
        }
    }
    EXPECT_EQ(
        GetParseError("<r>\xC2\x80\xDF\xBF\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80"
                      "\xF0\x90\x80\x80\xF4\x8F\xBF\xBD</r>"),
        "accepted");
}

// [XML 3.1]
TEST(Parse, SaysThatATagIsCut)
{
    EXPECT_EQ(GetParseError("<a"), "The document ends inside a tag at line 1, column 3");
    EXPECT_EQ(GetParseError("<r>\n<a"), "The document ends inside a tag at line 2, column 3");
    EXPECT_EQ(GetParseError("<a "), "The document ends inside a tag at line 1, column 4");
}

// Wherever a document is cut, it is the parser's text or ours that says so, and names the place.
TEST(Parse, RefusesADocumentThatIsCutAnywhere)
{
    const std::string document = "<?xml version='1.0'?><!--c--><p:r xmlns:p='urn:p' a='&lt;'>"
                                 "t&amp;<![CDATA[d]]><?i n?><e/>\n</p:r>";
    ASSERT_EQ(GetParseError(document), "accepted");
    for (std::size_t length = 1; length < document.size(); ++length) {
        const std::string error = GetParseError(document.substr(0, length));
        EXPECT_THAT(error, testing::ContainsRegex("line [0-9]+, column [0-9]+$")) << length;
        EXPECT_THAT(error, testing::Not(testing::HasSubstr("in place"))) << length;
    }
}

// [XML 2.8]
TEST(Parse, RefusesEveryDoctype)
{
    for (const char* doctype :
         {"<!DOCTYPE r>",
          "<!DOCTYPE r []>",
          "<!DOCTYPE r SYSTEM 'file:///x'>",
          "<!DOCTYPE r PUBLIC 'p' 'http://127.0.0.1/x'>",
          "<!DOCTYPE r [<!ENTITY e 'x'>]>",
          "<!DOCTYPE r [<!ENTITY % p SYSTEM 'file:///x'> %p;]>"}) {
        EXPECT_THAT(
            GetParseError(std::string(doctype) + "<r/>"),
            testing::HasSubstr("A DOCTYPE is not accepted"))
            << doctype;
    }
}

// [XML Names 2.1], [RFC 3986 4.1]
TEST(Parse, RefusesANamespaceNameThatIsNoUri)
{
    for (const std::string name : {"urn:a", "a", "http://[::1]/", "%20"}) {
        EXPECT_EQ(GetParseError("<p:r xmlns:p='" + name + "'/>"), "accepted") << name;
    }
    EXPECT_EQ(
        GetParseError("<p:r xmlns:p='a b'/>"),
        "xmlns:p: 'a b' is not a valid URI at line 1, column 19");
    EXPECT_NE(GetParseError("<p:r xmlns:p='urn:<'/>"), "accepted");
    EXPECT_NE(GetParseError("<r xmlns='%2'/>"), "accepted");
}

TEST(Parse, RefusesWhatIsNotWellFormed)
{
    for (const char* text :
         {"<r>",
          "<r></s>",
          "<r/><r/>",
          "<r/>text",
          "text",
          "<r a='1' a='2'/>",
          "<r a=1/>",
          "<r a/>",
          "<r a='<'/>",
          "<r>&undefined;</r>",
          "<r>&#0;</r>",
          "<r>&#xFFFE;</r>",
          "<r>\x01</r>",
          "<r>]]></r>",
          "<r><!-- -- --></r>",
          "<r><?xml version='1.0'?></r>",
          "<r:r:r xmlns:r='urn:r'/>",
          "<r xmlns:p=''/>",
          "<r xmlns:a='urn:a' xmlns:b='urn:a' a:x='' b:x=''/>",
          "<r xmlns:xmlns='urn:a'/>",
          "<r xmlns:xml='urn:a'/>",
          "<r",
          "<",
          "<r>&amp</r>"}) {
        EXPECT_NE(GetParseError(text), "accepted") << text;
    }
    EXPECT_EQ(GetParseError(""), "The document is empty at octet 0");
    EXPECT_EQ(GetParseError("\xEF\xBB\xBF"), "The document is empty at octet 3");
    EXPECT_THAT(GetParseError("<a>\n<b></a>"), testing::HasSubstr("line 2"));
}

TEST(Parse, LimitsTheSize)
{
    const std::size_t frame = std::string_view("<r></r>").size();
    const std::string largest(ParserLimits::MaxDocumentBytes - frame, 'x');
    EXPECT_EQ(GetParseError("<r>" + largest + "</r>"), "accepted");
    EXPECT_EQ(
        GetParseError("<r>x" + largest + "</r>"), "The document has more than 8388608 octets");
    const Ref<DocumentHandler> handler = CreateXMLDocumentHandler();
    const Ref<Reader> reader = CreateStringReader("<r>" + largest + largest + "</r>");
    EXPECT_THROW(CreateXMLParser(handler.get())->Parse(reader.get()), XMLParseException);
}

TEST(Parse, LimitsTheDepth)
{
    const auto nest = [](std::size_t depth) {
        return Repeat("<a>", depth) + Repeat("</a>", depth);
    };
    EXPECT_EQ(GetParseError(nest(ParserLimits::MaxDepth)), "accepted");
    EXPECT_THAT(
        GetParseError(nest(ParserLimits::MaxDepth + 1)),
        testing::HasSubstr("More than 128 elements inside one another"));
    EXPECT_THAT(GetParseError(nest(200000)), testing::HasSubstr("More than 128 elements"));
}

TEST(Parse, LimitsTheAttributesOfOneElement)
{
    EXPECT_EQ(GetParseError("<r" + MakeAttributes(ParserLimits::MaxAttributes) + "/>"), "accepted");
    EXPECT_EQ(
        GetParseError("<r" + MakeAttributes(ParserLimits::MaxAttributes + 1) + "/>"),
        "More than 256 attributes in the tag at octet 0");
    EXPECT_EQ(
        GetParseError("<q><r" + MakeAttributes(200000) + "/></q>"),
        "More than 256 attributes in the tag at octet 3");
    // Broken off by an error, they must not be compared with one another either.
    EXPECT_EQ(
        GetParseError("<r" + MakeAttributes(200000) + " b='<'/>"),
        "More than 256 attributes in the tag at octet 0");
    EXPECT_EQ(
        GetParseError("<r" + MakeAttributes(200000)),
        "More than 256 attributes in the tag at octet 0");
}

TEST(Parse, TakesLongTextAndCommentsForNoTag)
{
    const std::string quotes = Repeat(" a=\"b\"", 2000);
    EXPECT_EQ(
        GetParseError("<r>" + quotes + "<!--" + quotes + "--><?p " + quotes + "?></r>"),
        "accepted");
    EXPECT_EQ(GetParseError("<r a='" + Repeat("b=c ", 2000) + "'/>"), "accepted");
    // What looks like a tag inside a comment, a CDATA section or an instruction is none.
    EXPECT_EQ(GetParseError("<r><!-- <x" + quotes + "--></r>"), "accepted");
    EXPECT_EQ(GetParseError("<r><![CDATA[ <x" + quotes + "]]></r>"), "accepted");
    EXPECT_EQ(GetParseError("<r><?p <x" + quotes + "?></r>"), "accepted");
    EXPECT_THAT(
        GetParseError("<r><!-- - --><x" + quotes + "/></r>"),
        testing::StartsWith("More than 256 attributes in the tag"));
    EXPECT_THAT(
        GetParseError("<r><!-- <x" + quotes + "--><x" + quotes + "/></r>"),
        testing::StartsWith("More than 256 attributes in the tag"));
}

TEST(Parse, LimitsTheNamespacesOfOneElementAndInScope)
{
    const auto declare = [](std::size_t count, const char* name) {
        return MakeAttributes(count, std::string("xmlns:") + name);
    };
    EXPECT_EQ(GetParseError("<r" + declare(64, "n") + "/>"), "accepted");
    EXPECT_THAT(
        GetParseError("<r" + declare(65, "n") + "/>"),
        testing::HasSubstr("More than 64 namespaces declared by one element"));
    const std::string four = "<a" + declare(64, "a") + "><b" + declare(64, "b") + "><c"
                             + declare(64, "c") + "><d" + declare(64, "d") + ">";
    EXPECT_EQ(GetParseError(four + "</d></c></b></a>"), "accepted");
    EXPECT_THAT(
        GetParseError(four + "<e xmlns='urn:e'/></d></c></b></a>"),
        testing::HasSubstr("More than 256 namespaces in scope"));
    // What went out of scope does not count.
    EXPECT_EQ(
        GetParseError("<r>" + Repeat("<a" + declare(64, "a") + "/>", 10) + "</r>"), "accepted");
}

} // namespace

} // namespace Quillon::Xml
