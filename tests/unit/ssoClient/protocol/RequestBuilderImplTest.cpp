#include "ssoClient/RequestBuilderImpl.h"

#include "quillon/Exceptions.h"
#include "quillon/xml/Parser.h"
#include "support/FixedClock.h"

#include <gmock/gmock.h>

using namespace SsoClient;
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

std::string GetMessageOfRefusal(const TokenSpec& spec)
{
    try {
        BuildUserPass(spec);
    } catch (const Quillon::InvalidArgumentException& error) {
        return error.what();
    }
    return "accepted";
}

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
    const Quillon::Ref<Quillon::Xml::DocumentHandler> handler =
        Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(std::string_view(request.body));
    const Quillon::Xml::ElementNode* const token = handler->GetDocument()
                                                       ->GetRootElement()
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
    EXPECT_EQ(
        GetMessageOfRefusal(SpecWithLifetime(0)),
        "Invalid argument : Token lifetime must be positive");
    EXPECT_EQ(
        GetMessageOfRefusal(SpecWithLifetime(-1)),
        "Invalid argument : Token lifetime must be positive");
    EXPECT_EQ(GetMessageOfRefusal(SpecWithLifetime(1)), "accepted");
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

TEST(BuildUserPassTokenRequest, WithIdentityAndBearerConfirmationIsUnsignedBearer)
{
    TokenSpec spec = SpecWithLifetime(300);
    for (const int confirmation : {1, 7}) {
        spec.confirmation = static_cast<TokenSpec::Confirmation>(confirmation);
        const Request request = BuildUserPass(spec, HolderOfKeyConfig());
        EXPECT_THAT(request.body, HasSubstr("<wst:KeyType>" WST "/Bearer</wst:KeyType>"));
        EXPECT_THAT(request.body, Not(HasSubstr("Signature")));
    }
}

TEST(BuildUserPassTokenRequest, WithIdentityAndDelegationIsUnsignedHolderOfKey)
{
    TokenSpec spec = SpecWithLifetime(300);
    spec.delegateTo = "proxy";
    const Request request = BuildUserPass(spec, HolderOfKeyConfig());
    EXPECT_THAT(request.body, HasSubstr("<wst:KeyType>" WST "/PublicKey</wst:KeyType>"));
    EXPECT_THAT(request.body, Not(HasSubstr("Signature")));
    EXPECT_THAT(request.body, Not(HasSubstr("UseKey")));
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

TEST(Request, WipesItsBodyAtTheEnd)
{
    // Placed by hand, so that the short body can be looked at inside the object afterwards.
    alignas(Request) unsigned char memory[sizeof(Request)];
    auto* const request = new (memory) Request;
    request->body = "s3cret";
    const auto* const text = reinterpret_cast<const unsigned char*>(request->body.data());
    ASSERT_GE(text, memory);
    ASSERT_LT(text, memory + sizeof(memory));
    const std::size_t offset = static_cast<std::size_t>(text - memory);
    request->~Request();
    const volatile unsigned char* const left = memory + offset;
    for (std::size_t i = 0; i < 6; ++i) {
        EXPECT_EQ(left[i], 0) << i;
    }
}
