#include "ssoClient/protocol/ResponseHandlerImpl.h"

#include "quillon/xml/Parser.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/xmlReading.h"
#include "support/Failure.h"
#include "support/TestData.h"

#include <gmock/gmock.h>

using namespace SsoClient;

namespace {

#define SOAP "http://schemas.xmlsoap.org/soap/envelope/"
#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WSSE "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"

std::string Envelope(const std::string& body)
{
    return "<S:Envelope xmlns:S=\"" SOAP "\"><S:Body>" + body + "</S:Body></S:Envelope>";
}

std::string Fault(const std::string& content)
{
    return Envelope("<S:Fault>" + content + "</S:Fault>");
}

std::string FaultWithCode(const std::string& code, const std::string& rest = "")
{
    return Fault(
        "<faultcode xmlns:wst=\"" WST "\" xmlns:wsse=\"" WSSE "\">" + code + "</faultcode>" + rest);
}

std::string StatusReply(const std::string& code)
{
    return Envelope(
        "<wst:RequestSecurityTokenResponse xmlns:wst=\"" WST "\"><wst:Status>" + code
        + "</wst:Status></wst:RequestSecurityTokenResponse>");
}

std::string Acquire(const std::string& reply)
{
    std::string tokenXml;
    ResponseHandlerImpl().HandleAcquireTokenResponse(
        Quillon::CreateStringReader(reply).get(), tokenXml);
    return tokenXml;
}

std::string ReadRenewal(const std::string& reply)
{
    std::string tokenXml;
    ResponseHandlerImpl().HandleRenewTokenResponse(
        Quillon::CreateStringReader(reply).get(), tokenXml);
    return tokenXml;
}

bool ReadVerdict(const std::string& reply)
{
    return ResponseHandlerImpl().HandleValidateSubjectResponse(
        Quillon::CreateStringReader(reply).get());
}

template <class Handle>
std::string GetFailure(const Handle& handle, const std::string& reply)
{
    return ::GetFailure([&] { handle(reply); });
}

std::string GetParserText(const std::string& text)
{
    try {
        Quillon::Ref<Quillon::Xml::Document> document;
        ParseXML(text, document);
    } catch (const Quillon::Xml::XMLParseException& error) {
        return error.what();
    }
    return "well-formed";
}

constexpr char UnexpectedFormat[] = "SsoException: Unexpected XML format";

} // namespace

TEST(HandleAcquireTokenResponse, GivesTheAssertionInCanonicalForm)
{
    // Declarations in scope come along, attributes are sorted, empty elements get an end tag.
    EXPECT_EQ(
        Acquire("<?xml version=\"1.0\"?>\n"
                "<S:Envelope xmlns:S=\"" SOAP "\" xmlns:xs=\"urn:xs\"><S:Header/><S:Body>"
                "<w:RequestSecurityTokenResponseCollection xmlns:w=\"" WST "\">"
                "<w:RequestSecurityTokenResponse><w:RequestedSecurityToken>"
                "<saml:Assertion xmlns:saml=\"urn:saml\" b='2' a='1'><!-- no --><saml:X/> &#65;"
                "</saml:Assertion>"
                "</w:RequestedSecurityToken></w:RequestSecurityTokenResponse>"
                "</w:RequestSecurityTokenResponseCollection></S:Body></S:Envelope>"),
        "<saml:Assertion xmlns:S=\"" SOAP "\" xmlns:saml=\"urn:saml\" xmlns:w=\"" WST
        "\" xmlns:xs=\"urn:xs\" a=\"1\" b=\"2\"><saml:X></saml:X> A</saml:Assertion>");
}

TEST(HandleAcquireTokenResponse, MatchesLocalNamesOnly)
{
    EXPECT_EQ(
        Acquire("<Letter><Body><RequestSecurityTokenResponseCollection>"
                "<RequestSecurityTokenResponse><RequestedSecurityToken>"
                "<Assertion>x</Assertion></RequestedSecurityToken>"
                "</RequestSecurityTokenResponse></RequestSecurityTokenResponseCollection>"
                "</Body></Letter>"),
        "<Assertion>x</Assertion>");
}

TEST(HandleAcquireTokenResponse, RefusesEachMissingStep)
{
    const std::string bodies[] = {
        "",
        "<RequestSecurityTokenResponseCollection/>",
        "<RequestSecurityTokenResponseCollection><RequestSecurityTokenResponse/>"
        "</RequestSecurityTokenResponseCollection>",
        "<RequestSecurityTokenResponseCollection><RequestSecurityTokenResponse>"
        "<RequestedSecurityToken/></RequestSecurityTokenResponse>"
        "</RequestSecurityTokenResponseCollection>",
        "<RequestSecurityTokenResponseCollection><RequestSecurityTokenResponse>"
        "<RequestedSecurityToken><x><Assertion/></x></RequestedSecurityToken>"
        "</RequestSecurityTokenResponse></RequestSecurityTokenResponseCollection>",
    };
    for (const std::string& body : bodies) {
        EXPECT_EQ(GetFailure(Acquire, Envelope(body)), UnexpectedFormat) << body;
    }
}

TEST(ReplyForm, IsLeftToTheServiceIfTheDialectSaysSo)
{
    const std::string single =
        "<RequestSecurityTokenResponse><RequestedSecurityToken><Assertion>x</Assertion>"
        "</RequestedSecurityToken></RequestSecurityTokenResponse>";
    const std::string collection = "<RequestSecurityTokenResponseCollection>" + single
                                   + "</RequestSecurityTokenResponseCollection>";
    ReplyForm form;
    form.dialect.anyReplyForm = true;
    const ResponseHandlerImpl handler(form);
    for (const std::string& body : {single, collection}) {
        std::string issued;
        std::string renewed;
        handler.HandleAcquireTokenResponse(
            Quillon::CreateStringReader(Envelope(body)).get(), issued);
        handler.HandleRenewTokenResponse(
            Quillon::CreateStringReader(Envelope(body)).get(), renewed);
        EXPECT_THAT(issued, testing::EndsWith("\">x</Assertion>"));
        EXPECT_EQ(renewed, issued);
    }
    EXPECT_EQ(GetFailure(Acquire, Envelope(single)), UnexpectedFormat);
    EXPECT_EQ(GetFailure(ReadRenewal, Envelope(collection)), UnexpectedFormat);
    EXPECT_EQ(
        ::GetFailure([&] {
            std::string issued;
            handler.HandleAcquireTokenResponse(
                Quillon::CreateStringReader(Envelope("<x/>")).get(), issued);
        }),
        UnexpectedFormat);
}

TEST(ReplyForm, HasAnEncryptedTokenForAReadingThatDecrypts)
{
    ReplyForm form;
    form.dialect.reading = TokenReading();
    const auto read = [&form](const std::string& name) {
        const std::string body = "<RequestSecurityTokenResponseCollection>"
                                 "<RequestSecurityTokenResponse><RequestedSecurityToken><"
                                 + name + ">x</" + name
                                 + "></RequestedSecurityToken></RequestSecurityTokenResponse>"
                                   "</RequestSecurityTokenResponseCollection>";
        std::string issued;
        ResponseHandlerImpl(form).HandleAcquireTokenResponse(
            Quillon::CreateStringReader(Envelope(body)).get(), issued);
        return issued;
    };
    for (const std::string name : {"EncryptedAssertion", "EncryptedData"}) {
        form.dialect.reading->rules.decryptionKeys.clear();
        EXPECT_EQ(::GetFailure([&] { read(name); }), UnexpectedFormat);
        form.dialect.reading->rules.decryptionKeys = {GetTestKey("client")};
        EXPECT_THAT(read(name), testing::EndsWith("\">x</" + name + ">"));
        EXPECT_THAT(read("Assertion"), testing::EndsWith("\">x</Assertion>"));
    }
}

TEST(ReplyForm, HasTheStatusOfItsTrust)
{
    const std::string trust = "http://schemas.xmlsoap.org/ws/2005/02/trust/status/";
    ReplyForm form;
    form.dialect.trust = TrustVersion::WS_TRUST_2005_02;
    const auto validate = [&form](const std::string& status) {
        const std::string reply = StatusReply("<wst:Code>" + status + "</wst:Code>");
        return ResponseHandlerImpl(form).HandleValidateSubjectResponse(
            Quillon::CreateStringReader(reply).get());
    };
    EXPECT_TRUE(validate(trust + "valid"));
    EXPECT_FALSE(validate(trust + "invalid"));
    EXPECT_EQ(::GetFailure([&] { validate(WST "/status/valid"); }), UnexpectedFormat);
}

// [WST13 4.3]
TEST(HandleAcquireTokenResponse, RefusesResponseWithoutCollection)
{
    EXPECT_EQ(
        GetFailure(
            Acquire,
            Envelope("<RequestSecurityTokenResponse><RequestedSecurityToken><Assertion/>"
                     "</RequestedSecurityToken></RequestSecurityTokenResponse>")),
        UnexpectedFormat);
}

TEST(HandleAcquireTokenResponse, LooksAtTheFirstMatchOfEachStepOnly)
{
    EXPECT_EQ(
        GetFailure(
            Acquire,
            Envelope("<RequestSecurityTokenResponseCollection>"
                     "<RequestSecurityTokenResponse/>"
                     "<RequestSecurityTokenResponse><RequestedSecurityToken><Assertion/>"
                     "</RequestedSecurityToken></RequestSecurityTokenResponse>"
                     "</RequestSecurityTokenResponseCollection>")),
        UnexpectedFormat);
}

TEST(HandleAcquireTokenResponse, LeavesTheOutputAloneOnFailure)
{
    std::string tokenXml = "before";
    EXPECT_THROW(
        ResponseHandlerImpl().HandleAcquireTokenResponse(
            Quillon::CreateStringReader(Envelope("")).get(), tokenXml),
        SsoException);
    EXPECT_EQ(tokenXml, "before");
}

TEST(HandleRenewTokenResponse, GivesTheAssertionInCanonicalForm)
{
    EXPECT_EQ(
        ReadRenewal(Envelope("<w:RequestSecurityTokenResponse xmlns:w=\"" WST "\">"
                             "<w:RequestedSecurityToken><Assertion/></w:RequestedSecurityToken>"
                             "</w:RequestSecurityTokenResponse>")),
        "<Assertion xmlns:S=\"" SOAP "\" xmlns:w=\"" WST "\"></Assertion>");
}

// [WST13 5]
TEST(HandleRenewTokenResponse, RefusesCollection)
{
    EXPECT_EQ(
        GetFailure(
            ReadRenewal,
            Envelope("<RequestSecurityTokenResponseCollection><RequestSecurityTokenResponse>"
                     "<RequestedSecurityToken><Assertion/></RequestedSecurityToken>"
                     "</RequestSecurityTokenResponse>"
                     "</RequestSecurityTokenResponseCollection>")),
        UnexpectedFormat);
}

TEST(HandleValidateSubjectResponse, ReadsTheVerdict)
{
    EXPECT_TRUE(ReadVerdict(StatusReply("<wst:Code>" WST "/status/valid</wst:Code>")));
    EXPECT_FALSE(ReadVerdict(StatusReply("<wst:Code>" WST "/status/invalid</wst:Code>")));
}

TEST(HandleValidateSubjectResponse, RefusesAnyOtherCode)
{
    for (const std::string code :
         {WST "/status/valid ",
          " " WST "/status/valid",
          WST "/status/VALID",
          WST "/status/",
          "http://other/status/valid"}) {
        EXPECT_EQ(
            GetFailure(ReadVerdict, StatusReply("<wst:Code>" + code + "</wst:Code>")),
            UnexpectedFormat)
            << code;
    }
}

TEST(HandleValidateSubjectResponse, RefusesEachMissingStep)
{
    EXPECT_EQ(GetFailure(ReadVerdict, Envelope("")), UnexpectedFormat);
    EXPECT_EQ(
        GetFailure(ReadVerdict, Envelope("<RequestSecurityTokenResponse/>")), UnexpectedFormat);
    EXPECT_EQ(GetFailure(ReadVerdict, StatusReply("")), UnexpectedFormat);
}

TEST(HandleValidateSubjectResponse, RefusesCodeThatDoesNotStartWithText)
{
    for (const auto& [content, found] :
         {std::pair("", "nothing"),
          std::pair("<x/>", "element"),
          std::pair("<!-- c -->" WST "/status/valid", "comment")}) {
        try {
            ReadVerdict(StatusReply("<wst:Code>" + std::string(content) + "</wst:Code>"));
            ADD_FAILURE() << "accepted: " << content;
        } catch (const Quillon::TypeMismatchException& error) {
            EXPECT_EQ(error.what(), "Type mismatch: expected text, found " + std::string(found));
        }
    }
}

// A comment ends the text that an element starts with.
TEST(HandleValidateSubjectResponse, LooksAtTheFirstChildOfTheCodeOnly)
{
    EXPECT_TRUE(ReadVerdict(StatusReply("<wst:Code>" WST "/status/valid<!-- c -->x</wst:Code>")));
    EXPECT_FALSE(ReadVerdict(StatusReply("<wst:Code>" WST "/status/invalid<x/></wst:Code>")));
    EXPECT_EQ(
        GetFailure(
            ReadVerdict, StatusReply("<wst:Code>x<!-- c -->" WST "/status/valid</wst:Code>")),
        UnexpectedFormat);
}

TEST(ProcessResponse, LooksAtTheFirstBodyOnly)
{
    const std::string empty = "<S:Body/>";
    const std::string verdict = "<S:Body><RequestSecurityTokenResponse><Status><Code>" WST
                                "/status/valid</Code></Status></RequestSecurityTokenResponse>"
                                "</S:Body>";
    const std::string fault = "<S:Body><S:Fault><faultcode>S:Server</faultcode></S:Fault></S:Body>";
    const auto envelope = [](const std::string& bodies) {
        return "<S:Envelope xmlns:S=\"" SOAP "\">" + bodies + "</S:Envelope>";
    };
    EXPECT_EQ(GetFailure(ReadVerdict, envelope(empty + verdict)), UnexpectedFormat);
    EXPECT_TRUE(ReadVerdict(envelope(verdict + empty)));
    EXPECT_TRUE(ReadVerdict(envelope(verdict + fault)));
    EXPECT_EQ(
        GetFailure(ReadVerdict, envelope(fault + verdict)),
        "SsoException: Unexpected SOAP fault: S:Server; request failed.");
}

TEST(ProcessResponse, LooksAtTheFirstFaultAndTheFirstFaultcodeOnly)
{
    const std::string server = "<faultcode>S:Server</faultcode>";
    const std::string client = "<faultcode>S:Client</faultcode>";
    const char expected[] = "SsoException: Unexpected SOAP fault: S:Server; request failed.";
    EXPECT_EQ(GetFailure(Acquire, Fault(server + client)), expected);
    EXPECT_EQ(
        GetFailure(
            Acquire,
            Envelope("<S:Fault>" + server + "</S:Fault><S:Fault>" + client + "</S:Fault>")),
        expected);
}

TEST(ProcessResponse, LooksAtTheFirstChildOfTheFaultcodeOnly)
{
    EXPECT_EQ(
        GetFailure(Acquire, FaultWithCode("wst:FailedAuthentication<!-- c -->Not")),
        "InvalidCredentialsException: Authentication failed");
    EXPECT_EQ(
        GetFailure(Acquire, FaultWithCode("S:Server<x/>wst:FailedAuthentication")),
        "SsoException: Unexpected SOAP fault: S:Server; request failed.");
    EXPECT_EQ(
        GetFailure(Acquire, FaultWithCode("<!-- c -->wst:FailedAuthentication")),
        "SsoException: Invalid SOAP response: missing faultcode.");
}

TEST(ProcessResponse, LooksAtTheFirstChildOfTheFaultstringOnly)
{
    const auto judge = [](const std::string& faultString) {
        return GetFailure(
            Acquire,
            FaultWithCode(
                "wst:FailedAuthentication", "<faultstring>" + faultString + "</faultstring>"));
    };
    EXPECT_EQ(
        judge("Wrong <!-- c -->password"),
        "InvalidCredentialsException: Authentication failed: Wrong ");
    EXPECT_EQ(
        judge("<!-- c -->Wrong password"), "InvalidCredentialsException: Authentication failed");
    EXPECT_EQ(judge(" "), "InvalidCredentialsException: Authentication failed:  ");
    EXPECT_EQ(
        GetFailure(
            Acquire,
            FaultWithCode(
                "wst:FailedAuthentication",
                "<faultstring>one</faultstring><faultstring>two</faultstring>")),
        "InvalidCredentialsException: Authentication failed: one");
}

TEST(ProcessResponse, ReportsWhatIsNotXml)
{
    const std::string replies[] = {"", "<html><br></html>", "no markup", "<!DOCTYPE x><x/>"};
    for (const std::string& reply : replies) {
        EXPECT_EQ(
            GetFailure(Acquire, reply),
            "SsoException: Response is not well-formed XML: " + GetParserText(reply))
            << reply;
        EXPECT_NE(GetParserText(reply), "well-formed") << reply;
    }
}

TEST(ProcessResponse, ReportsMissingBody)
{
    const char expected[] = "SsoException: Unexpected response format: missing SAOP Body.";
    EXPECT_EQ(GetFailure(Acquire, "<html><body/></html>"), expected);
    EXPECT_EQ(GetFailure(ReadRenewal, "<S:Envelope xmlns:S=\"" SOAP "\"/>"), expected);
    EXPECT_EQ(GetFailure(ReadVerdict, "<Envelope><Header><Body/></Header></Envelope>"), expected);
}

// [WST13 11]
TEST(ProcessResponse, ReportsBadCredentials)
{
    for (const std::string code :
         {"wst:FailedAuthentication", "wst:InvalidSecurityToken", "wsse:InvalidSecurityToken"}) {
        EXPECT_EQ(
            GetFailure(Acquire, FaultWithCode(code, "<faultstring>Wrong password</faultstring>")),
            "InvalidCredentialsException: Authentication failed: Wrong password")
            << code;
    }
}

TEST(ProcessResponse, ReportsBadCredentialsWithoutFaultString)
{
    for (const std::string faultString :
         {"", "<faultstring/>", "<faultstring><b>Wrong password</b></faultstring>"}) {
        EXPECT_EQ(
            GetFailure(Acquire, FaultWithCode("wst:FailedAuthentication", faultString)),
            "InvalidCredentialsException: Authentication failed")
            << faultString;
    }
}

TEST(ProcessResponse, ReportsBadCredentialsToEveryOperation)
{
    const std::string reply = FaultWithCode("wst:FailedAuthentication");
    const char expected[] = "InvalidCredentialsException: Authentication failed";
    EXPECT_EQ(GetFailure(Acquire, reply), expected);
    EXPECT_EQ(GetFailure(ReadRenewal, reply), expected);
    EXPECT_EQ(GetFailure(ReadVerdict, reply), expected);
}

TEST(ProcessResponse, ReportsOtherFaultsByTheirCodeAsWritten)
{
    for (const std::string code :
         {"S:Server",
          "wsse:FailedAuthentication",
          "wst:failedAuthentication",
          "wst:FailedAuthentication ",
          "FailedAuthentication",
          "InvalidSecurityToken"}) {
        EXPECT_EQ(
            GetFailure(Acquire, FaultWithCode(code, "<faultstring>Oh dear</faultstring>")),
            "SsoException: Unexpected SOAP fault: " + code + "; request failed.")
            << code;
    }
}

TEST(ProcessResponse, ResolvesUnprefixedCodeInTheSoapNamespace)
{
    // The default namespace does not apply to it.
    EXPECT_EQ(
        GetFailure(Acquire, Fault("<faultcode xmlns=\"" WST "\">FailedAuthentication</faultcode>")),
        "SsoException: Unexpected SOAP fault: FailedAuthentication; request failed.");
}

TEST(ProcessResponse, ReportsFaultWithoutUsableCode)
{
    for (const std::string content :
         {"",
          "<faultstring>Oh dear</faultstring>",
          "<faultcode/>",
          "<faultcode><b>S:Server</b></faultcode>",
          "<faultcode><!-- c -->S:Server</faultcode>",
          "<faultcode>S:</faultcode>"}) {
        EXPECT_EQ(
            GetFailure(Acquire, Fault(content)),
            "SsoException: Invalid SOAP response: missing faultcode.")
            << content;
    }
}

TEST(ProcessResponse, ReportsCodeWithUndeclaredPrefix)
{
    EXPECT_EQ(
        GetFailure(Acquire, Fault("\n  <faultcode>foo:Bar</faultcode>")),
        "ParseException: Element faultcodeat 2,3 uses undefined prefix: `foo'");
}

TEST(ProcessResponse, LooksForFaultBeforeAnythingElse)
{
    EXPECT_EQ(
        GetFailure(
            ReadVerdict,
            Envelope("<RequestSecurityTokenResponse><Status><Code>" WST
                     "/status/valid</Code></Status></RequestSecurityTokenResponse>"
                     "<S:Fault><faultcode>S:Server</faultcode></S:Fault>")),
        "SsoException: Unexpected SOAP fault: S:Server; request failed.");
}
