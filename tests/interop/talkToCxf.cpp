// Talks to the endpoints of an Apache CXF token service as a caller would, and says of each call
// how it ended: interop_cxf URL CA.PEM SOAP, where the URL is that of the endpoints for SOAP 11
// or 12. Each line is "NAME: ok SUBJECT", "NAME: valid" or "NAME: CLASS: TEXT".

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
        Password("password with claims", config, _spec);
        config.dialect = boost::none;
        Password("password without a dialect", config, _spec);
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
        FakeSamlToken changed;
        changed.id = _bound->GetId();
        changed.xml = _bound->ToXml();
        changed.xml.replace(changed.xml.find("solution-user"), 8, "SOLUTION");
        Present("token that was changed", WithKey("token"), changed);
    }

    void ActForOthers() const
    {
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

    void Validate(const std::string& name, const SecurityTokenServiceConfig& config) const
    {
        bool isValid = false;
        const std::string failure = GetFailure(
            [&] { isValid = CreateSecurityTokenService(config)->ValidateSubject(*_bearer); });
        std::cout << name << ": " << (failure == "none" ? (isValid ? "valid" : "invalid") : failure)
                  << "\n";
    }

    void ValidateAndRenew() const
    {
        Validate("validate with a key", WithKey("certificate"));
        SecurityTokenServiceConfig config = At("password");
        Validate("validate without credentials", config);
        config.credentials = PasswordCredentials("alice", "secret");
        Validate("validate with a password", config);
        TokenSpec spec = _spec;
        spec.renewable = true;
        const TokenPtr token =
            Certificate("certificate for a renewable token", WithKey("certificate"), spec);
        Say("renew", [&] {
            return CreateSecurityTokenService(WithKey("certificate"))->RenewToken(*token, 1800);
        });
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
    if (argc != 4) {
        std::cerr << "usage: interop_cxf URL CA.PEM SOAP\n";
        return 2;
    }
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities = Quillon::Crypto::ParsePemCertificates(ReadFile(argv[2]));
    const auto context = Quillon::Ssl::CreateSSLContext(options);
    const bool isSoap12 = std::string(argv[3]) == "12";
    Talk(argv[1], context.get(), isSoap12 ? SoapVersion::SOAP_1_2 : SoapVersion::SOAP_1_1).RunAll();
    return 0;
}
