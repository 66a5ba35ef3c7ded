#include "Operations.h"

#include "hostile/TokenTable.h"
#include "quillon/ssl/SSLContext.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Descriptions.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "unit/ssoClient/assertion/AssertionTable.h"

#include <array>
#include <cstring>
#include <semaphore>
#include <set>

using namespace SsoClient;

namespace Exhaustion {

namespace {

Operation MakeParsing(const std::string& file)
{
    const std::string text = ReadTestData(file);
    return {
        "parsing of " + file,
        [text] {
            const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
            Quillon::Xml::CreateXMLParser(handler.get())->Parse(text);
            return handler->GetDocument()->GetRootElement() != nullptr ? "a document" : "nothing";
        },
        "a document"};
}

Operation MakeJudgement(const HostileTests::TokenCase& row)
{
    const std::string xml = HostileTests::ReadToken(row);
    const HostileTests::Conditions conditions = HostileTests::GetConditions(row);
    Operation operation;
    operation.name = "verifying " + row.file;
    operation.run = [xml, conditions] {
        const FixedClock clock(Quillon::System::DateTimeFromUtc(conditions.nowMicros, false));
        const auto token = CreateSamlToken(xml, conditions.trusted, conditions.toleranceSec);
        const Faults::Exemption exemption;
        return HostileTests::DescribeFacts(*token);
    };
    if (row.refusals.empty()) {
        operation.result = row.facts;
    }
    return operation;
}

Operation MakeJudgement(const AssertionTable::Row& row)
{
    const std::string xml = AssertionTable::Read(row);
    Operation operation;
    operation.name = "verifying " + row.folder + "/" + row.file;
    operation.run = [xml, rules = row.rules] {
        const auto assertion = AssertionTable::Verify(xml, rules);
        const Faults::Exemption exemption;
        return AssertionTable::DescribeFacts(*assertion);
    };
    if (row.className.empty()) {
        operation.result = operation.run();
    }
    return operation;
}

/** What an asynchronous operation ends with: a completion, or its end without any. */
struct Ending
{
    std::binary_semaphore isOver{0};
    TokenPtr token;
    boost::optional<bool> verdict;
    bool isCompleted = false;
    std::array<char, 200> error{};
};

/** Tells the end when the last copy of a completion is gone. */
class Copies
{
public:
    explicit Copies(Ending& ending)
        : _ending(ending)
    {}
    Copies(const Copies&) = delete;
    Copies& operator=(const Copies&) = delete;
    ~Copies() { _ending.isOver.release(); }

private:
    Ending& _ending;
};

void NoteError(Ending& ending, const Quillon::Exception* error)
{
    ending.isCompleted = true;
    if (error != nullptr) {
        std::strncpy(ending.error.data(), error->what(), ending.error.size() - 1);
    }
}

/** Waits for the end of an operation that `start` starts with the completion it is given. */
template <class Start>
void Await(Ending& ending, const Start& start)
{
    {
        const auto copies = std::make_shared<Copies>(ending);
        start(copies);
    }
    ending.isOver.acquire();
    if (!ending.isCompleted) {
        throw std::bad_alloc(); // that is what the log says, if there is memory for it
    }
    if (ending.error[0] != '\0') {
        throw std::runtime_error(ending.error.data());
    }
}

template <class Start>
std::string AwaitToken(const Start& start)
{
    Ending ending;
    Await(ending, [&](const std::shared_ptr<Copies>& copies) {
        start([&ending, copies](const TokenPtr& token, const Quillon::Exception* error) {
            ending.token = token;
            NoteError(ending, error);
        });
    });
    return ending.token->GetSubject().GetName();
}

std::string ToText(bool verdict)
{
    return verdict ? "valid" : "invalid";
}

std::string ReplaceHost(const std::string& url, const std::string& host)
{
    const std::string address = "127.0.0.1";
    const std::size_t at = url.find(address);
    return url.substr(0, at) + host + url.substr(at + address.size());
}

constexpr char AlicesName[] = "alice@example.test";
constexpr char AlicesPassword[] = "alice-secret";

} // namespace

TokenSpec MakeSpec()
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    spec.renewable = true;
    return spec;
}

std::vector<Operation> GetReadings()
{
    std::vector<Operation> operations{
        MakeParsing("tokens/accepted/everything.xml"),
        MakeParsing("tokens/accepted/comments-and-blanks.xml")};
    const std::string pem = ReadTestData("keys/sts-cert.pem");
    operations.push_back(
        {"reading a certificate",
         [pem] {
             const auto certificates = Quillon::Crypto::ParsePemCertificates(pem);
             const Faults::Exemption exemption;
             return certificates.front()->GetFingerprint();
         },
         Quillon::Crypto::ParsePemCertificates(pem).front()->GetFingerprint()});
    const std::string key = ReadTestData("keys/client-key.pem");
    operations.push_back(
        {"reading a private key",
         [key] {
             const auto made = Quillon::Crypto::CreatePrivateKey(key);
             const Faults::Exemption exemption;
             return made->GetDescription();
         },
         "RSA-2048"});
    operations.push_back(
        {"making a TLS context",
         [pem] {
             Quillon::Ssl::SSLContextOptions options;
             options.useSystemAuthorities = false;
             options.authorities = Quillon::Crypto::ParsePemCertificates(pem);
             return Quillon::Ssl::CreateSSLContext(options) ? "a context" : "nothing";
         },
         "a context"});
    return operations;
}

Operation GetSigning()
{
    const auto key = GetTestKey("client");
    return {
        "signing",
        [key] {
            const std::array<unsigned char, 32> digest{1, 2, 3};
            const auto algorithm = Quillon::Crypto::HashAlgorithm::SHA256;
            const auto signature = key->SignDigest(algorithm, digest.data());
            const Faults::Exemption exemption;
            const auto own = GetTestCertificates("client").front();
            const bool isGenuine = own->GetPublicKey().VerifyDigest(
                algorithm, digest.data(), signature.data(), signature.size());
            return std::string(isGenuine ? "genuine" : "wrong");
        },
        "genuine"};
}

std::vector<Operation> GetJudgements()
{
    std::vector<Operation> operations;
    std::set<std::string> rules;
    for (const HostileTests::TokenCase& row : HostileTests::GetTokenTable()) {
        const bool isSmall = HostileTests::ReadToken(row).size() < 20'000;
        if (isSmall && (!row.refusals.empty() || rules.size() < 4)
            && rules.insert(row.rule + (row.refusals.empty() ? row.file : "")).second) {
            operations.push_back(MakeJudgement(row));
        }
    }
    std::set<std::string> classes;
    for (const AssertionTable::Row& row : AssertionTable::GetRows()) {
        const bool isNew = classes.insert(row.folder + row.className).second;
        if (isNew) {
            operations.push_back(MakeJudgement(row));
        }
    }
    return operations;
}

Client::Client(const std::vector<std::string>& options, const std::string& host)
    : _server(std::make_shared<Testing::DevStsProcess>(DEVSTS_PROGRAM, options))
    , _url(ReplaceHost(_server->GetUrl(), host))
{}

SecurityTokenServiceConfig Client::MakeConfig() const
{
    SecurityTokenServiceConfig config;
    config.url = _url;
    config.trustedCertificates = GetTestCertificates("sts");
    config.holderOfKeyConfig =
        HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()};
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities = Quillon::Crypto::ParsePemCertificates(_server->Read("ca.pem"));
    _contexts.push_back(CreateSSLContext(options));
    config.sslContext = _contexts.back().get();
    return config;
}

boost::shared_ptr<SecurityTokenService> Client::MakeService() const
{
    // What lacks for good may show only by the time that it takes: OpenSSL without memory for its
    // buffer says that there is nothing to read yet.
    ExchangeOptions options;
    options.timeoutMicroseconds = 2'000'000;
    return CreateSecurityTokenService(MakeConfig(), options);
}

boost::shared_ptr<SecurityTokenService> Client::GetService() const
{
    if (!_service) {
        _service = MakeService();
    }
    return _service;
}

TokenPtr Client::GetToken() const
{
    if (!_token) {
        TokenSpec spec = MakeSpec();
        spec.tokenLifetimeSec = 3000;
        _token = GetService()->AcquireTokenByCertificate(spec);
    }
    return _token;
}

std::vector<Operation> Client::GetOperations() const
{
    const auto service = GetService();
    const TokenPtr token = GetToken();
    return {
        {"AcquireToken",
         [service] {
             return service->AcquireToken(AlicesName, AlicesPassword, MakeSpec())
                 ->GetSubject()
                 .GetName();
         },
         "alice"},
        {"AcquireTokenByCertificate",
         [service] {
             return service->AcquireTokenByCertificate(MakeSpec())->GetSubject().GetName();
         },
         "service"},
        {"AcquireTokenByToken",
         [service, token] {
             return service->AcquireTokenByToken(*token, MakeSpec())->GetSubject().GetName();
         },
         "service"},
        {"RenewToken",
         [service, token] { return service->RenewToken(*token, 300)->GetSubject().GetName(); },
         "service"},
        {"ValidateSubject",
         [service, token] { return ToText(service->ValidateSubject(*token)); },
         "valid"},
    };
}

std::vector<Operation> Client::GetAsyncOperations() const
{
    const auto service = GetService();
    const TokenPtr token = GetToken();
    return {
        {"AcquireTokenAsync",
         [service] {
             return AwaitToken([&](const TokenCompletion& completion) {
                 service->AcquireTokenAsync(AlicesName, AlicesPassword, MakeSpec(), completion);
             });
         },
         "alice"},
        {"RenewTokenAsync",
         [service, token] {
             return AwaitToken([&](const TokenCompletion& completion) {
                 service->RenewTokenAsync(token, 300, completion);
             });
         },
         "service"},
        {"ValidateSubjectAsync",
         [service, token] {
             Ending ending;
             Await(ending, [&](const std::shared_ptr<Copies>& copies) {
                 service->ValidateSubjectAsync(
                     token,
                     [&ending, copies](
                         const boost::optional<bool>& verdict, const Quillon::Exception* error) {
                         ending.verdict = verdict;
                         NoteError(ending, error);
                     });
             });
             return ToText(ending.verdict.value());
         },
         "valid"},
    };
}

Operation Client::GetFirstAcquisition() const
{
    return {
        "the first acquisition",
        [*this] {
            return MakeService()
                ->AcquireToken(AlicesName, AlicesPassword, MakeSpec())
                ->GetSubject()
                .GetName();
        },
        "alice"};
}

} // namespace Exhaustion
