#include "XmlSupport.h"

#include "quillon/xml/security/Signature.h"

#include <gtest/gtest.h>

// Which declarations a signature fixes [EXC-C14N 1.3, 3]. The signatures here verify nothing.
namespace Quillon::Xml::Security {

namespace {

constexpr char Exclusive[] =
    R"(<d:Transform Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/>)";
constexpr char Inclusive[] =
    R"(<d:Transform Algorithm="http://www.w3.org/TR/2001/REC-xml-c14n-20010315"/>)";

std::string ExclusiveWithList(const std::string& prefixes)
{
    return R"(<d:Transform Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#">)"
           R"(<e:InclusiveNamespaces xmlns:e="http://www.w3.org/2001/10/xml-exc-c14n#" PrefixList=")"
           + prefixes + R"("/></d:Transform>)";
}

std::string WithReference(const std::string& canonicalization)
{
    return R"(<d:Reference URI=""><d:Transforms>)"
           R"(<d:Transform Algorithm="http://www.w3.org/2000/09/xmldsig#enveloped-signature"/>)"
           + canonicalization
           + R"(</d:Transforms><d:DigestMethod Algorithm="x"/><d:DigestValue>AAAA</d:DigestValue>)"
             "</d:Reference>";
}

std::string Signed(
    const std::string& startTag, const std::string& content, const std::string& references)
{
    return startTag
           + R"(<d:Signature xmlns:d="http://www.w3.org/2000/09/xmldsig#"><d:SignedInfo>)"
             R"(<d:CanonicalizationMethod Algorithm="x"/><d:SignatureMethod Algorithm="x"/>)"
           + references + "</d:SignedInfo><d:SignatureValue>AAAA</d:SignatureValue></d:Signature>"
           + content + "</r>";
}

/** Whether the binding of `prefix` at the element `leaf`, wherever it stands, is covered. */
bool IsCovered(const std::string& xml, const std::string& prefix)
{
    const Ref<Document> document = ParseText(xml);
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    CreateSignatureFromDom(
        root, root->FindChildElement("Signature"), SignatureProfile::NARROW, signature);
    const ElementNode* outer = root->FindChildElement("outer");
    const ElementNode* leaf = (outer != nullptr ? outer : root)->FindChildElement("leaf");
    return signature->CoversBinding(*leaf, prefix);
}

} // namespace

TEST(CoversBinding, NotWhereNoNameUsesThePrefix)
{
    const std::string content = "<leaf/>";
    EXPECT_FALSE(IsCovered(Signed("<r xmlns:p='urn:p'>", content, WithReference(Exclusive)), "p"));
    EXPECT_FALSE(IsCovered(Signed("<r xmlns:p='urn:p'>", content, WithReference(Exclusive)), "q"));
}

TEST(CoversBinding, InInclusiveForm)
{
    const std::string content = "<leaf/>";
    EXPECT_TRUE(IsCovered(Signed("<r xmlns:p='urn:p'>", content, WithReference(Inclusive)), "p"));
    // With no canonicalization named, the inclusive one gives the octets [XMLDSIG 4.3.3.2].
    EXPECT_TRUE(IsCovered(Signed("<r xmlns:p='urn:p'>", content, WithReference("")), "p"));
}

TEST(CoversBinding, OfAListedPrefix)
{
    const std::string content = "<leaf/>";
    const std::string start = "<r xmlns:p='urn:p'>";
    EXPECT_TRUE(IsCovered(Signed(start, content, WithReference(ExclusiveWithList("q p"))), "p"));
    EXPECT_FALSE(IsCovered(Signed(start, content, WithReference(ExclusiveWithList("pp"))), "p"));
    EXPECT_TRUE(
        IsCovered(Signed(start, content, WithReference(ExclusiveWithList("#default"))), ""));
}

TEST(CoversBinding, WhereTheElementOrAnAttributeOfItUsesThePrefix)
{
    const std::string start = "<r xmlns:p='urn:p'>";
    EXPECT_TRUE(IsCovered(Signed(start, "<p:leaf/>", WithReference(Exclusive)), "p"));
    EXPECT_TRUE(IsCovered(Signed(start, "<leaf p:a=''/>", WithReference(Exclusive)), "p"));
    EXPECT_FALSE(IsCovered(Signed(start, "<leaf p=''/>", WithReference(Exclusive)), "p"));
}

TEST(CoversBinding, WhereAnAncestorUsesThePrefix)
{
    const std::string start = "<r xmlns:p='urn:p'>";
    const std::string content = "<p:outer><leaf/></p:outer>";
    EXPECT_TRUE(IsCovered(Signed(start, content, WithReference(Exclusive)), "p"));
    std::string apex = Signed("<p:r xmlns:p='urn:p'>", "<leaf/>", WithReference(Exclusive));
    apex.replace(apex.rfind("</r>"), 4, "</p:r>");
    EXPECT_TRUE(IsCovered(apex, "p"));
}

TEST(CoversBinding, NotOfADeclarationBelowTheOneThatIsRendered)
{
    const std::string start = "<r xmlns:p='urn:p'>";
    EXPECT_FALSE(IsCovered(
        Signed(start, "<p:outer><leaf xmlns:p='urn:other'/></p:outer>", WithReference(Exclusive)),
        "p"));
    EXPECT_TRUE(IsCovered(
        Signed(start, "<p:outer><leaf xmlns:p='urn:p'/></p:outer>", WithReference(Exclusive)),
        "p"));
}

TEST(CoversBinding, OfTheDefaultNamespaceByUnprefixedElementsAlone)
{
    const std::string start = "<r xmlns:p='urn:p' xmlns='urn:d'>";
    EXPECT_TRUE(IsCovered(Signed(start, "<leaf/>", WithReference(Exclusive)), ""));
    const std::string prefixed = "<p:r xmlns:p='urn:p' xmlns='urn:d'>";
    std::string text = Signed(prefixed, "<p:leaf a=''/>", WithReference(Exclusive));
    text.replace(text.rfind("</r>"), 4, "</p:r>");
    EXPECT_FALSE(IsCovered(text, ""));
}

TEST(CoversBinding, IfOneOfSeveralReferencesDoes)
{
    const std::string start = "<r xmlns:p='urn:p'>";
    EXPECT_TRUE(IsCovered(
        Signed(start, "<leaf/>", WithReference(Exclusive) + WithReference(Inclusive)), "p"));
    EXPECT_FALSE(IsCovered(Signed(start, "<leaf/>", ""), "p"));
}

TEST(CoversBinding, NotOutsideTheSignedElement)
{
    for (const char* const form : {Exclusive, Inclusive}) {
        for (const char* const leaf : {"<leaf/>", "<p:leaf/>"}) {
            const Ref<Document> document = ParseText(
                std::string("<o xmlns:p='urn:p'>") + leaf + Signed("<r>", "", WithReference(form))
                + "</o>");
            const ElementNode* root = document->GetRootElement();
            ElementNode* part = root->FindChildElement("r");
            Ref<Signature> signature;
            CreateSignatureFromDom(
                part, part->FindChildElement("Signature"), SignatureProfile::NARROW, signature);
            EXPECT_FALSE(signature->CoversBinding(*root->FindChildElement("leaf"), "p")) << leaf;
            EXPECT_FALSE(signature->CoversBinding(*root, "p"));
        }
    }
}

TEST(CoversBinding, RefusesTransformsOutsideTheProfile)
{
    const std::string xml = Signed(
        "<r xmlns:p='urn:p'>", "<leaf/>", WithReference("<d:Transform Algorithm='urn:other'/>"));
    EXPECT_THROW(IsCovered(xml, "p"), XmlSecurityException);
}

} // namespace Quillon::Xml::Security
