#include "KeepSource.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "KerberosOptions.h"
#include "PresentedToken.h"
#include "Secret.h"

#include <sys/stat.h>

#include <memory>

namespace {

using Service = boost::shared_ptr<const SsoClient::SecurityTokenService>;
using Source = boost::shared_ptr<SsoClient::TokenSource>;

constexpr char ByPassword[] = "password";
constexpr char ByCertificate[] = "certificate";
constexpr char ByGss[] = "gss";
constexpr char ByExchange[] = "exchange";

std::string CheckMethod(const std::string& text)
{
    return text == ByPassword || text == ByCertificate || text == ByGss || text == ByExchange
               ? ""
               : "`" + text + "' is not password, certificate, gss or exchange";
}

void Require(bool condition, const std::string& text)
{
    if (!condition) {
        throw UsageError(text);
    }
}

/** Whether what the file holds may be another thing the next time: not that of a pipe. */
bool CanBeReadAgain(const std::string& file)
{
    struct stat status = {};
    return !file.empty() && file != "-" && ::stat(file.c_str(), &status) == 0
           && S_ISREG(status.st_mode);
}

/** Reads a password again for each logging on, so that it can be changed; or else remembers it. */
class PasswordReader
{
public:
    explicit PasswordReader(const PasswordOptions& options)
        : _options(options)
        , _readsAgain(CanBeReadAgain(options.file))
        , _password(std::make_shared<Quillon::Wiped>())
    {
        GetPassword(options.file, *_password);
        if (_readsAgain) {
            _password->Clear(); // it was only tried
        }
    }

    SsoClient::PasswordCredentials operator()() const
    {
        if (!_readsAgain) {
            return {_options.user, _password->Get()};
        }
        Quillon::Wiped password;
        GetPassword(_options.file, password);
        return {_options.user, password.Get()};
    }

private:
    PasswordOptions _options;
    bool _readsAgain;
    std::shared_ptr<Quillon::Wiped> _password;
};

/** The user's token may be another one each time, so that nothing is renewed that came of it. */
SsoClient::TokenFunction MakeExchange(
    const KeepSourceOptions& options, const CertificateList& trusted, const Service& service)
{
    return [options, trusted, service] {
        const auto presented = ReadToken(options.presentedFile, trusted, options.service);
        return service->AcquireTokenByToken(*presented, options.token.spec);
    };
}

SsoClient::NegotiationHandlerFactory MakeHandlerFactory(const KeepSourceOptions& options)
{
    SsoClient::Gss::KerberosOptions kerberos = options.kerberos;
    kerberos.url = options.service.url;
    return [kerberos] { return SsoClient::Gss::CreateKerberosNegotiationHandler(kerberos); };
}

} // namespace

void KeepSourceOptions::AddTo(const Command& owner, ExchangeRecord& record)
{
    owner.AddOption("--method", method, "How to get tokens: password, certificate, gss or exchange")
        .Required()
        .Check(CheckMethod)
        .ValueName("NAME");
    service.AddTo(owner, record);
    password.AddTo(owner.InGroup("With --method password"));
    owner.InGroup("With --method exchange")
        .AddOption("--token", presentedFile, "The token to present, read again each time")
        .Check(CheckNotEmpty)
        .ValueName("FILE");
    AddKerberosTo(owner.InGroup("With --method gss"), kerberos);
    identity.AddTo(owner);
    token.AddTo(owner);
    service.dialect.AddIssueTo(owner, token.spec);
    token.AddBearerTo(owner);
}

/** A user and a key may come with a profile, and are nobody's mistake where they are not used. */
void KeepSourceOptions::RequireFitting() const
{
    const bool needsKey = method == ByCertificate || method == ByExchange;
    const bool isBearer = token.spec.confirmation == SsoClient::TokenSpec::CONFIRMATION_BEARER;
    const bool hasKerberos = !kerberos.service.empty() || !kerberos.ccache.empty()
                             || !kerberos.keytab.empty() || !kerberos.principal.empty();
    Require(method != ByPassword || !password.user.empty(), "--method password needs --user");
    Require(
        method == ByPassword || password.file.empty(),
        "--password-file is for --method password alone");
    Require(!needsKey || identity.key, "--method " + method + " needs --key and --cert");
    Require(
        (method == ByExchange) == !presentedFile.empty(),
        method == ByExchange ? "--method exchange needs --token"
                             : "--token is for --method exchange alone");
    Require(presentedFile != "-", "--token: standard input cannot be read again");
    Require(
        method == ByGss || !hasKerberos,
        "--service, --ccache, --keytab and --principal are for --method gss alone");
    Require(method != ByCertificate || !isBearer, "--bearer is not for --method certificate");
}

Source KeepSourceOptions::Make(SsoClient::TokenSourceOptions source) const
{
    RequireFitting();
    const CertificateList trusted = ReadCertificates(service.trustFiles);
    const auto holder = identity.Read();
    if (holder) {
        source.identity = holder->certificate;
    }
    const Service asked = service.CreateService(trusted, holder);
    if (method == ByPassword) {
        return CreatePasswordTokenSource(asked, PasswordReader(password), token.spec, source);
    }
    if (method == ByCertificate) {
        return CreateCertificateTokenSource(asked, token.spec, source);
    }
    if (method == ByGss) {
        return CreateNegotiationTokenSource(asked, MakeHandlerFactory(*this), token.spec, source);
    }
    return CreateTokenSource(MakeExchange(*this, trusted, asked), source);
}
