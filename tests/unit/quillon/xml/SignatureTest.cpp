#include "XmlSupport.h"

#include "quillon/xml/security/Signature.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

// Verification is tested on whole tokens in tests/hostile, signed messages with xmlsec1 in
// tests/unit/ssoClient/message; here stands what neither can reach.
namespace Quillon::Xml::Security {

namespace {

Ref<const Crypto::PrivateKey> LoadKey(const std::string& name)
{
    std::ifstream file(std::string(TEST_DATA_DIR) + "/keys/" + name + "-key.pem");
    std::ostringstream text;
    text << file.rdbuf();
    return Crypto::CreatePrivateKey(text.str());
}

/** The message of the `XmlSecurityException` that `action` raises; "accepted" if it does not. */
template <class Action>
std::string GetSecurityError(Action action)
{
    try {
        action();
    } catch (const XmlSecurityException& error) {
        return error.what();
    }
    return "accepted";
}

class BlankSignature : public testing::Test
{
protected:
    explicit BlankSignature(
        const char* text = "<r xmlns:w='urn:w'><a w:Id='one'>x</a><b ID='two'/><c Id='two'/></r>")
        : _document(ParseText(text))
    {
        CreateBlankSignature(
            _document->GetRootElement(), ExclusiveC14n, RsaSha256, "ds", _signature);
    }

    std::string SignWith(const std::string& key)
    {
        const Ref<const Crypto::PrivateKey> privateKey = LoadKey(key);
        return GetSecurityError([&] { _signature->Sign(privateKey.get()); });
    }

    Ref<Document> _document;
    Ref<Signature> _signature;
};

TEST_F(BlankSignature, RefusesMethodsOutsideTheProfile)
{
    ElementNode* root = _document->GetRootElement();
    Ref<Signature> out;
    EXPECT_EQ(
        GetSecurityError([&] { CreateBlankSignature(root, InclusiveC14n, RsaSha256, "ds", out); }),
        std::string("Signing uses Exclusive XML Canonicalization, not '") + InclusiveC14n + "'");
    EXPECT_EQ(
        GetSecurityError(
            [&] { CreateBlankSignature(root, ExclusiveC14n, "urn:other", "ds", out); }),
        "Signature algorithm 'urn:other' is not accepted");
    Reference* reference = _signature->AddReference("#one");
    EXPECT_EQ(
        GetSecurityError([&] { reference->SetDigestMethod("urn:sha1"); }),
        "Digest algorithm 'urn:sha1' is not accepted");
    EXPECT_EQ(
        GetSecurityError([&] { reference->AddTransform(EnvelopedSignature); }),
        std::string("Signing uses Exclusive XML Canonicalization, not '") + EnvelopedSignature
            + "'");
}

TEST_F(BlankSignature, RefusesReferencesThatNameNotExactlyOneElement)
{
    EXPECT_EQ(
        GetSecurityError([&] { _signature->AddReference(""); }),
        "Reference '' is not of the form '#ID'");
    EXPECT_EQ(
        GetSecurityError([&] { _signature->AddReference("#"); }),
        "Reference '#' is not of the form '#ID'");
    EXPECT_EQ(
        GetSecurityError([&] { _signature->AddReference("http://127.0.0.1/#one"); }),
        "Reference 'http://127.0.0.1/#one' is not of the form '#ID'");
    _signature->AddReference("#none");
    EXPECT_EQ(SignWith("sts"), "Reference '#none' names 0 elements of the document");
}

TEST_F(BlankSignature, RefusesAnAmbiguousId)
{
    _signature->AddReference("#two");
    EXPECT_EQ(SignWith("sts"), "Reference '#two' names 2 elements of the document");
}

TEST_F(BlankSignature, RefusesKeysThatTheMethodCannotUse)
{
    _signature->AddReference("#one");
    EXPECT_EQ(
        SignWith("sts-p256"),
        std::string("A key of type EC prime256v1 cannot sign with '") + RsaSha256 + "'");
    EXPECT_EQ(
        SignWith("weak"),
        std::string("A key of type RSA-1024 cannot sign with '") + RsaSha256 + "'");
    EXPECT_EQ(SignWith("sts"), "accepted");
}

TEST_F(BlankSignature, IsSignedOnlyOnceAndNotVerified)
{
    _signature->AddReference("#one");
    EXPECT_EQ(SignWith("sts"), "accepted");
    EXPECT_THROW(SignWith("sts"), InvalidStateException);
    EXPECT_THROW(_signature->Verify(nullptr), InvalidStateException);
}

TEST_F(BlankSignature, WritesWhatItWasTold)
{
    Reference* reference = _signature->AddReference("#one");
    reference->SetDigestMethod(DigestSha512);
    reference->AddTransform(ExclusiveC14n);
    Ref<ElementNode> keyInfo;
    CreateElementNode("k", "Key", keyInfo);
    keyInfo->DefineAttribute("xmlns:k", "urn:k");
    _signature->AddKeyInfoContent(keyInfo.get());
    EXPECT_EQ(SignWith("sts"), "accepted");
    EXPECT_EQ(_signature->GetReferences().size(), 1U);
    EXPECT_EQ(_signature->GetReferences().front()->GetUri(), "#one");
    const ElementNode* element = _signature->GetElement();
    const ElementNode* signedInfo = element->FindChildElement("SignedInfo", DsNamespace);
    ASSERT_NE(signedInfo, nullptr);
    // The digest is that of `<a xmlns:w="urn:w" w:Id="one">x</a>`, computed with openssl.
    EXPECT_EQ(
        SerializeToText(signedInfo->FindChildElement("Reference")),
        std::string("<ds:Reference URI=\"#one\"><ds:Transforms><ds:Transform Algorithm=\"")
            + ExclusiveC14n + "\"/></ds:Transforms><ds:DigestMethod Algorithm=\"" + DigestSha512
            + "\"/><ds:DigestValue>"
            + "MXYvrCxqsZU1xTfKLL4wo/rJcEmwBvssNv9D8/"
              "lJWtFxyIhbVT0Cwjpv6jQwYoHtGxRViTQKezkFPpgfzG0j7w=="
            + "</ds:DigestValue></ds:Reference>");
    EXPECT_EQ(
        SerializeToText(element->FindChildElement("KeyInfo")),
        "<ds:KeyInfo><k:Key xmlns:k=\"urn:k\"/></ds:KeyInfo>");
}

TEST(CreateSignatureFromDom, RefusesAnElementThatIsNoChildOfTheSignedOne)
{
    const Ref<Document> document =
        ParseText("<r><m><s xmlns='http://www.w3.org/2000/09/xmldsig#'/></m></r>");
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    EXPECT_THROW(
        CreateSignatureFromDom(root, root->FindChildElement("m")->FindChildElement("s"), signature),
        SignatureSyntaxException);
}

TEST(CreateTrustSetKeyResolver, RefusesANullCertificate)
{
    EXPECT_THROW(CreateTrustSetKeyResolver({nullptr}), InvalidArgumentException);
}

TEST(ReadSignature, IsNotSignedAgain)
{
    std::ifstream file(std::string(TEST_DATA_DIR) + "/tokens/accepted/bearer.xml");
    std::ostringstream text;
    text << file.rdbuf();
    const Ref<Document> document = ParseText(text.str());
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    CreateSignatureFromDom(root, root->FindChildElement("Signature"), signature);
    EXPECT_EQ(signature->GetElement(), root->FindChildElement("Signature"));
    EXPECT_THROW(signature->AddReference("#x"), InvalidStateException);
    EXPECT_THROW(signature->AddKeyInfoContent(root), InvalidStateException);
    EXPECT_THROW(signature->Sign(LoadKey("sts").get()), InvalidStateException);
}

} // namespace

} // namespace Quillon::Xml::Security
