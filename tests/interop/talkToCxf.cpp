// Talks to the endpoints of an Apache CXF token service as a caller would, and says of each call
// how it ended: interop_cxf URL CA.PEM SOAP [policies], where the URL is that of the endpoints for
// SOAP 11 or 12, and the last word says that they have policies, and more of them there are. Each
// line is "NAME: ok SUBJECT", "NAME: valid" or "NAME: CLASS: TEXT".

#include "quillon/ssl/SSLContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/SubjectMapping.h"
#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/TestData.h"

#include <fstream>
#include <iostream>
#include <sstream>

using namespace SsoClient;

namespace {

using TokenPtr = boost::shared_ptr<const SamlToken>;

std::string ReadFile(const char* name)
{
    const std::ifstream file(name, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

/** Runs `acquire` and says how it ended. @return the token, or null. */
template <class Acquire>
TokenPtr Say(const std::string& name, const Acquire& acquire)
{
    TokenPtr token;
    const std::string failure = GetFailure([&] { token = acquire(); });
    std::cout << name << ": " << (token ? "ok " + token->GetSubject().GetName() : failure) << "\n";
    return token;
}

/** The first value of an attribute of the assertion that the token was made of. */
std::string GetClaim(const SamlToken& token, const std::string& name)
{
    const AssertionAttribute* claim = GetAssertion(token)->FindAttribute(name);
    return claim == nullptr ? "none" : claim->values.front().text;
}

class Talk
{
public:
    Talk(std::string url, Quillon::Ssl::SSLContext* context, SoapVersion soap)
        : _url(std::move(url))
    {
        _config.sslContext = context;
        _config.trustedCertificates = GetTestCertificates("sts");
        _config.dialect = ServiceDialect::ApacheCxf();
        _config.dialect->soap = soap;
        _spec.tokenLifetimeSec = 1800; // what the service gives
    }

    void RunAll()
    {
        AskWithPassword();
        AskWithKey();
        PresentTokens();
        ActForOthers();
        ValidateAndRenew();
    }

    void RunWithPolicies() const
    {
        Present("token as a SAML token", WithKey("saml"), *_bound);
        SecurityTokenServiceConfig config = At("addressed");
        Password("password with addressing", config, _spec);
        config.dialect->addressing = false;
        Password("password without addressing", config, _spec);
        Certificate("certificate in an asymmetric binding", WithKey("asymmetric"), _spec);
        Validate("validate in an asymmetric binding", WithKey("asymmetric"), *_bearer);
        Present("on behalf of in an asymmetric binding", OnBehalfOf("asymmetric"), *_bearer);
    }

private:
    SecurityTokenServiceConfig At(const std::string& endpoint) const
    {
        SecurityTokenServiceConfig config = _config;
        config.url = _url + endpoint;
        return config;
    }

    SecurityTokenServiceConfig WithKey(const std::string& endpoint) const
    {
        SecurityTokenServiceConfig config = At(endpoint);
        config.holderOfKeyConfig =
            HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()};
        return config;
    }

    TokenPtr Password(
        const std::string& name,
        const SecurityTokenServiceConfig& config,
        const TokenSpec& spec,
        const char* password = "secret") const
    {
        return Say(name, [&] {
            return CreateSecurityTokenService(config)->AcquireToken("alice", password, spec);
        });
    }

    TokenPtr Certificate(
        const std::string& name,
        const SecurityTokenServiceConfig& config,
        const TokenSpec& spec) const
    {
        return Say(name, [&] {
            return CreateSecurityTokenService(config)->AcquireTokenByCertificate(spec);
        });
    }

    void Present(
        const std::string& name,
        const SecurityTokenServiceConfig& config,
        const SamlToken& token) const
    {
        Say(name,
            [&] { return CreateSecurityTokenService(config)->AcquireTokenByToken(token, _spec); });
    }

    void AskWithPassword()
    {
        _bearer = Password("password", At("password"), _spec);
        Password("password wrong", At("password"), _spec, "wrong");
        Password("password bound to a key", WithKey("password-and-certificate"), _spec);
        TokenSpec spec = _spec;
        spec.audienceRestriction = {"urn:one"};
        Password("password for an audience", At("password"), spec);
        spec.audienceRestriction = {"urn:one", "urn:two"};
        Password("password for two audiences", At("password"), spec);
        spec = _spec;
        spec.tokenLifetimeSec = 300;
        Password("password for less time", At("password"), spec);
        SecurityTokenServiceConfig config = At("password");
        config.dialect->claims = {{"urn:claim", true}};
        const TokenPtr token = Password("password with claims", config, _spec);
        std::cout << "claim: " << (token ? GetClaim(*token, "urn:claim") : "no token") << "\n";
        config.dialect = boost::none;
        Password("password without a dialect", config, _spec);
        Password("password where a certificate is wanted", At("certificate"), _spec);
        const FixedClock clock("2020-01-01T00:00:00Z");
        Password("password of long ago", At("password"), _spec);
    }

    void AskWithKey()
    {
        _bound = Certificate("certificate", WithKey("certificate"), _spec);
        SecurityTokenServiceConfig config = WithKey("certificate");
        config.dialect->useKey = UseKeyForm::REFERENCE;
        Certificate("certificate by reference", config, _spec);
        config.dialect->useKey = UseKeyForm::EMPTY;
        Certificate("certificate not named", config, _spec);
        Certificate("certificate where a password is wanted", WithKey("password"), _spec);
        Certificate("certificate where a token is wanted", WithKey("token"), _spec);
        config = WithKey("certificate");
        config.dialect->writesFalseDelegatable = true;
        Certificate("certificate with a flag", config, _spec);
        config = WithKey("certificate");
        config.holderOfKeyConfig =
            HolderOfKeyConfig{GetTestKey("foreign"), GetTestCertificates("foreign").front()};
        Certificate("certificate of a stranger", config, _spec);
    }

    void PresentTokens() const
    {
        Present("token", WithKey("token"), *_bound);
        SecurityTokenServiceConfig config = WithKey("token");
        config.dialect->hyphenInSamlTokenType = false;
        Present("token without hyphen", config, *_bound);
        config = WithKey("token");
        config.dialect->useKeyWithPresentedToken = false;
        Present("token without a key", config, *_bound);
        Present("token that was changed", WithKey("token"), Change(*_bound, "solution-user"));
    }

    /** The same token with the first letter of `word` in another case. */
    static FakeSamlToken Change(const SamlToken& token, const std::string& word)
    {
        FakeSamlToken changed;
        changed.id = token.GetId();
        changed.xml = token.ToXml();
        changed.xml[changed.xml.find(word)] ^= ' ';
        return changed;
    }

    SecurityTokenServiceConfig OnBehalfOf(const std::string& endpoint) const
    {
        SecurityTokenServiceConfig config = WithKey(endpoint);
        config.dialect->presentedToken = PresentedTokenForm::ON_BEHALF_OF;
        return config;
    }

    void ActForOthers() const
    {
        Present(
            "on behalf of what was changed", OnBehalfOf("certificate"), Change(*_bearer, "alice"));
        for (const auto form : {PresentedTokenForm::ON_BEHALF_OF, PresentedTokenForm::ACT_AS}) {
            const std::string name =
                form == PresentedTokenForm::ACT_AS ? "to act as" : "on behalf of";
            SecurityTokenServiceConfig config = WithKey("certificate");
            config.dialect->presentedToken = form;
            Present("certificate " + name, config, *_bearer);
            config = At("password");
            config.credentials = PasswordCredentials("alice", "secret");
            config.dialect->presentedToken = form;
            Present("password " + name, config, *_bearer);
        }
    }

    static void Validate(
        const std::string& name, const SecurityTokenServiceConfig& config, const SamlToken& token)
    {
        bool isValid = false;
        const std::string failure = GetFailure(
            [&] { isValid = CreateSecurityTokenService(config)->ValidateSubject(token); });
        std::cout << name << ": " << (failure == "none" ? (isValid ? "valid" : "invalid") : failure)
                  << "\n";
    }

    void Renew(const std::string& name, const SamlToken& token) const
    {
        Say(name, [&] {
            return CreateSecurityTokenService(WithKey("certificate"))->RenewToken(token, 1800);
        });
    }

    void ValidateAndRenew() const
    {
        Validate("validate with a key", WithKey("certificate"), *_bearer);
        Validate("validate what was changed", WithKey("certificate"), Change(*_bearer, "alice"));
        SecurityTokenServiceConfig config = At("password");
        Validate("validate without credentials", config, *_bearer);
        config.credentials = PasswordCredentials("alice", "secret");
        Validate("validate with a password", config, *_bearer);
        TokenSpec spec = _spec;
        spec.renewable = true;
        const TokenPtr token =
            Certificate("certificate for a renewable token", WithKey("certificate"), spec);
        Renew("renew", *token);
        Renew("renew what is not renewable", *_bound);
    }

    const std::string _url;
    SecurityTokenServiceConfig _config;
    TokenSpec _spec;
    TokenPtr _bearer;
    TokenPtr _bound;
};

} // namespace

int main(int argc, char** argv)
{
    if (argc != 4 && argc != 5) {
        std::cerr << "usage: interop_cxf URL CA.PEM SOAP [policies]\n";
        return 2;
    }
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities = Quillon::Crypto::ParsePemCertificates(ReadFile(argv[2]));
    const auto context = Quillon::Ssl::CreateSSLContext(options);
    const bool isSoap12 = std::string(argv[3]) == "12";
    Talk talk(argv[1], context.get(), isSoap12 ? SoapVersion::SOAP_1_2 : SoapVersion::SOAP_1_1);
    talk.RunAll();
    if (argc == 5) {
        talk.RunWithPolicies();
    }
    return 0;
}
