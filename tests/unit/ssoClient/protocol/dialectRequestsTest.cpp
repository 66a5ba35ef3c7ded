#include "ssoClient/protocol/RequestBuilderImpl.h"

#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "support/Xmlsec1.h"

#include <gmock/gmock.h>

#include <regex>

using namespace SsoClient;
using testing::HasSubstr;
using testing::Not;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WST2005 "http://schemas.xmlsoap.org/ws/2005/02/trust"
#define WSA "http://www.w3.org/2005/08/addressing"

constexpr char Url[] = "https://sts.example.com/trust?a&b";

/** Requests of one dialect. */
class DialectRequest : public testing::Test
{
protected:
    DialectRequest()
    {
        form.url = Url;
        holderOfKey.id = "_7d1f6a52-9c61";
        holderOfKey.xml = ReadTestData("tokens/accepted/holder-of-key.xml");
        holderOfKey.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    }

    RequestBuilderImpl WithIdentity() const
    {
        return RequestBuilderImpl(
            HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()}, form);
    }

    RequestBuilderImpl WithoutIdentity() const { return RequestBuilderImpl(boost::none, form); }

    Request Password() const
    {
        Request request;
        WithoutIdentity().BuildUserPassTokenRequest("jdoe", "s3cret", spec, request);
        return request;
    }

    std::string Certificate() const
    {
        Request request;
        WithIdentity().BuildCertificateTokenRequest(spec, request);
        return request.body;
    }

    std::string Exchange(const RequestBuilderImpl& builder) const
    {
        Request request;
        builder.BuildExchangeTokenRequest(holderOfKey, spec, request);
        return request.body;
    }

    std::string Exchange() const { return Exchange(WithIdentity()); }

    std::string Validate(const RequestBuilderImpl& builder) const
    {
        Request request;
        builder.BuildValidateSubjectRequest(holderOfKey, request);
        return request.body;
    }

    std::string Renew() const
    {
        Request request;
        WithIdentity().BuildRenewRequest(holderOfKey, 600, request);
        return request.body;
    }

    RequestForm form;
    TokenSpec spec;
    FakeSamlToken holderOfKey;
    FixedClock clock{"2011-07-05T09:03:07.042Z"};
};

std::string GetBase64(const std::string& certificate)
{
    std::string pem = ReadTestData("keys/" + certificate + "-cert.pem");
    pem = std::regex_replace(pem, std::regex("-----[A-Z ]+-----|\n"), "");
    return pem;
}

int Count(const std::string& text, const std::string& part)
{
    int count = 0;
    for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

constexpr char Reference[] = "<ds:Reference ";
constexpr char UserName[] = "<wsse:Username>jdoe</wsse:Username>";
constexpr char ProofSignature[] = "Id=\"holderOfKeyProofSignature\"";

} // namespace

TEST_F(DialectRequest, Soap12IsAnotherEnvelope)
{
    form.dialect.soap = SoapVersion::SOAP_1_2;
    EXPECT_THAT(
        Password().body,
        testing::StartsWith(
            "<soapenv:Envelope xmlns:soapenv=\"http://www.w3.org/2003/05/soap-envelope\">"));
    EXPECT_TRUE(Xmlsec1Verifies(Certificate(), "client", RequestSignature));
}

TEST_F(DialectRequest, TrustOf2005HasItsOwnNames)
{
    form.dialect.trust = TrustVersion::WS_TRUST_2005_02;
    const Request request = Password();
    EXPECT_EQ(request.soapAction, WST2005 "/RST/Issue");
    EXPECT_THAT(
        request.body,
        HasSubstr("<wst:RequestSecurityToken xmlns:wst=\"" WST2005 "\">"
                  "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
                  "<wst:RequestType>" WST2005 "/Issue</wst:RequestType><wst:KeyType>"
                  "http://schemas.xmlsoap.org/ws/2005/05/identity/NoProofKey</wst:KeyType>"));
    EXPECT_THAT(Certificate(), HasSubstr("<wst:KeyType>" WST2005 "/PublicKey</wst:KeyType>"));
    EXPECT_THAT(Renew(), HasSubstr("<wst:RequestType>" WST2005 "/Renew<"));
    EXPECT_THAT(
        Validate(WithoutIdentity()),
        HasSubstr("<wst:TokenType>" WST2005 "/RSTR/Status</wst:TokenType>"
                  "<wst:RequestType>" WST2005 "/Validate<"));
    EXPECT_THAT(Renew() + Password().body + Certificate(), Not(HasSubstr(WST)));
}

TEST_F(DialectRequest, AnswersALegInTheNamespaceOfItsTrust)
{
    form.dialect.trust = TrustVersion::WS_TRUST_2005_02;
    Request request;
    WithoutIdentity().BuildContinuedSPNegoRequest("urn:context", Leg{1}, request);
    EXPECT_EQ(request.soapAction, WST2005 "/RSTR/Issue");
    EXPECT_THAT(request.body, HasSubstr("<soapenv:Body xmlns:wst=\"" WST2005 "\">"));
}

// [WSA-CORE 3.2]
TEST_F(DialectRequest, AddressingStandsBeforeTheSecurityHeader)
{
    form.dialect.addressing = true;
    const std::string uuid = "[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}";
    const std::regex headers(
        "<soapenv:Header><wsa:Action xmlns:wsa=\"" WSA "\">" WST "/RST/Issue</wsa:Action>"
        "<wsa:MessageID xmlns:wsa=\"" WSA "\">urn:uuid:"
        + uuid
        + "</wsa:MessageID>"
          "<wsa:ReplyTo xmlns:wsa=\"" WSA "\"><wsa:Address>" WSA "/anonymous</wsa:Address>"
          "</wsa:ReplyTo><wsa:To xmlns:wsa=\"" WSA "\">https://sts.example.com/trust\\?a&amp;b"
          "</wsa:To><wsse:Security ");
    EXPECT_TRUE(std::regex_search(Password().body, headers)) << Password().body;
}

TEST_F(DialectRequest, AddressingNamesEveryMessageAnew)
{
    form.dialect.addressing = true;
    EXPECT_NE(Password().body, Password().body);
}

TEST_F(DialectRequest, AddressingIsSignedWhereTheMessageIs)
{
    EXPECT_EQ(Count(Certificate(), Reference), 2);
    form.dialect.addressing = true;
    const std::string request = Certificate();
    EXPECT_EQ(Count(request, Reference), 6);
    EXPECT_TRUE(Xmlsec1Verifies(request, "client", RequestSignature));
    for (const char* const name : {"Action", "MessageID", "ReplyTo", "To"}) {
        const std::string tag = std::string("</wsa:") + name + ">";
        std::string changed = request;
        changed.insert(changed.find(tag), name == std::string("ReplyTo") ? "<x/>" : "x");
        EXPECT_FALSE(Xmlsec1Verifies(changed, "client", RequestSignature)) << name;
    }
}

TEST_F(DialectRequest, SignatureMayCoverTimestampAndToAlone)
{
    form.dialect.addressing = true;
    form.dialect.signatureScope = SignatureScope::TIMESTAMP_AND_TO;
    const std::string request = Certificate();
    EXPECT_EQ(Count(request, Reference), 2);
    EXPECT_TRUE(Xmlsec1Verifies(request, "client", RequestSignature));
    for (const char* const tag : {"</wsa:To>", "</wsu:Expires></wsu:Timestamp>"}) {
        std::string changed = request;
        changed.insert(changed.find(tag), "x");
        EXPECT_FALSE(Xmlsec1Verifies(changed, "client", RequestSignature)) << tag;
    }
}

TEST_F(DialectRequest, AppliesToNamesTheOneAudience)
{
    form.dialect.audienceForm = AudienceForm::APPLIES_TO;
    spec.audienceRestriction = {"https://rp.example.com/?a&b"};
    EXPECT_THAT(
        Password().body,
        HasSubstr("<wsp:AppliesTo xmlns:wsa=\"" WSA
                  "\" xmlns:wsp=\"http://schemas.xmlsoap.org/ws/2004/09/policy\">"
                  "<wsa:EndpointReference><wsa:Address>https://rp.example.com/?a&amp;b"
                  "</wsa:Address></wsa:EndpointReference></wsp:AppliesTo>"));
    EXPECT_THAT(Password().body, Not(HasSubstr("Participants")));
    spec.audienceRestriction.clear();
    EXPECT_THAT(Password().body, Not(HasSubstr("AppliesTo")));
}

TEST_F(DialectRequest, AppliesToHasNoRoomForASecondAudience)
{
    spec.audienceRestriction = {"urn:a", "urn:b"};
    EXPECT_EQ(GetFailure([this] { Password(); }), "none");
    form.dialect.audienceForm = AudienceForm::APPLIES_TO;
    EXPECT_EQ(
        GetFailure([this] { Password(); }),
        "InvalidArgumentException: Invalid argument : The service takes one audience, and 2 are "
        "asked for");
}

// [WST13 4.1]
TEST_F(DialectRequest, ClaimsAreAskedForInTheirDialect)
{
    form.dialect.claims = {{"urn:claim?a&b", false}, {"urn:other", true}};
    EXPECT_THAT(
        Password().body,
        HasSubstr("<wst:Claims Dialect=\"http://schemas.xmlsoap.org/ws/2005/05/identity\" "
                  "xmlns:ic=\"http://schemas.xmlsoap.org/ws/2005/05/identity\">"
                  "<ic:ClaimType Uri=\"urn:claim?a&amp;b\"/>"
                  "<ic:ClaimType Optional=\"true\" Uri=\"urn:other\"/></wst:Claims>"));
}

TEST_F(DialectRequest, FlagsThatSayNoMayBeLeftOut)
{
    form.dialect.writesFalseDelegatable = false;
    EXPECT_THAT(Password().body, Not(HasSubstr("Delegatable")));
    EXPECT_THAT(Password().body, HasSubstr("<wst:Renewing Allow=\"false\""));
    form.dialect.writesFalseDelegatable = true;
    form.dialect.writesFalseRenewing = false;
    EXPECT_THAT(Password().body, HasSubstr("<wst:Delegatable>false<"));
    EXPECT_THAT(Password().body, Not(HasSubstr("Renewing")));
}

TEST_F(DialectRequest, FlagsThatSayYesAreNeverLeftOut)
{
    form.dialect.writesFalseDelegatable = false;
    form.dialect.writesFalseRenewing = false;
    spec.delegable = true;
    spec.renewable = true;
    EXPECT_THAT(Password().body, HasSubstr("<wst:Delegatable>true<"));
    EXPECT_THAT(Password().body, HasSubstr("<wst:Renewing Allow=\"true\""));
}

// [WST13 9.2]
TEST_F(DialectRequest, UseKeyMayHoldTheCertificate)
{
    form.dialect.useKey = UseKeyForm::CERTIFICATE;
    EXPECT_THAT(
        Certificate(),
        HasSubstr(
            "<wst:UseKey Sig=\"holderOfKeyProofSignature\">"
            "<ds:KeyInfo xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:X509Data>"
            "<ds:X509Certificate>"
            + GetBase64("client")
            + "</ds:X509Certificate></ds:X509Data></ds:KeyInfo></wst:UseKey>"));
    EXPECT_THAT(Password().body, Not(HasSubstr("UseKey")));
}

TEST_F(DialectRequest, UseKeyMayReferToTheCertificateInTheHeader)
{
    form.dialect.useKey = UseKeyForm::REFERENCE;
    EXPECT_TRUE(std::regex_search(
        Certificate(),
        std::regex("<wst:UseKey Sig=\"holderOfKeyProofSignature\"><wsse:SecurityTokenReference "
                   "[^>]*><wsse:Reference URI=\"#holderOfKeyCertificate\" [^>]*/>"
                   "</wsse:SecurityTokenReference></wst:UseKey>")));
}

TEST_F(DialectRequest, ExchangeSaysWhatKeyToUseIfTheDialectWantsIt)
{
    form.dialect.useKey = UseKeyForm::CERTIFICATE;
    EXPECT_THAT(Exchange(), Not(HasSubstr("UseKey")));
    form.dialect.useKeyWithPresentedToken = true;
    EXPECT_THAT(Exchange(), HasSubstr("<wst:UseKey "));
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    EXPECT_THAT(Exchange(), Not(HasSubstr("UseKey")));
}

TEST_F(DialectRequest, ExchangeRefersToTheTokenItPresents)
{
    form.dialect.useKey = UseKeyForm::REFERENCE;
    form.dialect.useKeyWithPresentedToken = true;
    EXPECT_TRUE(std::regex_search(
        Exchange(),
        std::regex("<wst:UseKey Sig=\"holderOfKeyProofSignature\"><wsse:SecurityTokenReference "
                   "[^>]*><wsse:KeyIdentifier [^>]*>_7d1f6a52-9c61</wsse:KeyIdentifier>")));
}

// [BSP 1.1 R6617]
TEST_F(DialectRequest, TokenTypeOfAReferenceMayHaveItsHyphen)
{
    const std::string oasis = "wsse11:TokenType=\"http://docs.oasis-open.org/wss/oasis-wss-saml-";
    EXPECT_THAT(Exchange(), HasSubstr(oasis + "tokenprofile-1.1#SAMLV2.0\""));
    form.dialect.hyphenInSamlTokenType = true;
    EXPECT_THAT(Exchange(), HasSubstr(oasis + "token-profile-1.1#SAMLV2.0\""));
    EXPECT_TRUE(Xmlsec1Verifies(Exchange(), "client", RequestSignature));
}

// [WST13 9.1]
TEST_F(DialectRequest, PresentsATokenOnBehalfOfItsSubject)
{
    form.dialect.presentedToken = PresentedTokenForm::ON_BEHALF_OF;
    const std::string request = Exchange();
    EXPECT_THAT(
        request,
        HasSubstr(
            "<wst:OnBehalfOf>" + holderOfKey.xml
            + "</wst:OnBehalfOf>"
              "</wst:RequestSecurityToken>"));
    EXPECT_EQ(Count(request, "<saml:Assertion "), 1);
    EXPECT_THAT(request, HasSubstr("URI=\"#holderOfKeyCertificate\""));
    EXPECT_TRUE(Xmlsec1Verifies(request, "client", RequestSignature));
    EXPECT_TRUE(Xmlsec1Verifies(request, "sts", AssertionSignature));
}

// [WST14 9.1]
TEST_F(DialectRequest, PresentsATokenToActAsItsSubject)
{
    form.dialect.presentedToken = PresentedTokenForm::ACT_AS;
    EXPECT_THAT(
        Exchange(),
        HasSubstr(
            "<wst14:ActAs xmlns:wst14=\"http://docs.oasis-open.org/ws-sx/ws-trust/200802\">"
            + holderOfKey.xml + "</wst14:ActAs></wst:RequestSecurityToken>"));
}

TEST_F(DialectRequest, PasswordSaysWhoActsForAnother)
{
    form.dialect.presentedToken = PresentedTokenForm::ON_BEHALF_OF;
    form.credentials = PasswordCredentials("jdoe", "s3cret");
    const std::string bearer = Exchange(WithoutIdentity());
    EXPECT_THAT(bearer, HasSubstr(UserName));
    EXPECT_THAT(bearer, Not(HasSubstr(ProofSignature)));
    const std::string bound = Exchange(WithIdentity());
    EXPECT_THAT(bound, HasSubstr(UserName));
    EXPECT_THAT(bound, HasSubstr(ProofSignature));
}

TEST_F(DialectRequest, NobodyActsForAnotherWithoutSayingWhoItIs)
{
    form.dialect.presentedToken = PresentedTokenForm::ON_BEHALF_OF;
    EXPECT_EQ(
        GetFailure([this] { Exchange(WithoutIdentity()); }),
        "InvalidStateException: No HolderOfKeyConfig provided. Unable to acquire token by token");
}

TEST_F(DialectRequest, PasswordAloneDoesNotPresentATokenInTheHeader)
{
    form.credentials = PasswordCredentials("jdoe", "s3cret");
    EXPECT_EQ(
        GetFailure([this] { Exchange(WithoutIdentity()); }),
        "InvalidStateException: No HolderOfKeyConfig provided. Unable to acquire token by token");
    EXPECT_THAT(Exchange(), Not(HasSubstr(UserName)));
}

TEST_F(DialectRequest, ValidatesWithCredentialsIfTheDialectWantsThem)
{
    form.credentials = PasswordCredentials("jdoe", "s3cret");
    EXPECT_THAT(Validate(WithIdentity()), Not(HasSubstr(UserName)));
    form.dialect.validatesWithCredentials = true;
    EXPECT_THAT(Validate(WithIdentity()), HasSubstr(UserName));
    EXPECT_THAT(Validate(WithIdentity()), Not(HasSubstr(ProofSignature)));
    form.credentials = boost::none;
    EXPECT_TRUE(Xmlsec1Verifies(Validate(WithIdentity()), "client", RequestSignature));
    EXPECT_THAT(Validate(WithoutIdentity()), Not(HasSubstr(ProofSignature)));
}

TEST_F(DialectRequest, RenewsWithCredentials)
{
    EXPECT_THAT(Renew(), Not(HasSubstr(UserName)));
    form.credentials = PasswordCredentials("jdoe", "s3cret");
    EXPECT_THAT(Renew(), HasSubstr(UserName));
    EXPECT_TRUE(Xmlsec1Verifies(Renew(), "client", RequestSignature));
}

TEST_F(DialectRequest, NegotiatesInTheDialect)
{
    form.dialect = ServiceDialect::ApacheCxf();
    Request request;
    WithIdentity().BuildInitialSPNegoRequest(spec, Leg{1}, request);
    EXPECT_THAT(request.body, HasSubstr("<wsa:Action "));
    EXPECT_THAT(request.body, HasSubstr("<ds:X509Certificate>" + GetBase64("client")));
    EXPECT_THAT(request.body, Not(HasSubstr("Delegatable")));
    EXPECT_TRUE(Xmlsec1Verifies(request.body, "client", RequestSignature));
}

TEST(PasswordCredentials, AreCopiedAndAssigned)
{
    PasswordCredentials one("jdoe", "s3cret");
    const PasswordCredentials copy = one;
    one = PasswordCredentials("other", "else");
    EXPECT_EQ(copy.userName + "/" + copy.password, "jdoe/s3cret");
    EXPECT_EQ(one.userName + "/" + one.password, "other/else");
}
