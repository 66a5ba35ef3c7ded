#include "ssoClient/protocol/ResponseHandlerImpl.h"

#include "quillon/Reader.h"
#include "support/Failure.h"

#include <gtest/gtest.h>

using namespace SsoClient;

namespace {

#define SOAP11 "http://schemas.xmlsoap.org/soap/envelope/"
#define SOAP12 "http://www.w3.org/2003/05/soap-envelope"
#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WST2005 "http://schemas.xmlsoap.org/ws/2005/02/trust"
#define WSSE "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"

std::string Envelope(const char* soap, const std::string& body)
{
    return std::string("<S:Envelope xmlns:S=\"") + soap + "\"><S:Body>" + body
           + "</S:Body></S:Envelope>";
}

std::string Fault11(const std::string& content)
{
    return Envelope(
        SOAP11, "<S:Fault xmlns:t=\"" WST "\" xmlns:o=\"" WSSE "\">" + content + "</S:Fault>");
}

std::string Fault12(const std::string& content)
{
    return Envelope(
        SOAP12,
        "<S:Fault xmlns:t=\"" WST "\" xmlns:old=\"" WST2005 "\" xmlns:o=\"" WSSE "\">" + content
            + "</S:Fault>");
}

/** A fault of the code `S:Sender` with a subcode in it. */
std::string SenderFault(const std::string& subcode, const std::string& rest = "")
{
    return Fault12(
        "<S:Code><S:Value>S:Sender</S:Value><S:Subcode><S:Value>" + subcode
        + "</S:Value></S:Subcode></S:Code>" + rest);
}

constexpr char Reason[] =
    "<S:Reason><S:Text xml:lang=\"en\">wrong</S:Text><S:Text xml:lang=\"de\">falsch</S:Text>"
    "</S:Reason>";

ServiceDialect Soap12Dialect()
{
    ServiceDialect dialect;
    dialect.soap = SoapVersion::SOAP_1_2;
    return dialect;
}

std::string GetFaultFailure(const ServiceDialect& dialect, const std::string& reply)
{
    return GetFailure([&] {
        std::string tokenXml;
        ResponseHandlerImpl({dialect, FaultObserver()})
            .HandleAcquireTokenResponse(Quillon::CreateStringReader(reply).get(), tokenXml);
    });
}

std::vector<SoapFault> Observe(const std::string& reply)
{
    std::vector<SoapFault> seen;
    const ResponseHandlerImpl handler(
        {ServiceDialect(), [&seen](const SoapFault& fault) { seen.push_back(fault); }});
    GetFailure([&] {
        std::string tokenXml;
        handler.HandleAcquireTokenResponse(Quillon::CreateStringReader(reply).get(), tokenXml);
    });
    return seen;
}

} // namespace

// [SOAP12-1 5.4]
TEST(Soap12Fault, IsToldByItsCodesAsWritten)
{
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), SenderFault("\n t:BadRequest ", Reason)),
        "SsoException: Unexpected SOAP fault: S:Sender/t:BadRequest; request failed.");
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), Fault12("<S:Code><S:Value>S:Receiver</S:Value></S:Code>")),
        "SsoException: Unexpected SOAP fault: S:Receiver; request failed.");
}

TEST(Soap12Fault, IsOfBadCredentialsByItsSubcode)
{
    const std::string bad = "InvalidCredentialsException: Authentication failed";
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), SenderFault("t:FailedAuthentication", Reason)),
        bad + ": wrong");
    EXPECT_EQ(GetFaultFailure(Soap12Dialect(), SenderFault("t:InvalidSecurityToken")), bad);
    EXPECT_EQ(GetFaultFailure(Soap12Dialect(), SenderFault("o:InvalidSecurityToken")), bad);
    EXPECT_EQ(
        GetFaultFailure(
            Soap12Dialect(),
            SenderFault("t:RequestFailed</S:Value><S:Subcode><S:Value>t:FailedAuthentication"
                        "</S:Value></S:Subcode><S:Value>t:More")),
        bad);
}

TEST(Soap12Fault, IsOfBadCredentialsThoughASubcodeSaysMore)
{
    EXPECT_EQ(
        GetFaultFailure(
            Soap12Dialect(),
            SenderFault("t:FailedAuthentication</S:Value><S:Subcode><S:Value>t:More</S:Value>"
                        "</S:Subcode><S:Value>t:Last")),
        "InvalidCredentialsException: Authentication failed");
}

TEST(Soap12Fault, IsNotOfBadCredentialsByANameOfAnotherNamespace)
{
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), SenderFault("old:FailedAuthentication", Reason)),
        "SsoException: Unexpected SOAP fault: S:Sender/old:FailedAuthentication; request failed.");
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), SenderFault("FailedAuthentication", Reason)),
        "SsoException: Unexpected SOAP fault: S:Sender/FailedAuthentication; request failed.");
}

TEST(Soap12Fault, MustHaveACodeWhosePrefixIsDeclared)
{
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), Fault12("<S:Code/>")),
        "SsoException: Invalid SOAP response: missing fault code.");
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), SenderFault("x:Unknown")).substr(0, 15),
        "ParseException:");
}

TEST(Soap12Fault, IsNoneToADialectOfSoap11)
{
    EXPECT_EQ(
        GetFaultFailure(ServiceDialect(), SenderFault("t:BadRequest")),
        "SsoException: Invalid SOAP response: missing faultcode.");
}

// [SOAP12-1 A]
TEST(Soap12Fault, MayComeAsOneOfSoap11)
{
    EXPECT_EQ(
        GetFaultFailure(Soap12Dialect(), Fault11("<faultcode>S:VersionMismatch</faultcode>")),
        "SsoException: Unexpected SOAP fault: S:VersionMismatch; request failed.");
}

TEST(FaultOfAuthentication, OfWsSecurityIsOfBadCredentialsIfTheDialectSaysSo)
{
    const std::string reply = Fault11("<faultcode>o:FailedAuthentication</faultcode>");
    EXPECT_EQ(
        GetFaultFailure(ServiceDialect(), reply),
        "SsoException: Unexpected SOAP fault: o:FailedAuthentication; request failed.");
    ServiceDialect dialect;
    dialect.wsseFailedAuthentication = true;
    EXPECT_EQ(
        GetFaultFailure(dialect, reply), "InvalidCredentialsException: Authentication failed");
}

TEST(FaultOfAuthentication, IsOfTheTrustNamespaceOfTheDialect)
{
    ServiceDialect dialect = Soap12Dialect();
    dialect.trust = TrustVersion::WS_TRUST_2005_02;
    EXPECT_EQ(
        GetFaultFailure(dialect, SenderFault("old:FailedAuthentication")),
        "InvalidCredentialsException: Authentication failed");
    EXPECT_EQ(
        GetFaultFailure(dialect, SenderFault("t:FailedAuthentication")),
        "SsoException: Unexpected SOAP fault: S:Sender/t:FailedAuthentication; request failed.");
}

// [SOAP11 4.4]
TEST(FaultObserver, SeesAllOfASoap11Fault)
{
    const std::vector<SoapFault> seen =
        Observe(Fault11("<faultcode>t:BadRequest</faultcode><faultstring>no</faultstring>"
                        "<faultactor>urn:actor</faultactor><detail><x b='2' a='1'/></detail>"));
    ASSERT_EQ(seen.size(), 1U);
    const SoapFault& fault = seen.front();
    EXPECT_EQ(fault.code.text, "t:BadRequest");
    EXPECT_EQ(fault.code.name, Quillon::Xml::QName(WST, "BadRequest"));
    EXPECT_TRUE(fault.subcodes.empty());
    ASSERT_EQ(fault.texts.size(), 1U);
    EXPECT_EQ(fault.texts[0].language, "");
    EXPECT_EQ(fault.texts[0].text, "no");
    EXPECT_EQ(fault.node, "urn:actor");
    EXPECT_EQ(fault.role, "");
    EXPECT_EQ(fault.detail, "<detail><x a=\"1\" b=\"2\"></x></detail>");
}

// [SOAP12-1 5.4]
TEST(FaultObserver, SeesAllOfASoap12FaultInAnyDialect)
{
    const std::vector<SoapFault> seen = Observe(SenderFault(
        "t:BadRequest</S:Value><S:Subcode><S:Value>x:Unknown</S:Value></S:Subcode><S:Value>t:More",
        std::string(Reason)
            + "<S:Node> urn:node </S:Node><S:Role>urn:role</S:Role><S:Detail>why</S:Detail>"));
    ASSERT_EQ(seen.size(), 1U);
    const SoapFault& fault = seen.front();
    EXPECT_EQ(fault.code.name, Quillon::Xml::QName(SOAP12, "Sender"));
    ASSERT_EQ(fault.subcodes.size(), 2U);
    EXPECT_EQ(fault.subcodes[0].name, Quillon::Xml::QName(WST, "BadRequest"));
    EXPECT_EQ(fault.subcodes[1].text, "x:Unknown");
    EXPECT_EQ(fault.subcodes[1].name, Quillon::Xml::QName());
    ASSERT_EQ(fault.texts.size(), 2U);
    EXPECT_EQ(fault.texts[1].language, "de");
    EXPECT_EQ(fault.texts[1].text, "falsch");
    EXPECT_EQ(fault.node, "urn:node");
    EXPECT_EQ(fault.role, "urn:role");
    EXPECT_EQ(fault.detail, "<S:Detail xmlns:S=\"" SOAP12 "\">why</S:Detail>");
}

// What the observer is shown must not decide what the operation ends with.
TEST(FaultObserver, SeesADetailThatHasNoCanonicalFormAsItIsWritten)
{
    for (const std::string detail :
         {"<detail><p:x/></detail>", "<detail><x xmlns='relative'/></detail>"}) {
        std::vector<SoapFault> seen;
        const ResponseHandlerImpl handler(
            {ServiceDialect(), [&seen](const SoapFault& fault) { seen.push_back(fault); }});
        const std::string reply = Fault11("<faultcode>t:X</faultcode>" + detail);
        EXPECT_EQ(
            GetFailure([&] {
                handler.HandleValidateSubjectResponse(Quillon::CreateStringReader(reply).get());
            }),
            "SsoException: Unexpected SOAP fault: t:X; request failed.");
        ASSERT_EQ(seen.size(), 1U);
        EXPECT_EQ(seen.front().detail.substr(0, 11), detail.substr(0, 11));
    }
}

TEST(FaultObserver, SeesAFaultThatSaysNothing)
{
    ASSERT_EQ(Observe(Fault11("")).size(), 1U);
    EXPECT_EQ(Observe(Fault11("")).front().code.text, "");
}

TEST(FaultObserver, SeesNothingOfAReplyThatIsNoFault)
{
    EXPECT_TRUE(Observe(Envelope(SOAP11, "")).empty());
}

TEST(FaultObserver, MayThrow)
{
    const ResponseHandlerImpl handler(
        {ServiceDialect(), [](const SoapFault&) { throw Quillon::InvalidStateException("seen"); }});
    EXPECT_EQ(
        GetFailure([&] {
            handler.HandleValidateSubjectResponse(
                Quillon::CreateStringReader(Fault11("<faultcode>t:X</faultcode>")).get());
        }),
        "InvalidStateException: seen");
}
