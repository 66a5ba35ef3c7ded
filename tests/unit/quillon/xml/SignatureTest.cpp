#include "XmlSupport.h"

#include "quillon/StringUtil.h"
#include "quillon/xml/security/Signature.h"
#include "support/TestData.h"

#include <gtest/gtest.h>

// Verification is tested on whole tokens in tests/hostile, signed messages with xmlsec1 in
// tests/unit/ssoClient/message; here stands what neither can reach.
namespace Quillon::Xml::Security {

namespace {

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
        const Ref<const Crypto::PrivateKey> privateKey = GetTestKey(key);
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

/** A document of the test data in which `sts` signed, as its own SignedInfo asks for. */
Ref<Document> ReadSignedDocument(const std::string& name)
{
    return ParseText(ReadTestData("documents/" + name + ".xml"));
}

/** What comes of verifying the signature in `parent`: "genuine", "forged", or why it is refused. */
std::string Verify(ElementNode* parent, const std::string& trusted = "sts")
{
    bool isGenuine = false;
    Ref<Signature> signature;
    try {
        CreateSignatureFromDom(
            parent, parent->FindChildElement("Signature", DsNamespace), signature);
    } catch (const SignatureSyntaxException& error) {
        return error.what();
    }
    const std::string error = GetSecurityError([&] {
        isGenuine =
            signature->Verify(CreateTrustSetKeyResolver(GetTestCertificates(trusted)).get());
    });
    if (error != "accepted") {
        return error;
    }
    return isGenuine ? "genuine" : "forged";
}

std::string VerifyInRoot(const std::string& name)
{
    return Verify(ReadSignedDocument(name)->GetRootElement());
}

// [XMLDSIG 4.3]
TEST(VerifySignature, RequiresAReference)
{
    EXPECT_EQ(VerifyInRoot("whole"), "genuine");
    EXPECT_EQ(VerifyInRoot("no-reference"), "The signature has 0 references; 1 to 8 are accepted");
}

TEST(VerifySignature, TakesAnEmptyReferenceForTheRootOnly)
{
    EXPECT_EQ(VerifyInRoot("whole"), "genuine");
    // The whole document is genuine, but the caller asked about a part of it.
    const Ref<Document> document = ReadSignedDocument("whole-signed-in-a-part");
    EXPECT_EQ(
        Verify(document->GetRootElement()->FindChildElement("p")),
        "The reference covers a whole document of which the signed element is a part");
}

// [XMLDSIG 4.3.3.3]
TEST(VerifySignature, CoversTheInstructionsBesideTheRoot)
{
    EXPECT_EQ(VerifyInRoot("beside-instructions"), "genuine");
    EXPECT_EQ(VerifyInRoot("beside-another-comment"), "genuine"); // comments are never signed
    EXPECT_EQ(VerifyInRoot("beside-another-instruction"), "forged");
    EXPECT_EQ(VerifyInRoot("beside-one-instruction"), "forged");
}

TEST(VerifySignature, TakesNoPartOfADigestForTheDigest)
{
    EXPECT_EQ(VerifyInRoot("digest-cut"), "forged");
    EXPECT_EQ(VerifyInRoot("digest-with-another-end"), "forged");
}

TEST(VerifySignature, RefusesAParameterOfADigest)
{
    EXPECT_EQ(
        VerifyInRoot("digest-method-with-a-child"),
        "Algorithm 'http://www.w3.org/2001/04/xmlenc#sha256' does not take the parameter 'k'");
}

TEST(VerifySignature, TakesNoShortKeyThoughItIsTrusted)
{
    EXPECT_EQ(
        Verify(ReadSignedDocument("weak")->GetRootElement(), "weak"),
        "No trusted key fits signature algorithm "
        "'http://www.w3.org/2001/04/xmldsig-more#rsa-sha256'; the first one tried is RSA-1024");
}

TEST(VerifySignature, TakesTheTransformsInTheirOrderOnly)
{
    EXPECT_EQ(
        VerifyInRoot("transforms-swapped"),
        "Transform 'http://www.w3.org/2001/10/xml-exc-c14n#' stands where enveloped-signature "
        "must");
}

TEST(VerifySignature, RefusesWhatStandsBesideABase64Text)
{
    EXPECT_EQ(
        VerifyInRoot("digest-before-a-comment"), "'DigestValue' must hold text and nothing else");
    EXPECT_EQ(
        VerifyInRoot("value-before-an-element"),
        "'SignatureValue' must hold text and nothing else");
}

TEST(VerifySignature, TakesTheIdOfTheElementAroundTheSignatureOnly)
{
    const Ref<Document> part = ReadSignedDocument("part");
    EXPECT_EQ(Verify(part->GetRootElement()->FindChildElement("p")), "genuine");
    EXPECT_EQ(
        VerifyInRoot("uri-of-another"),
        "Reference '#_p' does not name the element that encloses the signature");
}

TEST(VerifySignature, TakesNoNamespaceDeclarationForAnId)
{
    EXPECT_EQ(VerifyInRoot("namespace-like-an-id"), "genuine");
    EXPECT_EQ(VerifyInRoot("id-twice"), "Reference '#urn:r' names 2 elements of the document");
}

TEST(VerifySignature, RefusesAUriThatIsNoHashAndId)
{
    EXPECT_EQ(
        VerifyInRoot("uri-without-hash"),
        "Reference 'x_r' does not name the element that encloses the signature");
    // The root's ID is empty, so the hash alone would name it.
    EXPECT_EQ(
        VerifyInRoot("uri-of-hash-only"),
        "Reference '#' does not name the element that encloses the signature");
}

TEST(CreateSignatureFromDom, RefusesAnElementThatIsNoChildOfTheSignedOne)
{
    const Ref<Document> document = ReadSignedDocument("part");
    ElementNode* root = document->GetRootElement();
    ElementNode* part = root->FindChildElement("p");
    Ref<Signature> signature;
    try {
        CreateSignatureFromDom(root, part->FindChildElement("Signature"), signature);
        ADD_FAILURE() << "accepted";
    } catch (const SignatureSyntaxException& error) {
        EXPECT_STREQ(error.what(), "The signature is not a child of the element that it signs");
    }
    CreateSignatureFromDom(part, part->FindChildElement("Signature"), signature);
    EXPECT_EQ(signature->GetElement()->GetParent(), part);
}

/** What comes of verifying `whole` with that KeyInfo, which its signature does not cover. */
std::string VerifyWithKeyInfo(const std::string& keyInfo, const std::string& trusted = "sts")
{
    const std::string end = "</ds:Signature>";
    std::string text = ReadTestData("documents/whole.xml");
    const Ref<Document> document = ParseText(text.insert(text.find(end), keyInfo));
    return Verify(document->GetRootElement(), trusted);
}

// [XMLDSIG 4.4]
TEST(ReadKeyInfo, TakesWhatTheSchemaHas)
{
    for (const std::string content :
         {"<ds:KeyName>k</ds:KeyName><ds:KeyValue><ds:RSAKeyValue/></ds:KeyValue>",
          "<ds:RetrievalMethod URI='x'/><ds:PGPData/><ds:SPKIData/><ds:MgmtData/>",
          "<ds:X509Data><ds:X509IssuerSerial/><ds:X509SKI/><ds:X509SubjectName/><ds:X509CRL/>"
          "</ds:X509Data>",
          "<ds:X509Data><o:Other xmlns:o='urn:o'/></ds:X509Data>",
          "<Other xmlns='urn:o'/>",
          "<o:Other xmlns:o='urn:o' xml:lang='en' o:a=''><b/></o:Other>"}) {
        EXPECT_EQ(VerifyWithKeyInfo("<ds:KeyInfo>" + content + "</ds:KeyInfo>"), "genuine")
            << content;
    }
    EXPECT_EQ(VerifyWithKeyInfo("<ds:KeyInfo Id='k'/>"), "genuine");
}

TEST(ReadKeyInfo, RefusesWhatTheSchemaHasNot)
{
    const auto judge = [](const std::string& content) {
        return VerifyWithKeyInfo("<ds:KeyInfo>" + content + "</ds:KeyInfo>");
    };
    EXPECT_EQ(judge("<ds:Other/>"), "Unexpected 'ds:Other' in 'KeyInfo'");
    EXPECT_EQ(judge("<ds:X509Certificate/>"), "Unexpected 'ds:X509Certificate' in 'KeyInfo'");
    EXPECT_EQ(judge("<ds:KeyName/><KeyName/>"), "Unexpected 'KeyName' in 'KeyInfo'");
    EXPECT_EQ(judge("<KeyName xmlns=''/>"), "Unexpected 'KeyName' in 'KeyInfo'");
    EXPECT_EQ(judge("<o:Other/>"), "Unexpected 'o:Other' in 'KeyInfo'");
    EXPECT_EQ(judge("text"), "Unexpected text in 'KeyInfo'");
    EXPECT_EQ(
        judge("<ds:X509Data><ds:KeyName/></ds:X509Data>"), "Unexpected 'ds:KeyName' in 'X509Data'");
    EXPECT_EQ(judge("<ds:X509Data><a/></ds:X509Data>"), "Unexpected 'a' in 'X509Data'");
}

TEST(ReadKeyInfo, RefusesUndeclaredPrefixes)
{
    const auto judge = [](const std::string& content) {
        return VerifyWithKeyInfo("<ds:KeyInfo>" + content + "</ds:KeyInfo>");
    };
    EXPECT_EQ(
        judge("<ds:KeyValue><o:Other/></ds:KeyValue>"), "'o:Other' uses the undeclared prefix 'o'");
    EXPECT_EQ(judge("<ds:KeyName o:a=''/>"), "'ds:KeyName' uses the undeclared prefix 'o'");
    EXPECT_EQ(
        VerifyWithKeyInfo("<ds:KeyInfo o:Id='k'/>"), "'ds:KeyInfo' uses the undeclared prefix 'o'");
}

TEST(ReadKeyInfo, KnowsWhereADeclarationEnds)
{
    const auto judge = [](const std::string& content) {
        return VerifyWithKeyInfo(
            "<ds:KeyInfo><ds:KeyValue>" + content + "</ds:KeyValue></ds:KeyInfo>");
    };
    EXPECT_EQ(
        judge("<a xmlns:o='urn:o'><o:b/></a><o:Other/>"),
        "'o:Other' uses the undeclared prefix 'o'");
    EXPECT_EQ(
        judge("<a xmlns:o='urn:o'><o:b xmlns:o='urn:x' xmlns='urn:y'><c/></o:b><o:b/></a>"),
        "genuine");
    EXPECT_EQ(judge("<a xmlns='urn:a' xml:lang='en'/>"), "genuine");
}

TEST(ReadKeyInfo, KnowsTheDeclarationsAroundTheSignature)
{
    std::string text = ReadTestData("documents/whole.xml");
    text.insert(text.find("</ds:Signature>"), "<ds:KeyInfo><o:Other/></ds:KeyInfo>");
    text.insert(text.find('>'), " xmlns:o='urn:o'");
    const Ref<Document> document = ParseText(text);
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    EXPECT_NO_THROW(CreateSignatureFromDom(root, root->FindChildElement("Signature"), signature));
}

/** Subject and fingerprint as the text of an untrusted signer has them. */
std::string DescribeCertificate(const std::string& name)
{
    const auto certificate = GetTestCertificates(name).front();
    return "'" + certificate->GetSubjectName() + "' (SHA-256 " + certificate->GetFingerprint()
           + ")";
}

std::string InX509Data(const std::string& certificate)
{
    return "<ds:X509Data><ds:X509Certificate>" + certificate
           + "</ds:X509Certificate></ds:X509Data>";
}

std::string EncodedCertificate(const std::string& name)
{
    return InX509Data(StringUtil::Base64Encode(GetTestCertificates(name).front()->GetEncoded()));
}

TEST(CreateTrustSetKeyResolver, NamesTheUntrustedSignerAndThoseTrusted)
{
    EXPECT_EQ(
        VerifyWithKeyInfo("<ds:KeyInfo>" + EncodedCertificate("sts") + "</ds:KeyInfo>", "client"),
        "The signing certificate is not one of the 1 trusted certificates; the signature names "
            + DescribeCertificate("sts") + "; trusted: " + DescribeCertificate("client"));
}

TEST(CreateTrustSetKeyResolver, NamesOnlyTheFirstOfManyCertificates)
{
    std::string content;
    for (int i = 0; i < 5; ++i) {
        content += InX509Data("AAAA");
    }
    const std::string none = "3 bytes that are no certificate";
    const std::string begin = "The signing certificate is not one of the 1 trusted certificates; "
                              "the signature names "
                              + none + ", " + none + ", " + none;
    const std::string end = "; trusted: " + DescribeCertificate("sts");
    EXPECT_EQ(
        VerifyWithKeyInfo("<ds:KeyInfo>" + content + "</ds:KeyInfo>"),
        begin + ", " + none + " and 1 more" + end);
    EXPECT_EQ(
        VerifyWithKeyInfo("<ds:KeyInfo>" + content.substr(content.size() / 5) + "</ds:KeyInfo>"),
        begin + ", " + none + end);
}

TEST(CreateTrustSetKeyResolver, RefusesANullCertificate)
{
    try {
        CreateTrustSetKeyResolver({nullptr});
        ADD_FAILURE() << "accepted";
    } catch (const InvalidArgumentException& error) {
        EXPECT_STREQ(error.what(), "Invalid argument : A trusted certificate is null");
    }
}

TEST(ReadSignature, IsNotSignedAgain)
{
    const Ref<Document> document = ParseText(ReadTestData("tokens/accepted/bearer.xml"));
    ElementNode* root = document->GetRootElement();
    Ref<Signature> signature;
    CreateSignatureFromDom(root, root->FindChildElement("Signature"), signature);
    EXPECT_EQ(signature->GetElement(), root->FindChildElement("Signature"));
    EXPECT_THROW(signature->AddReference("#x"), InvalidStateException);
    EXPECT_THROW(signature->AddKeyInfoContent(root), InvalidStateException);
    EXPECT_THROW(signature->Sign(GetTestKey("sts").get()), InvalidStateException);
}

} // namespace

} // namespace Quillon::Xml::Security
