#include "Workload.h"

#include "quillon/ssl/SSLContext.h"
#include "ssoClient/CallOptions.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"
#include "support/TestData.h"

#include <thread>

using namespace SsoClient;

namespace Soak {

namespace {

constexpr char SolutionUser[] = "service";
constexpr long MostPending = 64;

Quillon::Ref<Quillon::Ssl::SSLContext> MakeContext(const std::string& authorities)
{
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities = Quillon::Crypto::ParsePemCertificates(authorities);
    return CreateSSLContext(options);
}

/** The same service, which keeps what it refers to. */
ServicePtr Keeping(const ServicePtr& service, const Quillon::Ref<Quillon::Ssl::SSLContext>& context)
{
    return ServicePtr(service.get(), [service, context](SecurityTokenService*) {});
}

} // namespace

std::string GetUser(unsigned number)
{
    return "user" + std::to_string(number);
}

std::string GetPassword(unsigned number)
{
    return "secret of " + std::to_string(number);
}

void AddUsers(const Testing::DevStsProcess& server)
{
    std::string text = server.Read("users.json");
    const std::string before = "\"users\": [";
    std::string users;
    for (unsigned i = 0; i < Users; ++i) {
        users += "{\"name\": \"" + GetUser(i) + "@example.test\", \"password\": \"" + GetPassword(i)
                 + "\", \"givenName\": \"G\", \"surname\": \"S\", \"groups\": []},\n";
    }
    text.insert(text.find(before) + before.size(), users);
    server.Write("users.json", text);
}

ServicePtr MakeService(
    const std::string& url, const std::string& authorities, long long timeoutMs, bool reuses)
{
    SecurityTokenServiceConfig config;
    config.url = url;
    config.trustedCertificates = GetTestCertificates("sts");
    config.holderOfKeyConfig =
        HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()};
    const auto context = MakeContext(authorities);
    config.sslContext = context.get();
    ExchangeOptions options;
    options.timeoutMicroseconds = timeoutMs * 1000;
    const ServicePtr service = CreateSecurityTokenService(config, options);
    if (!reuses) {
        return Keeping(service, context);
    }
    CallOptions calls;
    calls.connectionReuse = ConnectionReuse();
    return Keeping(WithOptions(service, calls), context);
}

TokenSpec MakeSpec()
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    spec.renewable = true;
    return spec;
}

Workload::Workload(
    const std::vector<ServicePtr>& services, Kerberos kerberos, Ledger& ledger, unsigned seed)
    : _services(services)
    , _kerberos(std::move(kerberos))
    , _ledger(ledger)
    , _random(seed)
{}

unsigned Workload::Draw(unsigned count)
{
    return std::uniform_int_distribution<unsigned>(0, count - 1)(_random);
}

const SecurityTokenService& Workload::DrawService()
{
    return *_services[Draw(static_cast<unsigned>(_services.size()))];
}

void Workload::RunOne()
{
    if (_token == nullptr) {
        return AcquireByCertificate();
    }
    switch (Draw(16)) {
    case 0:
        return AcquireByCertificate();
    case 1:
        return Exchange();
    case 2:
        return Renew();
    case 3:
        return Validate();
    case 4:
        return _kerberos.keytab.empty() ? Verify() : Negotiate();
    case 5:
    case 6:
    case 7:
        return AcquireByPassword();
    case 8:
    case 9:
    case 10:
        return StartAcquisition();
    default:
        return Verify();
    }
}

/** Whatever comes of it, it is an exception of the library's own if it is one. */
template <class Action>
void Workload::Enter(const Action& action)
{
    _ledger.Begin();
    try {
        action();
        _ledger.NoteSuccess();
    } catch (const Quillon::Exception& error) {
        _ledger.NoteFailure(Quillon::GetClassName(error));
    } catch (const std::exception& error) {
        _ledger.NoteFailure("std::exception");
        _ledger.NoteProblem(std::string("not the library's exception: ") + error.what());
    }
}

void Workload::AcquireByPassword()
{
    const unsigned user = Draw(Users);
    Enter([&] {
        const TokenPtr token = DrawService().AcquireToken(
            GetUser(user) + "@example.test", GetPassword(user), MakeSpec());
        _ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), GetUser(user));
    });
}

void Workload::AcquireByCertificate()
{
    Enter([&] {
        TokenPtr token = DrawService().AcquireTokenByCertificate(MakeSpec());
        _ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), SolutionUser);
        _token = std::move(token);
    });
}

void Workload::Exchange()
{
    Enter([&] {
        const TokenPtr token = DrawService().AcquireTokenByToken(*_token, MakeSpec());
        _ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), SolutionUser);
    });
}

void Workload::Renew()
{
    Enter([&] {
        const TokenPtr token = DrawService().RenewToken(*_token, 300);
        _ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), SolutionUser);
    });
}

void Workload::Validate()
{
    Enter([&] {
        if (!DrawService().ValidateSubject(*_token)) {
            _ledger.NoteProblem("a valid subject is said to be none");
        }
    });
}

void Workload::Negotiate()
{
    Enter([&] {
        Gss::KerberosOptions options;
        options.url = _kerberos.url;
        options.keytab = _kerberos.keytab;
        options.principal = "alice";
        const auto handler = Gss::CreateKerberosNegotiationHandler(options);
        const TokenPtr token = DrawService().AcquireTokenByGSS(MakeSpec(), *handler);
        _ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), "alice");
    });
}

/** A copy is taken as it is; one with another octet is refused or says the same. */
void Workload::Verify()
{
    Enter([&] {
        static const auto& trusted = *new auto(GetTestCertificates("sts"));
        std::string xml = _token->ToXml();
        if (CreateSamlToken(xml, trusted)->GetId() != _token->GetId()) {
            _ledger.NoteProblem("a copy has another id");
        }
        xml[Draw(static_cast<unsigned>(xml.size()))] ^= 1;
        const TokenPtr changed = CreateSamlToken(xml, trusted);
        if (changed->GetId() != _token->GetId() || changed->GetSubject() != _token->GetSubject()
            || changed->GetEndDate() != _token->GetEndDate()) {
            _ledger.NoteProblem("accepted, though changed: " + xml);
        }
    });
}

void Workload::StartAcquisition()
{
    try {
        StartOne();
    } catch (const Quillon::InvalidStateException& error) { // the process is about to end
        _ledger.NoteFailure(Quillon::GetClassName(error));
        --_pending;
    }
}

void Workload::StartOne()
{
    while (_pending >= MostPending) {
        std::this_thread::yield();
    }
    const unsigned user = Draw(Users);
    ++_pending;
    _ledger.Begin();
    DrawService().AcquireTokenAsync(
        GetUser(user) + "@example.test",
        GetPassword(user),
        MakeSpec(),
        [this, user](const TokenPtr& token, const Quillon::Exception* error) {
            if (error != nullptr) {
                _ledger.NoteFailure(Quillon::GetClassName(*error));
            } else {
                _ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), GetUser(user));
                _ledger.NoteSuccess();
            }
            --_pending;
        });
}

void Workload::AwaitAsync() const
{
    while (_pending > 0) {
        std::this_thread::yield();
    }
}

} // namespace Soak
