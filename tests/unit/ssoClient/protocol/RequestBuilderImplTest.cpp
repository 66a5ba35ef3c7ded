#include "ssoClient/protocol/RequestBuilderImpl.h"

#include "quillon/system/Clock.h"
#include "quillon/xml/Parser.h"
#include "quillon/xml/security/Signature.h"
#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "support/Xmlsec1.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using Quillon::Xml::ElementNode;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WSS "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-"

TokenSpec SpecWithLifetime(long long seconds)
{
    TokenSpec spec;
    spec.tokenLifetimeSec = seconds;
    return spec;
}

Request BuildUserPass(
    const TokenSpec& spec, const boost::optional<HolderOfKeyConfig>& config = boost::none)
{
    Request request;
    RequestBuilderImpl(config).BuildUserPassTokenRequest("jdoe", "s3cret", spec, request);
    return request;
}

HolderOfKeyConfig GetIdentity()
{
    return {GetTestKey("client"), GetTestCertificates("client").front()};
}

Quillon::Ref<Quillon::Xml::Document> Parse(const std::string& text)
{
    const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(std::string_view(text));
    return handler->GetDocument();
}

std::vector<std::string> GetHeaderParts(const std::string& envelope)
{
    const auto document = Parse(envelope);
    const ElementNode* const security =
        document->GetRootElement()->FindChildElement("Header")->FindChildElement("Security");
    std::vector<std::string> names;
    for (const auto* child = security->GetFirstChild(); child; child = child->GetNextSibling()) {
        names.emplace_back(Quillon::Xml::AsElement(child)->GetName());
    }
    return names;
}

FakeSamlToken GetToken(const std::string& file)
{
    FakeSamlToken token;
    token.id = "_7d1f6a52-9c61";
    token.xml = ReadTestData("tokens/accepted/" + file + ".xml");
    return token;
}

constexpr char BadLifetime[] =
    "InvalidArgumentException: Invalid argument : Token lifetime must be positive";
constexpr char PublicKeyType[] = "<wst:KeyType>" WST "/PublicKey</wst:KeyType>";
constexpr char BearerKeyType[] = "<wst:KeyType>" WST "/Bearer</wst:KeyType>";

} // namespace

TEST(BuildUserPassTokenRequest, WithoutIdentityWritesPlainBearerRequest)
{
    const FixedClock clock("2011-07-05T09:03:07.042Z");
    const Request request = BuildUserPass(SpecWithLifetime(300));
    EXPECT_EQ(request.soapAction, WST "/RST/Issue");
    EXPECT_EQ(
        request.body,
        "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
        "<soapenv:Header>"
        "<wsse:Security xmlns:wsse=\"" WSS "wssecurity-secext-1.0.xsd\">"
        "<wsu:Timestamp xmlns:wsu=\"" WSS "wssecurity-utility-1.0.xsd\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:13:07.042Z</wsu:Expires>"
        "</wsu:Timestamp>"
        "<wsse:UsernameToken xmlns:wsse=\"" WSS "wssecurity-secext-1.0.xsd\">"
        "<wsse:Username>jdoe</wsse:Username>"
        "<wsse:Password Type=\"" WSS "username-token-profile-1.0#PasswordText\">s3cret"
        "</wsse:Password>"
        "</wsse:UsernameToken>"
        "</wsse:Security>"
        "</soapenv:Header>"
        "<soapenv:Body xmlns:wst=\"" WST "\">"
        "<wst:RequestSecurityToken xmlns:wst=\"" WST "\">"
        "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
        "<wst:RequestType>" WST "/Issue</wst:RequestType>"
        "<wst:KeyType>" WST "/Bearer</wst:KeyType>"
        "<wst:Lifetime xmlns:wsu=\"" WSS "wssecurity-utility-1.0.xsd\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:08:07.042Z</wsu:Expires>"
        "</wst:Lifetime>"
        "<wst:Renewing Allow=\"false\" OK=\"false\"/>"
        "<wst:Delegatable>false</wst:Delegatable>"
        "</wst:RequestSecurityToken>"
        "</soapenv:Body>"
        "</soapenv:Envelope>");
}

TEST(BuildUserPassTokenRequest, EscapesWhatTheCallerGives)
{
    Request request;
    RequestBuilderImpl(boost::none)
        .BuildUserPassTokenRequest("</wsse:Username><x>", "a&b<c", SpecWithLifetime(300), request);
    const auto document = Parse(request.body);
    const ElementNode* const token = document->GetRootElement()
                                         ->FindChildElement("Header")
                                         ->FindChildElement("Security")
                                         ->FindChildElement("UsernameToken");
    EXPECT_EQ(
        Quillon::Xml::AsText(token->FindChildElement("Username")->GetFirstChild())->GetText(),
        "</wsse:Username><x>");
    EXPECT_EQ(
        Quillon::Xml::AsText(token->FindChildElement("Password")->GetFirstChild())->GetText(),
        "a&b<c");
}

TEST(BuildUserPassTokenRequest, RefusesLifetimeThatIsNotPositive)
{
    EXPECT_EQ(GetFailure([] { BuildUserPass(SpecWithLifetime(0)); }), BadLifetime);
    EXPECT_EQ(GetFailure([] { BuildUserPass(SpecWithLifetime(-1)); }), BadLifetime);
    EXPECT_EQ(GetFailure([] { BuildUserPass(SpecWithLifetime(1)); }), "none");
}

TEST(BuildUserPassTokenRequest, WithIdentityIsSignedHolderOfKey)
{
    const Request request = BuildUserPass(SpecWithLifetime(300), GetIdentity());
    EXPECT_EQ(request.soapAction, WST "/RST/Issue");
    EXPECT_THAT(request.body, HasSubstr(PublicKeyType));
    EXPECT_THAT(request.body, HasSubstr("<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>"));
    EXPECT_THAT(
        GetHeaderParts(request.body),
        ElementsAre(
            "wsu:Timestamp", "wsse:UsernameToken", "wsse:BinarySecurityToken", "ds:Signature"));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
}

TEST(BuildUserPassTokenRequest, LeavesTheRequestUntouchedOnBadLifetime)
{
    Request request;
    request.soapAction = "before";
    request.body = "before";
    EXPECT_THROW(
        RequestBuilderImpl(boost::none)
            .BuildUserPassTokenRequest("u", "p", SpecWithLifetime(0), request),
        Quillon::InvalidArgumentException);
    EXPECT_EQ(request.soapAction, "before");
    EXPECT_EQ(request.body, "before");
}

// The envelope is built last: what no XML can hold leaves the body as it was.
TEST(BuildUserPassTokenRequest, RefusesWhatXmlCannotHold)
{
    const auto expectRefusal = [](const std::string& user,
                                  const std::string& password,
                                  const TokenSpec& spec,
                                  const std::string& message) {
        Request request;
        request.body = "before";
        EXPECT_EQ(
            GetFailure([&] {
                RequestBuilderImpl(boost::none)
                    .BuildUserPassTokenRequest(user, password, spec, request);
            }),
            "InvalidArgumentException: Invalid argument : " + message);
        EXPECT_EQ(request.soapAction, WST "/RST/Issue");
        EXPECT_EQ(request.body, "before");
    };
    const std::string control = " holds a character that XML does not allow at octet ";
    TokenSpec spec = SpecWithLifetime(300);
    expectRefusal("j\x01", "p", spec, "The text of element 'wsse:Username'" + control + "1");
    expectRefusal(
        "j", std::string("p\0w", 3), spec, "The text of element 'wsse:Password'" + control + "1");
    expectRefusal(
        "j", "gr\xFC\xDF", spec, "The text of element 'wsse:Password' is not UTF-8 at octet 2");
    spec.delegateTo = "\xEF\xBF\xBF";
    expectRefusal("j", "p", spec, "The text of element 'wsse:Username'" + control + "0");
    spec.delegateTo = boost::none;
    spec.audienceRestriction = {"a", "b\x1B"};
    expectRefusal("j", "p", spec, "The text of element 'wsa:Address'" + control + "1");
    spec.audienceRestriction.clear();
    spec.advice = {{"urn:s\x02", {}}};
    expectRefusal("j", "p", spec, "The value of attribute 'AdviceSource'" + control + "5");
    spec.advice = {{"urn:s", {{"n\xC0\x80", {}}}}};
    expectRefusal("j", "p", spec, "The value of attribute 'Name' is not UTF-8 at octet 1");
    spec.advice = {{"urn:s", {{"n", {"v\x7F", "v\x0B"}}}}};
    expectRefusal(
        "j", "p", spec, "The text of element 'rsa-advice:AttributeValue'" + control + "1");
    // The lifetime comes first, and before the action.
    Request request;
    spec.tokenLifetimeSec = 0;
    EXPECT_EQ(
        GetFailure([&] {
            RequestBuilderImpl(boost::none).BuildUserPassTokenRequest("\x01", "p", spec, request);
        }),
        BadLifetime);
    EXPECT_EQ(request.soapAction, "");
}

TEST(BuildContinuedSPNegoRequest, RefusesContextIdThatXmlCannotHold)
{
    Request request;
    EXPECT_EQ(
        GetFailure([&] {
            RequestBuilderImpl(boost::none).BuildContinuedSPNegoRequest("id\x01", Leg(), request);
        }),
        "InvalidArgumentException: Invalid argument : The value of attribute 'Context' "
        "holds a character that XML does not allow at octet 2");
    // The action is set before the envelope is built, as in every request.
    EXPECT_EQ(request.soapAction, WST "/RSTR/Issue");
    EXPECT_EQ(request.body, "");
}

TEST(BuildExchangeTokenRequest, RefusesTokenIdThatXmlCannotHold)
{
    FakeSamlToken token = GetToken("bearer");
    token.id = "_id\x0E";
    Request request;
    EXPECT_EQ(
        GetFailure([&] {
            RequestBuilderImpl(GetIdentity())
                .BuildExchangeTokenRequest(token, SpecWithLifetime(300), request);
        }),
        "InvalidArgumentException: Invalid argument : The text of element 'wsse:KeyIdentifier' "
        "holds a character that XML does not allow at octet 3");
    EXPECT_EQ(request.body, "");
}

TEST(BuildUserPassTokenRequest, WithIdentityAndBearerConfirmationIsUnsignedBearer)
{
    TokenSpec spec = SpecWithLifetime(300);
    for (const int confirmation : {1, 7}) {
        spec.confirmation = static_cast<TokenSpec::Confirmation>(confirmation);
        const Request request = BuildUserPass(spec, GetIdentity());
        EXPECT_THAT(request.body, HasSubstr("<wst:KeyType>" WST "/Bearer</wst:KeyType>"));
        EXPECT_THAT(request.body, Not(HasSubstr("Signature")));
    }
}

TEST(BuildUserPassTokenRequest, WithIdentityAndDelegationIsUnsignedHolderOfKey)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.delegateTo = "proxy";
    const Request request = BuildUserPass(spec, GetIdentity());
    EXPECT_THAT(request.body, HasSubstr("<wst:KeyType>" WST "/PublicKey</wst:KeyType>"));
    EXPECT_THAT(request.body, Not(HasSubstr("Signature")));
    EXPECT_THAT(request.body, Not(HasSubstr("UseKey")));
}

namespace {

const Leg FirstLeg{'l', 'e', 'g'};

Request BuildInitialSPNego(
    const TokenSpec& spec, const boost::optional<HolderOfKeyConfig>& config = boost::none)
{
    Request request;
    RequestBuilderImpl(config).BuildInitialSPNegoRequest(spec, FirstLeg, request);
    return request;
}

} // namespace

TEST(BuildInitialSPNegoRequest, WithoutIdentityIsUnsignedBearer)
{
    const Request request = BuildInitialSPNego(SpecWithLifetime(300));
    EXPECT_EQ(request.soapAction, WST "/RST/Issue");
    EXPECT_THAT(request.body, HasSubstr(BearerKeyType));
    EXPECT_THAT(request.body, HasSubstr(">bGVn</wst:BinaryExchange></wst:RequestSecurityToken>"));
    EXPECT_THAT(GetHeaderParts(request.body), ElementsAre("wsu:Timestamp"));
}

TEST(BuildInitialSPNegoRequest, WithIdentityIsSignedHolderOfKey)
{
    const Request request = BuildInitialSPNego(SpecWithLifetime(300), GetIdentity());
    EXPECT_THAT(request.body, HasSubstr(PublicKeyType));
    EXPECT_THAT(
        GetHeaderParts(request.body),
        ElementsAre("wsu:Timestamp", "wsse:BinarySecurityToken", "ds:Signature"));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
}

TEST(BuildInitialSPNegoRequest, WithIdentityAndBearerConfirmationIsUnsignedBearer)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    const Request request = BuildInitialSPNego(spec, GetIdentity());
    EXPECT_THAT(request.body, HasSubstr(BearerKeyType));
    EXPECT_THAT(GetHeaderParts(request.body), ElementsAre("wsu:Timestamp"));
}

TEST(BuildInitialSPNegoRequest, WithIdentityAndDelegationIsUnsignedHolderOfKey)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.delegateTo = "proxy";
    const Request request = BuildInitialSPNego(spec, GetIdentity());
    EXPECT_THAT(request.body, HasSubstr(PublicKeyType));
    EXPECT_THAT(GetHeaderParts(request.body), ElementsAre("wsu:Timestamp"));
}

TEST(BuildInitialSPNegoRequest, RefusesLifetimeThatIsNotPositive)
{
    for (const long long lifetime : {0LL, -1LL}) {
        EXPECT_EQ(GetFailure([&] { BuildInitialSPNego(SpecWithLifetime(lifetime)); }), BadLifetime);
    }
}

TEST(BuildInitialSPNegoRequest, HasATimestampOfTenMinutes)
{
    const FixedClock clock("2026-11-20T12:00:00Z");
    EXPECT_THAT(
        BuildInitialSPNego(SpecWithLifetime(300)).body,
        HasSubstr("<wsu:Created>2026-11-20T12:00:00.000Z</wsu:Created>"
                  "<wsu:Expires>2026-11-20T12:10:00.000Z</wsu:Expires></wsu:Timestamp>"));
}

TEST(BuildContinuedSPNegoRequest, IsAnUnsignedResponse)
{
    Request request;
    RequestBuilderImpl(GetIdentity()).BuildContinuedSPNegoRequest("ctx", FirstLeg, request);
    EXPECT_EQ(request.soapAction, WST "/RSTR/Issue");
    EXPECT_THAT(
        request.body,
        HasSubstr("xmlns:wst=\"" WST "\"><wst:RequestSecurityTokenResponse Context=\"ctx\">"
                  "<wst:BinaryExchange "));
    EXPECT_THAT(
        request.body,
        HasSubstr(">bGVn</wst:BinaryExchange></wst:RequestSecurityTokenResponse></soapenv:Body>"));
    EXPECT_THAT(GetHeaderParts(request.body), ElementsAre("wsu:Timestamp"));
}

TEST(BuildCertificateTokenRequest, IsSignedWithTheCertificate)
{
    Request request;
    RequestBuilderImpl(GetIdentity()).BuildCertificateTokenRequest(SpecWithLifetime(300), request);
    EXPECT_EQ(request.soapAction, WST "/RST/Issue");
    EXPECT_THAT(request.body, HasSubstr(PublicKeyType));
    EXPECT_THAT(request.body, HasSubstr("<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>"));
    EXPECT_THAT(
        GetHeaderParts(request.body),
        ElementsAre("wsu:Timestamp", "wsse:BinarySecurityToken", "ds:Signature"));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
}

TEST(BuildCertificateTokenRequest, IsSignedEvenIfDelegated)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.delegateTo = "proxy";
    Request request;
    RequestBuilderImpl(GetIdentity()).BuildCertificateTokenRequest(spec, request);
    EXPECT_THAT(request.body, Not(HasSubstr("UseKey")));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
}

TEST(BuildCertificateTokenRequest, ChecksLifetimeThenIdentityThenConfirmation)
{
    const RequestBuilderImpl without(boost::none);
    const RequestBuilderImpl with(GetIdentity());
    TokenSpec spec = SpecWithLifetime(0);
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    Request request;
    EXPECT_EQ(
        GetFailure([&] { without.BuildCertificateTokenRequest(spec, request); }), BadLifetime);
    spec.tokenLifetimeSec = 300;
    EXPECT_EQ(
        GetFailure([&] { without.BuildCertificateTokenRequest(spec, request); }),
        "InvalidStateException: "
        "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
    for (const int confirmation : {1, 7}) {
        spec.confirmation = static_cast<TokenSpec::Confirmation>(confirmation);
        EXPECT_EQ(
            GetFailure([&] { with.BuildCertificateTokenRequest(spec, request); }),
            "InvalidArgumentException: Invalid argument : TokenSpec::confirmation must be "
            "CONFIRMATION_DEFAULT for acquire token by certificate");
    }
    EXPECT_EQ(request.soapAction, "");
    EXPECT_EQ(request.body, "");
}

TEST(BuildExchangeTokenRequest, PresentsTheTokenAndRefersToIt)
{
    Request request;
    RequestBuilderImpl(GetIdentity())
        .BuildExchangeTokenRequest(GetToken("holder-of-key"), SpecWithLifetime(300), request);
    EXPECT_EQ(request.soapAction, WST "/RST/Issue");
    EXPECT_THAT(request.body, HasSubstr(PublicKeyType));
    EXPECT_THAT(request.body, Not(HasSubstr("UseKey")));
    EXPECT_THAT(
        GetHeaderParts(request.body),
        ElementsAre("wsu:Timestamp", "saml:Assertion", "ds:Signature"));
    EXPECT_THAT(request.body, HasSubstr(">_7d1f6a52-9c61</wsse:KeyIdentifier>"));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "sts", AssertionSignature));
}

TEST(BuildExchangeTokenRequest, TakesBearerTokenAndBearerConfirmation)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    Request request;
    RequestBuilderImpl(GetIdentity()).BuildExchangeTokenRequest(GetToken("bearer"), spec, request);
    EXPECT_THAT(request.body, HasSubstr(BearerKeyType));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "sts", AssertionSignature));
}

TEST(BuildExchangeTokenRequest, ChecksLifetimeThenIdentity)
{
    const RequestBuilderImpl without(boost::none);
    const FakeSamlToken token = GetToken("bearer");
    Request request;
    EXPECT_EQ(
        GetFailure(
            [&] { without.BuildExchangeTokenRequest(token, SpecWithLifetime(-1), request); }),
        BadLifetime);
    EXPECT_EQ(
        GetFailure(
            [&] { without.BuildExchangeTokenRequest(token, SpecWithLifetime(300), request); }),
        "InvalidStateException: No HolderOfKeyConfig provided. Unable to acquire token by token");
}

TEST(BuildValidateSubjectRequest, IsUnsigned)
{
    const FixedClock clock("2011-07-05T09:03:07.042Z");
    FakeSamlToken token;
    token.xml = "<a:A xmlns:a=\"urn:a\"/>";
    Request request;
    RequestBuilderImpl(GetIdentity()).BuildValidateSubjectRequest(token, request);
    EXPECT_EQ(request.soapAction, WST "/RST/Validate");
    EXPECT_EQ(
        request.body,
        "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
        "<soapenv:Header>"
        "<wsse:Security xmlns:wsse=\"" WSS "wssecurity-secext-1.0.xsd\">"
        "<wsu:Timestamp xmlns:wsu=\"" WSS "wssecurity-utility-1.0.xsd\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:13:07.042Z</wsu:Expires>"
        "</wsu:Timestamp>"
        "</wsse:Security>"
        "</soapenv:Header>"
        "<soapenv:Body xmlns:wst=\"" WST "\">"
        "<wst:RequestSecurityToken xmlns:wst=\"" WST "\">"
        "<wst:TokenType>" WST "/RSTR/Status</wst:TokenType>"
        "<wst:RequestType>" WST "/Validate</wst:RequestType>"
        "<wst:ValidateTarget><a:A xmlns:a=\"urn:a\"/></wst:ValidateTarget>"
        "</wst:RequestSecurityToken>"
        "</soapenv:Body>"
        "</soapenv:Envelope>");
}

TEST(BuildValidateSubjectRequest, NeedsNoIdentityAndKeepsTheTokenVerifiable)
{
    Request request;
    RequestBuilderImpl(boost::none).BuildValidateSubjectRequest(GetToken("bearer"), request);
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "sts", AssertionSignature));
}

TEST(BuildValidateSubjectRequest, SetsTheActionBeforeItReadsTheToken)
{
    FakeSamlToken token;
    token.xml = "not XML";
    Request request;
    EXPECT_THROW(
        RequestBuilderImpl(boost::none).BuildValidateSubjectRequest(token, request),
        Quillon::Xml::XMLParseException);
    EXPECT_EQ(request.soapAction, WST "/RST/Validate");
    EXPECT_EQ(request.body, "");
}

TEST(BuildRenewRequest, IsSignedWithTheCertificate)
{
    const FixedClock clock("2011-07-05T09:03:07.042Z");
    FakeSamlToken token = GetToken("holder-of-key");
    token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    Request request;
    RequestBuilderImpl(GetIdentity()).BuildRenewRequest(token, 600, request);
    EXPECT_EQ(request.soapAction, WST "/RST/Renew");
    EXPECT_THAT(request.body, HasSubstr("<wst:RequestType>" WST "/Renew</wst:RequestType>"));
    EXPECT_THAT(
        request.body,
        HasSubstr("<wsu:Expires>2011-07-05T09:13:07.042Z</wsu:Expires></wst:Lifetime>"
                  "<wst:RenewTarget><saml:Assertion "));
    EXPECT_THAT(
        GetHeaderParts(request.body),
        ElementsAre("wsu:Timestamp", "wsse:BinarySecurityToken", "ds:Signature"));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "sts", AssertionSignature));
}

TEST(BuildRenewRequest, ChecksLifetimeThenIdentityThenToken)
{
    const RequestBuilderImpl without(boost::none);
    const RequestBuilderImpl with(GetIdentity());
    const FakeSamlToken bearer = GetToken("bearer");
    Request request;
    EXPECT_EQ(GetFailure([&] { without.BuildRenewRequest(bearer, 0, request); }), BadLifetime);
    EXPECT_EQ(
        GetFailure([&] { without.BuildRenewRequest(bearer, 1, request); }),
        "InvalidStateException: No HolderOfKeyConfig provided. Unable to renew token");
    EXPECT_EQ(
        GetFailure([&] { with.BuildRenewRequest(bearer, 1, request); }),
        "InvalidArgumentException: Invalid argument : "
        "Unable to renew token: the provided token must be Holder Of Key");
    EXPECT_EQ(request.soapAction, "");
}

// --------------------------------------------------------------------------- what all have

namespace {

/** One of the requests, by the name of the operation that builds it. */
struct RequestKind
{
    const char* name;
    void (*build)(const RequestBuilderImpl& builder, const TokenSpec& spec, Request& request);
    const char* action;
    bool hasLifetime;
    bool isSigned;
};

std::ostream& operator<<(std::ostream& out, const RequestKind& kind)
{
    return out << kind.name;
}

FakeSamlToken GetHolderOfKeyToken()
{
    FakeSamlToken token = GetToken("holder-of-key");
    token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    return token;
}

const RequestKind Password{
    "Password",
    [](const auto& builder, const auto& spec, auto& request) {
        builder.BuildUserPassTokenRequest("jdoe", "s3cret", spec, request);
    },
    WST "/RST/Issue",
    true,
    true};
const RequestKind InitialSPNego{
    "InitialSPNego",
    [](const auto& builder, const auto& spec, auto& request) {
        builder.BuildInitialSPNegoRequest(spec, FirstLeg, request);
    },
    WST "/RST/Issue",
    true,
    true};
const RequestKind ContinuedSPNego{
    "ContinuedSPNego",
    [](const auto& builder, const auto&, auto& request) {
        builder.BuildContinuedSPNegoRequest("ctx", FirstLeg, request);
    },
    WST "/RSTR/Issue",
    false,
    false};
const RequestKind Certificate{
    "Certificate",
    [](const auto& builder, const auto& spec, auto& request) {
        builder.BuildCertificateTokenRequest(spec, request);
    },
    WST "/RST/Issue",
    true,
    true};
const RequestKind Exchange{
    "Exchange",
    [](const auto& builder, const auto& spec, auto& request) {
        builder.BuildExchangeTokenRequest(GetToken("bearer"), spec, request);
    },
    WST "/RST/Issue",
    true,
    true};
const RequestKind Validate{
    "Validate",
    [](const auto& builder, const auto&, auto& request) {
        builder.BuildValidateSubjectRequest(GetToken("bearer"), request);
    },
    WST "/RST/Validate",
    false,
    false};
const RequestKind Renew{
    "Renew",
    [](const auto& builder, const auto& spec, auto& request) {
        builder.BuildRenewRequest(GetHolderOfKeyToken(), spec.tokenLifetimeSec, request);
    },
    WST "/RST/Renew",
    true,
    true};

class EveryRequest : public testing::TestWithParam<RequestKind>
{
protected:
    static Request Build(
        const TokenSpec& spec, const boost::optional<HolderOfKeyConfig>& identity = GetIdentity())
    {
        Request request;
        GetParam().build(RequestBuilderImpl(identity), spec, request);
        return request;
    }
};
class RequestWithLifetime : public EveryRequest
{};
class SignedRequest : public EveryRequest
{};

std::string ToName(const testing::TestParamInfo<RequestKind>& info)
{
    return info.param.name;
}

INSTANTIATE_TEST_SUITE_P(
    All,
    EveryRequest,
    testing::Values(
        Password, InitialSPNego, ContinuedSPNego, Certificate, Exchange, Validate, Renew),
    ToName);
INSTANTIATE_TEST_SUITE_P(
    All,
    RequestWithLifetime,
    testing::Values(Password, InitialSPNego, Certificate, Exchange, Renew),
    ToName);
INSTANTIATE_TEST_SUITE_P(
    All,
    SignedRequest,
    testing::Values(Password, InitialSPNego, Certificate, Exchange, Renew),
    ToName);

/** The time moves on by a second whenever it is read. */
class MovingClock final : public Quillon::System::Clock
{
public:
    explicit MovingClock(std::string_view start)
        : _now(Quillon::System::DateTime(start).GetUtcTime())
        , _before(Quillon::System::ReplaceClock(this))
    {}
    MovingClock(const MovingClock&) = delete;
    MovingClock& operator=(const MovingClock&) = delete;
    ~MovingClock() { Quillon::System::ReplaceClock(_before); }

    Quillon::System::DateTime Now() const override
    {
        return Quillon::System::DateTimeFromUtc(_now += 1'000'000, false);
    }

private:
    mutable long long _now;
    const Quillon::System::Clock* _before;
};

/** Seconds from the first Created behind `start` to the Expires that follows it. */
long long GetSpan(const std::string& text, const std::string& start)
{
    const auto read = [&text](const std::string& tag, std::size_t from) {
        const std::size_t begin = text.find(tag, from) + tag.size();
        return Quillon::System::DateTime(text.substr(begin, text.find('<', begin) - begin))
            .GetUtcTime();
    };
    const std::size_t from = text.find(start);
    EXPECT_NE(from, std::string::npos) << start;
    return (read("<wsu:Expires>", from) - read("<wsu:Created>", from)) / 1'000'000;
}

} // namespace

TEST_P(EveryRequest, HasItsActionAndATimestampOfTenMinutes)
{
    const FixedClock clock("2026-11-20T12:00:00Z");
    const Request request = Build(SpecWithLifetime(300));
    EXPECT_EQ(request.soapAction, GetParam().action);
    EXPECT_THAT(
        request.body,
        HasSubstr("<wsu:Created>2026-11-20T12:00:00.000Z</wsu:Created>"
                  "<wsu:Expires>2026-11-20T12:10:00.000Z</wsu:Expires></wsu:Timestamp>"));
    EXPECT_EQ(
        GetParam().isSigned,
        request.body.find(" Id=\"holderOfKeyProofSignature\"") != std::string::npos);
}

TEST_P(EveryRequest, ReadsTheTimeOnceForItsTimestamp)
{
    const MovingClock clock("2026-11-20T12:00:00Z");
    EXPECT_EQ(GetSpan(Build(SpecWithLifetime(300)).body, "<wsu:Timestamp "), 600);
}

TEST_P(RequestWithLifetime, ReadsTheTimeOnceForItsLifetime)
{
    const MovingClock clock("2026-11-20T12:00:00Z");
    EXPECT_EQ(GetSpan(Build(SpecWithLifetime(300)).body, "<wst:Lifetime "), 300);
}

TEST_P(RequestWithLifetime, RefusesLifetimeThatIsNotPositive)
{
    for (const long long seconds : {0LL, -1LL}) {
        EXPECT_EQ(GetFailure([&] { Build(SpecWithLifetime(seconds)); }), BadLifetime);
        EXPECT_EQ(GetFailure([&] { Build(SpecWithLifetime(seconds), boost::none); }), BadLifetime);
    }
}

TEST_P(RequestWithLifetime, NamesALifetimeThatNoDateCanHold)
{
    const FixedClock clock("9999-12-31T23:00:00Z"); // an hour before the last date ends
    EXPECT_EQ(GetFailure([] { Build(SpecWithLifetime(3599)); }), "none");
    for (const long long seconds : {3600LL, 9'223'372'036'855LL, 9'223'372'036'854'775'807LL}) {
        EXPECT_EQ(
            GetFailure([&] { Build(SpecWithLifetime(seconds)); }),
            "InvalidArgumentException: Invalid argument : Token lifetime of "
                + std::to_string(seconds) + " seconds ends outside the years 1 to 9999");
    }
}

TEST_P(SignedRequest, SetsTheActionBeforeItBuildsTheEnvelope)
{
    const HolderOfKeyConfig cannotSign{GetTestKey("weak"), GetTestCertificates("weak").front()};
    Request request;
    request.body = "before";
    EXPECT_THROW(
        GetParam().build(RequestBuilderImpl(cannotSign), SpecWithLifetime(300), request),
        Quillon::Xml::Security::XmlSecurityException);
    EXPECT_EQ(request.soapAction, GetParam().action);
    EXPECT_EQ(request.body, "before");
}

// --------------------------------------------------------------------------- half an identity

namespace {

HolderOfKeyConfig GetOnlyTheKey()
{
    return {GetTestKey("client"), nullptr};
}
HolderOfKeyConfig GetOnlyTheCertificate()
{
    return {nullptr, GetTestCertificates("client").front()};
}

} // namespace

TEST(HalfAnIdentity, IsNone)
{
    for (const HolderOfKeyConfig& half :
         {HolderOfKeyConfig(), GetOnlyTheKey(), GetOnlyTheCertificate()}) {
        for (const auto& [kind, operation] :
             {std::pair(Certificate, "acquire token by certificate"),
              std::pair(Exchange, "acquire token by token"),
              std::pair(Renew, "renew token")}) {
            Request request;
            EXPECT_EQ(
                GetFailure([&, build = kind.build] {
                    build(RequestBuilderImpl(half), SpecWithLifetime(300), request);
                }),
                std::string("InvalidStateException: No HolderOfKeyConfig provided. Unable to ")
                    + operation);
            EXPECT_EQ(request.soapAction, "");
            EXPECT_EQ(request.body, "");
        }
    }
}

TEST(HalfAnIdentity, AsksForAnUnsignedBearerToken)
{
    for (const HolderOfKeyConfig& half :
         {HolderOfKeyConfig(), GetOnlyTheKey(), GetOnlyTheCertificate()}) {
        for (const RequestKind& kind : {Password, InitialSPNego}) {
            Request request;
            kind.build(RequestBuilderImpl(half), SpecWithLifetime(300), request);
            EXPECT_THAT(request.body, HasSubstr(BearerKeyType));
            EXPECT_THAT(request.body, Not(HasSubstr("Signature")));
        }
    }
}

// --------------------------------------------------------------------------- what is asked for

namespace {

TokenSpec GetRichSpec()
{
    TokenSpec spec = SpecWithLifetime(7200);
    spec.advice = {{"urn:source", {{"urn:name", {"one", "two"}}}}};
    spec.audienceRestriction = {"urn:audience"};
    spec.renewable = true;
    spec.delegable = true;
    return spec;
}

void ExpectToAskForAllOfIt(const Request& request)
{
    EXPECT_THAT(
        request.body,
        HasSubstr("<rsa-advice:Advice AdviceSource=\"urn:source\">"
                  "<rsa-advice:Attribute Name=\"urn:name\">"
                  "<rsa-advice:AttributeValue xsi:type=\"xs:string\">one"
                  "</rsa-advice:AttributeValue>"
                  "<rsa-advice:AttributeValue xsi:type=\"xs:string\">two"
                  "</rsa-advice:AttributeValue></rsa-advice:Attribute></rsa-advice:Advice>"));
    EXPECT_THAT(request.body, HasSubstr(">urn:audience</wsa:Address>"));
    EXPECT_THAT(request.body, HasSubstr("<wst:Renewing Allow=\"true\" OK=\"false\"/>"));
    EXPECT_THAT(request.body, HasSubstr("<wst:Delegatable>true</wst:Delegatable>"));
    EXPECT_THAT(
        request.body,
        HasSubstr("<wsu:Created>2026-11-20T12:00:00.000Z</wsu:Created>"
                  "<wsu:Expires>2026-11-20T14:00:00.000Z</wsu:Expires></wst:Lifetime>"));
}

} // namespace

// The token presented has neither advice nor audience and is not renewable.
TEST(BuildExchangeTokenRequest, AsksForWhatTheSpecSaysAndNotForWhatTheTokenHas)
{
    const FixedClock clock("2026-11-20T12:00:00Z");
    Request request;
    Exchange.build(RequestBuilderImpl(GetIdentity()), GetRichSpec(), request);
    ExpectToAskForAllOfIt(request);
}

TEST(BuildInitialSPNegoRequest, AsksForWhatTheSpecSays)
{
    const FixedClock clock("2026-11-20T12:00:00Z");
    ExpectToAskForAllOfIt(BuildInitialSPNego(GetRichSpec()));
}

// An empty name is a name: what counts is that there is one.
TEST(EmptyDelegate, IsADelegateInEveryRequest)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.delegateTo = "";
    for (const RequestKind& kind : {Password, InitialSPNego, Exchange, Certificate}) {
        Request request;
        kind.build(RequestBuilderImpl(GetIdentity()), spec, request);
        EXPECT_THAT(request.body, HasSubstr("<wst:DelegateTo><wsse:UsernameToken ")) << kind.name;
        EXPECT_THAT(request.body, Not(HasSubstr("UseKey"))) << kind.name;
    }
    for (const RequestKind& kind : {Password, InitialSPNego}) {
        Request request;
        kind.build(RequestBuilderImpl(GetIdentity()), spec, request);
        EXPECT_THAT(request.body, HasSubstr(PublicKeyType)) << kind.name;
        EXPECT_THAT(request.body, Not(HasSubstr("Signature"))) << kind.name;
    }
}

// A parser makes a line feed of a carriage return that is written as it is [XML 2.11].
TEST(BuildUserPassTokenRequest, KeepsCarriageReturns)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.audienceRestriction = {"a\rb"};
    spec.advice = {{"c\rd", {{"e\rf", {"g\rh"}}}}};
    spec.delegateTo = "i\rj";
    Request request;
    RequestBuilderImpl(boost::none).BuildUserPassTokenRequest("k\rl", "m\rn", spec, request);
    EXPECT_THAT(request.body, Not(HasSubstr("\r")));
    for (const char* const written :
         {">a&#xD;b<",
          "\"c&#xD;d\"",
          "\"e&#xD;f\"",
          ">g&#xD;h<",
          ">i&#xD;j<",
          ">k&#xD;l<",
          ">m&#xD;n<"}) {
        EXPECT_THAT(request.body, HasSubstr(written));
    }
}

TEST(Request, IsIndependentOfItsCopy)
{
    Request request;
    request.soapAction = "urn:a";
    request.body = std::string(100, 'x');
    Request copy;
    {
        const Request original(request);
        copy = original;
    }
    EXPECT_EQ(copy.soapAction, "urn:a");
    EXPECT_EQ(copy.body, std::string(100, 'x'));
    EXPECT_EQ(request.body, copy.body);
}

TEST(Request, MovesItsBody)
{
    Request request;
    request.body = std::string(100, 'x');
    const char* const bytes = request.body.data();
    Request moved(std::move(request));
    EXPECT_EQ(moved.body.data(), bytes);
    Request assigned;
    assigned = std::move(moved);
    EXPECT_EQ(assigned.body.data(), bytes);
}
