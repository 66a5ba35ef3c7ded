#include "XmlSupport.h"

#include "quillon/xml/security/Signature.h"
#include "support/TestData.h"

#include <gtest/gtest.h>

namespace Quillon::Xml::Security {

namespace {

std::string Verify(const std::string& file, SignatureProfile profile)
{
    const Ref<Document> document = ParseText(ReadTestData("assertions/accepted/" + file + ".xml"));
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    CreateSignatureFromDom(root, root->FindChildElement("Signature"), profile, signature);
    try {
        const auto resolver = CreateTrustSetKeyResolver(GetTestCertificates("sts"));
        return signature->Verify(resolver.get()) ? "valid" : "invalid";
    } catch (const XmlSecurityException& error) {
        return error.what();
    }
}

} // namespace

TEST(SignatureProfile, TakesPssOnlyWhereItIsChosen)
{
    EXPECT_EQ(Verify("google-pss", SignatureProfile::WITH_RSA_PSS), "valid");
    EXPECT_EQ(
        Verify("google-pss", SignatureProfile::NARROW),
        "Signature algorithm 'http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1' is not "
        "accepted");
}

TEST(SignatureProfile, TakesTheRestInBoth)
{
    EXPECT_EQ(Verify("adfs-rsa", SignatureProfile::NARROW), "valid");
    EXPECT_EQ(Verify("adfs-rsa", SignatureProfile::WITH_RSA_PSS), "valid");
}

TEST(SignatureProfile, IsTheNarrowOneWithoutAChoice)
{
    const Ref<Document> document = ParseText(ReadTestData("assertions/accepted/google-pss.xml"));
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    CreateSignatureFromDom(root, root->FindChildElement("Signature"), signature);
    const auto resolver = CreateTrustSetKeyResolver(GetTestCertificates("sts"));
    EXPECT_THROW(signature->Verify(resolver.get()), XmlSecurityException);
}

TEST(SignatureProfile, DoesNotGoForSigning)
{
    const Ref<Document> document = ParseText("<a ID='x'/>");
    Ref<Signature> signature;
    EXPECT_THROW(
        CreateBlankSignature(
            document->GetRootElement(), ExclusiveC14n, RsaPssSha256, "ds", signature),
        XmlSecurityException);
}

} // namespace Quillon::Xml::Security
