#include "ssoClient/message/xmlCommonBuilders.h"

#include "builderText.h"
#include "support/FakeSamlToken.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

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
        XMLCompositeBuilder(nullptr),
        AllOf(
            HasSubstr("rootBuilder != __null"),
            HasSubstr("lib/ssoClient/xmlCommonBuilders"),
            HasSubstr("168")));
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

TEST(InsertSamlTokenBuilder, RefusesXmlThatIsNotWellFormed)
{
    FakeSamlToken token;
    token.xml = "<A>";
    EXPECT_THROW(InsertSamlTokenBuilder(token), Quillon::Xml::XMLParseException);
}
