#include "Harness.h"
#include "Requests.h"
#include "SignedRequests.h"

namespace DevStsTests {

namespace {

struct Change
{
    std::string name;
    std::string from; ///< stands once in the good template
    std::string to;
    std::string text;
};

void PrintTo(const Change& instance, std::ostream* out)
{
    *out << instance.name;
}

std::string ChangeName(const testing::TestParamInfo<Change>& info)
{
    return info.param.name;
}

std::string GoodTemplate()
{
    return CertificateTemplate("", IssueBody("PublicKey", UseKey));
}

std::string Reference(const std::string& id)
{
    return "<ds:Reference URI=\"#" + id
           + "\"><ds:Transforms>"
             "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
             "</ds:Transforms>"
             "<ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
             "<ds:DigestValue></ds:DigestValue></ds:Reference>";
}

constexpr const char* ExclusiveC14n = "http://www.w3.org/2001/10/xml-exc-c14n#";
constexpr const char* TwoReferences =
    "The signature of the message must have two references, first to the Body, then to the "
    "Timestamp";

std::string Instead(const std::string& found, const std::string& expected)
{
    return "The signature uses '" + found + "' where '" + expected + "' is expected";
}

// Honestly signed by the known client, but in a way that this STS does not admit.
class InadmissibleSignature : public ServerTest, public testing::WithParamInterface<Change>
{};

TEST_P(InadmissibleSignature, IsRefusedWithTheReason)
{
    const Change& instance = GetParam();
    const std::string request = Sign(Replaced(GoodTemplate(), instance.from, instance.to));
    EXPECT_EQ(FaultText(PostIssue(request), "wst:InvalidRequest"), instance.text);
}

INSTANTIATE_TEST_SUITE_P(
    References,
    InadmissibleSignature,
    testing::Values(
        Change{"BodyOnly", Reference("timestamp-1"), "", TwoReferences},
        Change{"TimestampOnly", Reference("body-1"), "", TwoReferences},
        Change{
            "OtherOrder",
            Reference("body-1") + Reference("timestamp-1"),
            Reference("timestamp-1") + Reference("body-1"),
            TwoReferences},
        Change{"BodyTwice", Reference("timestamp-1"), Reference("body-1"), TwoReferences},
        Change{
            "WholeDocument",
            "</ds:SignedInfo>",
            Replaced(Reference("x"), "#x", "") + "</ds:SignedInfo>",
            TwoReferences}),
    ChangeName);

INSTANTIATE_TEST_SUITE_P(
    Algorithms,
    InadmissibleSignature,
    testing::Values(
        Change{
            "RsaSha512",
            "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256",
            "http://www.w3.org/2001/04/xmldsig-more#rsa-sha512",
            Instead(
                "http://www.w3.org/2001/04/xmldsig-more#rsa-sha512",
                "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256")},
        Change{
            "InclusiveC14n",
            std::string("CanonicalizationMethod Algorithm=\"") + ExclusiveC14n,
            "CanonicalizationMethod Algorithm=\"http://www.w3.org/TR/2001/REC-xml-c14n-20010315",
            Instead("http://www.w3.org/TR/2001/REC-xml-c14n-20010315", ExclusiveC14n)},
        Change{
            "Sha512Digest",
            Reference("body-1"),
            Replaced(Reference("body-1"), "xmlenc#sha256", "xmlenc#sha512"),
            Instead(
                "http://www.w3.org/2001/04/xmlenc#sha512",
                "http://www.w3.org/2001/04/xmlenc#sha256")},
        Change{
            "XPathTransform",
            Reference("body-1"),
            Replaced(
                Reference("body-1"),
                "<ds:Transforms>",
                "<ds:Transforms><ds:Transform "
                "Algorithm=\"http://www.w3.org/TR/1999/REC-xpath-19991116\">"
                "<ds:XPath>false()</ds:XPath></ds:Transform>"),
            Instead("http://www.w3.org/TR/1999/REC-xpath-19991116", ExclusiveC14n)},
        Change{
            "ObjectInSignature",
            "</ds:KeyInfo>",
            "</ds:KeyInfo><ds:Object/>",
            "Unexpected 'Object' under 'Signature'"}),
    ChangeName);

INSTANTIATE_TEST_SUITE_P(
    Keys,
    InadmissibleSignature,
    testing::Values(
        Change{
            "OtherTokenName",
            "URI=\"#holderOfKeyCertificate\"",
            "URI=\"#other\"",
            "The signature names the key '#other', which is not there"},
        Change{
            "OtherValueType",
            CertificateReference(),
            Replaced(CertificateReference(), "#X509v3", "#X509PKIPathv1"),
            "Attribute 'ValueType' must be 'http://docs.oasis-open.org/wss/2004/01/"
            "oasis-200401-wss-x509-token-profile-1.0#X509v3', not "
            "'http://docs.oasis-open.org/wss/2004/01/"
            "oasis-200401-wss-x509-token-profile-1.0#X509PKIPathv1'"},
        Change{
            "KeyInTheOpen",
            CertificateReference(),
            "<ds:KeyValue/>",
            "Expected element 'SecurityTokenReference' of namespace '" + std::string(Ns::Wsse)
                + "' under 'KeyInfo', found 'KeyValue'"}),
    ChangeName);

using AdmissibleSignature = ServerTest;

TEST_F(AdmissibleSignature, IsAccepted)
{
    EXPECT_EQ(PostIssue(Sign(GoodTemplate())).status, 200);
}

TEST_F(AdmissibleSignature, OnSharedIdIsRefused)
{
    const std::string request = Sign(GoodTemplate());
    EXPECT_EQ(
        FaultText(
            PostIssue(Replaced(request, "wsu:Id=\"timestamp-1\"", "wsu:Id=\"body-1\"")),
            "wst:InvalidRequest"),
        "The ID 'body-1' is used twice");
}

// The signed Body moves to another place, and another takes its seat.
TEST_F(AdmissibleSignature, OnWrappedBodyIsRefused)
{
    std::string request = Sign(GoodTemplate());
    const std::size_t from = request.find("<soapenv:Body ");
    const std::string end = "</soapenv:Body>";
    const std::string body = request.substr(from, request.find(end) + end.size() - from);
    request = Replaced(
        Replaced(request, body, Replaced(body, "body-1", "body-2")),
        "</ds:Signature>",
        "</ds:Signature>" + body);
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:InvalidRequest"), "Unexpected 'Body' under 'Security'");
}

TEST_F(AdmissibleSignature, WithQuoteInIdIsRefused)
{
    const std::string request = Sign(GoodTemplate());
    EXPECT_EQ(
        FaultText(
            PostIssue(Replaced(request, "wsu:Id=\"body-1\"", "wsu:Id=\"body'1\"")),
            "wst:InvalidRequest"),
        "The ID 'body'1' is not made of letters, digits, '_', '-' and '.'");
}

TEST_F(AdmissibleSignature, WithoutItsCertificateIsRefused)
{
    const std::string request =
        Sign(SignatureTemplate("", IssueBody("PublicKey", UseKey), CertificateReference()));
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:InvalidRequest"),
        "The header has no BinarySecurityToken");
}

} // namespace

} // namespace DevStsTests
