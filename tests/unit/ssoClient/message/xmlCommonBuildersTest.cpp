#include "ssoClient/message/xmlCommonBuilders.h"

#include "builderText.h"
#include "support/FakeSamlToken.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

#include <atomic>
#include <malloc.h>
#include <thread>
#include <vector>

using namespace SsoClient;
using Quillon::Ref;
using Quillon::Xml::ElementNode;
using testing::AllOf;
using testing::HasSubstr;

TEST(ElementBuilder, WithoutAttributesGivesEmptyElement)
{
    const Ref<ElementNode> element = Build(*ElementBuilder("wst", "RequestSecurityToken"));
    EXPECT_EQ(element->GetName(), "wst:RequestSecurityToken");
    EXPECT_TRUE(element->GetAttributes().empty());
    EXPECT_EQ(element->GetFirstChild(), nullptr);
}

TEST(ElementBuilder, WritesAttributesInByteOrderOfTheirNames)
{
    EXPECT_EQ(
        ToText(ElementBuilder(
            "p", "e", {{"xmlns:wsu", "4"}, {"ValueType", "2"}, {"wsu:Id", "3"}, {"URI", "1"}})),
        R"(<p:e URI="1" ValueType="2" wsu:Id="3" xmlns:wsu="4"/>)");
}

TEST(ElementBuilder, GivesNewElementEachTime)
{
    const XMLBuilderPtr builder = ElementBuilder("p", "e");
    EXPECT_NE(Build(*builder), Build(*builder));
}

TEST(ElementBuilder, ReplacesWhatTheOutputHeld)
{
    Ref<ElementNode> out = Build(*ElementBuilder("p", "old"));
    ElementBuilder("p", "new")->build(out);
    EXPECT_EQ(out->GetLocalName(), "new");
}

TEST(TextElementBuilder, KeepsTextAndEscapesItOnlyOnTheWire)
{
    const std::string text = "a <b> & \"c\" 'd'";
    const Ref<ElementNode> element = Build(*TextElementBuilder("p", "e", text));
    const Quillon::Xml::TextNode* const node = Quillon::Xml::AsText(element->GetFirstChild());
    ASSERT_NE(node, nullptr);
    EXPECT_EQ(node->GetText(), text);

    Ref<Quillon::Xml::DocumentHandler> handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(std::string_view(ToText(*element)));
    const ElementNode* const parsed = handler->GetDocument()->GetRootElement();
    EXPECT_EQ(Quillon::Xml::AsText(parsed->GetFirstChild())->GetText(), text);
}

TEST(TextElementBuilder, WithAttributesWritesThemInOrder)
{
    EXPECT_EQ(
        ToText(TextElementBuilder("p", "e", {{"b", "2"}, {"a", "1"}}, "t")),
        R"(<p:e a="1" b="2">t</p:e>)");
}

TEST(TextElementBuilder, WithEmptyTextGivesOneEmptyTextNode)
{
    const Ref<ElementNode> element = Build(*TextElementBuilder("p", "e", ""));
    const Quillon::Xml::TextNode* const node = Quillon::Xml::AsText(element->GetFirstChild());
    ASSERT_NE(node, nullptr);
    EXPECT_EQ(node->GetText(), "");
    EXPECT_EQ(node->GetNextSibling(), nullptr);
}

TEST(TextElementBuilder, RefusesTextThatXmlCannotHoldAndSaysWhere)
{
    const XMLBuilderPtr builder = TextElementBuilder("wsse", "Password", "p\xFCss secret");
    try {
        Build(*builder);
        FAIL() << "built";
    } catch (const Quillon::InvalidArgumentException& error) {
        EXPECT_STREQ(
            error.what(),
            "Invalid argument : The text of element 'wsse:Password' is not UTF-8 at octet 1");
    }
}

TEST(ElementBuilder, RefusesValuesThatXmlCannotHoldAndSaysWhere)
{
    const XMLBuilderPtr builder = ElementBuilder("p", "e", {{"Name", std::string("ab\0c", 4)}});
    try {
        Build(*builder);
        FAIL() << "built";
    } catch (const Quillon::InvalidArgumentException& error) {
        EXPECT_STREQ(
            error.what(),
            "Invalid argument : The value of attribute 'Name' "
            "holds a character that XML does not allow at octet 2");
    }
}

TEST(TextElementBuilder, KeepsCarriageReturnsOfTextAndValues)
{
    const std::string text = ToText(TextElementBuilder("p", "e", {{"a", "1\r\n2\r"}}, "x\r\ny\r"));
    EXPECT_EQ(text, "<p:e a=\"1&#xD;&#xA;2&#xD;\">x&#xD;\ny&#xD;</p:e>");
    Ref<Quillon::Xml::DocumentHandler> handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(std::string_view(text));
    const ElementNode* const parsed = handler->GetDocument()->GetRootElement();
    EXPECT_EQ(parsed->FindAttribute("a")->value, "1\r\n2\r");
    EXPECT_EQ(Quillon::Xml::AsText(parsed->GetFirstChild())->GetText(), "x\r\ny\r");
}

TEST(XMLCompositeBuilder, WithoutChildrenGivesTheRootElement)
{
    EXPECT_EQ(ToText(boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"))), "<p:e/>");
}

TEST(XMLCompositeBuilder, AppendsChildrenInOrder)
{
    const auto composite = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
    composite->Add(ElementBuilder("p", "b")).Add(ElementBuilder("p", "a"));
    EXPECT_EQ(ToText(composite), "<p:e><p:b/><p:a/></p:e>");
}

TEST(XMLCompositeBuilder, NestsAsRootAndAsChild)
{
    const auto inner = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "inner"));
    inner->Add(TextElementBuilder("p", "t", "x"));
    const auto root = boost::make_shared<XMLCompositeBuilder>(inner);
    root->Add(ElementBuilder("p", "last"));
    const auto outer = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "outer"));
    outer->Add(root);
    EXPECT_EQ(ToText(outer), "<p:outer><p:inner><p:t>x</p:t><p:last/></p:inner></p:outer>");
}

TEST(XMLCompositeBuilder, PassesOverNullChildAndReturnsItself)
{
    XMLCompositeBuilder composite(ElementBuilder("p", "e"));
    EXPECT_EQ(&composite.Add(nullptr), &composite);
    EXPECT_EQ(Build(composite)->GetFirstChild(), nullptr);
}

TEST(XMLCompositeBuilder, GivesIndependentTreesEachTime)
{
    const auto composite = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
    composite->Add(ElementBuilder("p", "a"));
    const Ref<ElementNode> first = Build(*composite);
    const Ref<ElementNode> second = Build(*composite);
    EXPECT_NE(first, second);
    EXPECT_NE(first->GetFirstChild(), second->GetFirstChild());
    EXPECT_EQ(ToText(*first), ToText(*second));
}

TEST(XMLCompositeBuilderDeathTest, StopsTheProcessWithoutRoot)
{
    EXPECT_DEATH(
        XMLCompositeBuilder(nullptr), StopsAt("rootBuilder != __null", "xmlCommonBuilders:168"));
}

TEST(Composite, HoldsItsChildrenInOrderAndPassesOverNull)
{
    EXPECT_EQ(
        ToText(Composite(
            ElementBuilder("p", "e"),
            {nullptr, ElementBuilder("p", "b"), nullptr, ElementBuilder("p", "a")})),
        "<p:e><p:b/><p:a/></p:e>");
    EXPECT_EQ(ToText(Composite(ElementBuilder("p", "e"), {})), "<p:e/>");
}

TEST(Composite, CanBeAddedTo)
{
    const auto composite = Composite(ElementBuilder("p", "e"), {ElementBuilder("p", "a")});
    composite->Add(ElementBuilder("p", "b"));
    EXPECT_EQ(ToText(composite), "<p:e><p:a/><p:b/></p:e>");
}

TEST(BuildersOf, KeepsTheOrder)
{
    const std::vector<std::string> names{"b", "a"};
    EXPECT_EQ(
        ToText(Composite(
            ElementBuilder("p", "e"),
            BuildersOf(names, [](const std::string& name) { return ElementBuilder("p", name); }))),
        "<p:e><p:b/><p:a/></p:e>");
}

TEST(BuildAndAppendChildTo, AppendsAfterTheLastChild)
{
    const auto composite = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
    composite->Add(ElementBuilder("p", "a"));
    const Ref<ElementNode> parent = Build(*composite);
    BuildAndAppendChildTo(parent.get(), *ElementBuilder("p", "b"));
    EXPECT_EQ(ToText(*parent), "<p:e><p:a/><p:b/></p:e>");
}

TEST(ElementDefineAttribute, WritesNameAndValueAsGiven)
{
    const Ref<ElementNode> element = Build(*ElementBuilder("p", "e"));
    ElementDefineAttribute(element.get(), {"xmlns:p", "urn:p"});
    ElementDefineAttribute(element.get(), {"p:a", "v"});
    EXPECT_EQ(ToText(*element), R"(<p:e xmlns:p="urn:p" p:a="v"/>)");
}

TEST(InsertSamlTokenBuilder, InsertsTheRootElementUntouched)
{
    FakeSamlToken token;
    token.xml = "<?xml version=\"1.0\"?><!-- before -->"
                "<a:A b=\"2\" xmlns:a=\"urn:a\" a=\"1\"> <a:B>x</a:B>\n<!-- in --></a:A>";
    const auto composite = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
    composite->Add(InsertSamlTokenBuilder(token));
    EXPECT_EQ(
        ToText(composite),
        "<p:e><a:A b=\"2\" xmlns:a=\"urn:a\" a=\"1\"> <a:B>x</a:B>\n<!-- in --></a:A></p:e>");
}

TEST(InsertSamlTokenBuilder, GivesTheSameElementEachTime)
{
    FakeSamlToken token;
    token.xml = "<A/>";
    const XMLBuilderPtr builder = InsertSamlTokenBuilder(token);
    EXPECT_EQ(Build(*builder), Build(*builder));
}

TEST(InsertSamlTokenBuilder, KeepsItsElementAliveByItself)
{
    XMLBuilderPtr builder;
    {
        FakeSamlToken token;
        token.xml = "<A>text</A>";
        builder = InsertSamlTokenBuilder(token);
    }
    const Ref<ElementNode> element = Build(*builder);
    builder.reset();
    EXPECT_EQ(ToText(*element), "<A>text</A>");
}

namespace {

constexpr char TokenText[] =
    "<a:A b=\"2\" xmlns:a=\"urn:a\" a=\"&quot;&#xD;\"> <a:B>x&lt;&#xD;</a:B>\n"
    "<!-- in --><?p i?><c/></a:A>";

XMLBuilderPtr TokenBuilder()
{
    FakeSamlToken token;
    token.xml = TokenText;
    return InsertSamlTokenBuilder(token);
}

XMLBuilderPtr Around(XMLBuilderPtr child)
{
    return Composite(ElementBuilder("p", "e"), {ElementBuilder("p", "f"), std::move(child)});
}

const std::string TokenAround = std::string("<p:e><p:f/>") + TokenText + "</p:e>";

} // namespace

TEST(InsertSamlTokenBuilder, StandsInEveryBuildOfAComposite)
{
    const XMLBuilderPtr composite = Around(TokenBuilder());
    const Ref<ElementNode> first = Build(*composite);
    const Ref<ElementNode> second = Build(*composite);
    const Ref<ElementNode> third = Build(*composite);
    for (const Ref<ElementNode>& built : {first, second, third}) {
        EXPECT_EQ(ToText(*built), TokenAround);
    }
    EXPECT_NE(first->FindChildElement("A"), second->FindChildElement("A"));
    EXPECT_NE(second->FindChildElement("A"), third->FindChildElement("A"));
}

// Most builders are built once, and a copy costs as much as the parse before.
TEST(InsertSamlTokenBuilder, IsNotCopiedForTheFirstBuild)
{
    const XMLBuilderPtr token = TokenBuilder();
    const Ref<ElementNode> built = Build(*Around(token));
    EXPECT_EQ(built->FindChildElement("A"), Build(*token));
}

TEST(InsertSamlTokenBuilder, StandsTwiceInOneComposite)
{
    const XMLBuilderPtr token = TokenBuilder();
    EXPECT_EQ(
        ToText(Composite(ElementBuilder("p", "e"), {token, token})),
        std::string("<p:e>") + TokenText + TokenText + "</p:e>");
}

TEST(InsertSamlTokenBuilder, LeavesTheTreeAloneThatItWasPutInto)
{
    const XMLBuilderPtr token = TokenBuilder();
    Ref<ElementNode> element = Build(*token);
    const Ref<ElementNode> owner = Build(*ElementBuilder("p", "owner"));
    owner->AppendChild(element.get());
    EXPECT_EQ(ToText(Around(token)), TokenAround);
    EXPECT_EQ(element->GetParent(), owner.get());
}

TEST(InsertSamlTokenBuilder, AsRootOfAChildStandsInEveryBuild)
{
    const XMLBuilderPtr composite = Around(Composite(TokenBuilder(), {}));
    const Ref<ElementNode> first = Build(*composite);
    const Ref<ElementNode> second = Build(*composite);
    EXPECT_EQ(ToText(*first), TokenAround);
    EXPECT_EQ(ToText(*second), TokenAround);
}

// Only one of the threads may take the element itself, so each round begins with a new one.
TEST(InsertSamlTokenBuilder, IsBuiltByTwoThreadsAtOnce)
{
    constexpr int RoundCount = 4000;
    std::vector<XMLBuilderPtr> composites;
    for (int round = 0; round < RoundCount; ++round) {
        composites.push_back(Around(TokenBuilder()));
    }
    std::atomic<int> arrived{0};
    std::atomic<int> rightOnes{0};
    const auto buildAll = [&] {
        for (int round = 0; round < RoundCount; ++round) {
            ++arrived;
            while (arrived < 2 * (round + 1)) {
                std::this_thread::yield();
            }
            rightOnes += ToText(composites[round]) == TokenAround ? 1 : 0;
        }
    };
    std::thread other(buildAll);
    buildAll();
    other.join();
    EXPECT_EQ(rightOnes, 2 * RoundCount);
}

// Every tree that a build was part of used to stay with the token's.
TEST(InsertSamlTokenBuilder, KeepsNoMemoryForABuild)
{
    FakeSamlToken token;
    token.xml = "<A>" + std::string(100'000, 'x') + "</A>";
    const XMLBuilderPtr composite = Around(InsertSamlTokenBuilder(token));
    const auto buildOften = [&composite] {
        for (int i = 0; i < 50; ++i) {
            Build(*composite);
        }
        return ::mallinfo2().uordblks;
    };
    const std::size_t before = buildOften();
    const std::size_t after = buildOften();
    EXPECT_LT(after, before + token.xml.size());
}

TEST(InsertSamlTokenBuilder, RefusesXmlThatIsNotWellFormed)
{
    FakeSamlToken token;
    token.xml = "<A>";
    EXPECT_THROW(InsertSamlTokenBuilder(token), Quillon::Xml::XMLParseException);
}
