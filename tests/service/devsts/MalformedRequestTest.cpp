#include "Harness.h"
#include "Requests.h"

#include <httplib.h>

namespace DevStsTests {

namespace {

struct Case
{
    std::string name;
    std::string from; ///< stands once in the good request
    std::string to;
    std::string code;
    std::string text;
};

std::string CaseName(const testing::TestParamInfo<Case>& info)
{
    return info.param.name;
}

void PrintTo(const Case& instance, std::ostream* out)
{
    *out << instance.name;
}

class MalformedRequest : public ServerTest, public testing::WithParamInterface<Case>
{};

TEST_P(MalformedRequest, IsRefusedWithTheReason)
{
    const Case& instance = GetParam();
    const HttpResult result = PostIssue(Replaced(PasswordRequest(), instance.from, instance.to));
    EXPECT_EQ(FaultText(result, instance.code), instance.text);
}

const std::string WsuText = "'http://docs.oasis-open.org/wss/2004/01/"
                            "oasis-200401-wss-wssecurity-utility-1.0.xsd'";
const std::string WstText = "'http://docs.oasis-open.org/ws-sx/ws-trust/200512'";
const std::string SoapText = "'http://schemas.xmlsoap.org/soap/envelope/'";

INSTANTIATE_TEST_SUITE_P(
    Envelope,
    MalformedRequest,
    testing::Values(
        Case{
            "OtherSoapVersion",
            "xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\"",
            "xmlns:soapenv=\"http://www.w3.org/2003/05/soap-envelope\"",
            "soapenv:Client",
            "The root element must be a SOAP 1.1 Envelope"},
        Case{
            "DocumentType",
            "<soapenv:Envelope ",
            "<!DOCTYPE a [<!ENTITY e \"x\">]><soapenv:Envelope ",
            "soapenv:Client",
            "A document type declaration is not accepted"},
        Case{
            "SecondBody",
            "</soapenv:Body>",
            "</soapenv:Body><soapenv:Body/>",
            "soapenv:Client",
            "Unexpected 'Body' under 'Envelope'"},
        Case{
            "TextInEnvelope",
            "<soapenv:Header>",
            "x<soapenv:Header>",
            "soapenv:Client",
            "Expected element 'Header' of namespace " + SoapText
                + " under 'Envelope', found 'text'"},
        Case{
            "OtherHeader",
            "<soapenv:Header>",
            "<soapenv:Header><other/>",
            "soapenv:Client",
            "Expected element 'Security' of namespace '" + std::string(Ns::Wsse)
                + "' under 'Header', found 'other'"},
        Case{
            "EncodingStyle",
            "<soapenv:Body ",
            "<soapenv:Body soapenv:encodingStyle=\"x\" ",
            "soapenv:Client",
            "Element 'Body' has an unexpected attribute 'encodingStyle'"}),
    CaseName);

INSTANTIATE_TEST_SUITE_P(
    SecurityHeader,
    MalformedRequest,
    testing::Values(
        Case{
            "LocalTime",
            "<wsu:Created>2026-11-20T12:00:00.000Z",
            "<wsu:Created>2026-11-20T12:00:00.000+01:00",
            "wst:InvalidRequest",
            "'2026-11-20T12:00:00.000+01:00' is not a UTC time"},
        Case{
            "ImpossibleDay",
            "<wsu:Expires>2026-11-20T12:10:00.000Z",
            "<wsu:Expires>2026-02-29T12:10:00.000Z",
            "wst:InvalidRequest",
            "'2026-02-29T12:10:00.000Z' is not a UTC time"},
        Case{
            "MissingExpires",
            "<wsu:Expires>2026-11-20T12:10:00.000Z</wsu:Expires>",
            "",
            "wst:InvalidRequest",
            "Expected element 'Expires' of namespace " + WsuText
                + " under 'Timestamp', found the end"},
        Case{
            "PasswordDigest",
            "#PasswordText",
            "#PasswordDigest",
            "wst:InvalidRequest",
            "The Type of the Password must be PasswordText"},
        Case{
            "ElementInUsername",
            "alice@example.test",
            "alice<b/>@example.test",
            "wst:InvalidRequest",
            "Element 'Username' must hold text only"},
        Case{
            "CommentInUsername",
            "alice@example.test",
            "alice<!-- -->@example.test",
            "wst:InvalidRequest",
            "Element 'Username' must hold text only"},
        Case{
            "SecondUsernameToken",
            "</wsse:UsernameToken>",
            "</wsse:UsernameToken><wsse:UsernameToken/>",
            "wst:InvalidRequest",
            "Unexpected 'UsernameToken' under 'Security'"}),
    CaseName);

INSTANTIATE_TEST_SUITE_P(
    Body,
    MalformedRequest,
    testing::Values(
        Case{
            "OtherTokenType",
            ">urn:oasis:names:tc:SAML:2.0:assertion<",
            ">urn:oasis:names:tc:SAML:1.0:assertion<",
            "wst:InvalidRequest",
            "Element 'TokenType' must be 'urn:oasis:names:tc:SAML:2.0:assertion', not "
            "'urn:oasis:names:tc:SAML:1.0:assertion'"},
        Case{
            "OtherRequestType",
            "/Issue</wst:RequestType>",
            "/Renew</wst:RequestType>",
            "wst:InvalidRequest",
            "Element 'RequestType' must be '" + std::string(Ns::Wst) + "/Issue', not '" + Ns::Wst
                + "/Renew'"},
        Case{
            "SymmetricKey",
            "/Bearer</wst:KeyType>",
            "/SymmetricKey</wst:KeyType>",
            "wst:InvalidRequest",
            "The KeyType must be the Bearer or the PublicKey identifier, not '"
                + std::string(Ns::Wst) + "/SymmetricKey'"},
        Case{
            "RenewExpired",
            "OK=\"false\"",
            "OK=\"true\"",
            "wst:InvalidRequest",
            "Renewing tokens that have expired is not offered; OK must be 'false'"},
        Case{
            "RenewingWithoutAllow",
            "Allow=\"false\" ",
            "",
            "wst:InvalidRequest",
            "Element 'Renewing' has no attribute 'Allow'"},
        Case{
            "NumericBoolean",
            "Delegatable>false",
            "Delegatable>0",
            "wst:InvalidRequest",
            "'Delegatable' must be 'true' or 'false', not '0'"},
        Case{
            "MissingDelegatable",
            "<wst:Delegatable>false</wst:Delegatable>",
            "",
            "wst:InvalidRequest",
            "Expected element 'Delegatable' of namespace " + WstText
                + " under 'RequestSecurityToken', found the end"},
        Case{
            "EmptyParticipants",
            "</wst:Delegatable>",
            "</wst:Delegatable><wst:Participants/>",
            "wst:InvalidRequest",
            "Expected element 'Participant' of namespace " + WstText
                + " under 'Participants', found the end"},
        Case{
            "UnknownElement",
            "</wst:Delegatable>",
            "</wst:Delegatable><wst:OnBehalfOf/>",
            "wst:InvalidRequest",
            "Unexpected 'OnBehalfOf' under 'RequestSecurityToken'"}),
    CaseName);

using BrokenRequest = ServerTest;

TEST_F(BrokenRequest, IllFormedXmlIsRefusedWithThePlace)
{
    EXPECT_EQ(
        FaultText(PostIssue("<a>\n</b>"), "soapenv:Client"),
        "The message is not well-formed XML: line 2: Opening and ending tag mismatch: a line 1 "
        "and b");
}

TEST_F(BrokenRequest, EmptyBodyIsRefused)
{
    EXPECT_EQ(
        FaultText(PostIssue(""), "soapenv:Client"),
        "The message is not well-formed XML: line 1: Document is empty");
}

TEST_F(BrokenRequest, UnquotedActionIsRefused)
{
    httplib::Client client("127.0.0.1", _port);
    const auto result = client.Post(
        "/sts",
        {{"SOAPAction", std::string(Ns::Wst) + "/RST/Issue"}},
        PasswordRequest(),
        "text/xml");
    ASSERT_TRUE(result);
    EXPECT_EQ(
        FaultText({result->status, result->body, {}}, "soapenv:Client"),
        "The SOAPAction header must be the quoted Issue, Renew or Validate action or that of an "
        "Issue response, not "
            + std::string(Ns::Wst) + "/RST/Issue");
}

TEST_F(BrokenRequest, MissingActionIsRefused)
{
    httplib::Client client("127.0.0.1", _port);
    const auto result = client.Post("/sts", PasswordRequest(), "text/xml");
    ASSERT_TRUE(result);
    EXPECT_EQ(
        FaultText({result->status, result->body, {}}, "soapenv:Client"),
        "The SOAPAction header is missing");
}

TEST_F(BrokenRequest, OversizedMessageIsRefused)
{
    httplib::Client client("127.0.0.1", _port);
    const auto result = client.Post("/sts", std::string(2U << 20U, 'x'), "text/xml");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 413);
}

TEST_F(BrokenRequest, OtherContentTypeIsRefused)
{
    httplib::Client client("127.0.0.1", _port);
    const auto result = client.Post("/sts", PasswordRequest(), "application/soap+xml");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 415);
}

TEST_F(BrokenRequest, OtherMethodIsRefused)
{
    httplib::Client client("127.0.0.1", _port);
    const auto result = client.Get("/sts");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 405);
}

TEST_F(BrokenRequest, OtherPathIsRefused)
{
    httplib::Client client("127.0.0.1", _port);
    const auto result = client.Post("/other", PasswordRequest(), "text/xml");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 404);
}

} // namespace

} // namespace DevStsTests
