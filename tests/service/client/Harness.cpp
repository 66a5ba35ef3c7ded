#include "Harness.h"

#include "quillon/system/Clock.h"
#include "support/TestData.h"

#include <chrono>
#include <cstdlib>
#include <utility>

namespace fs = std::filesystem;
using namespace SsoClient;

namespace {

Quillon::Service::Logger& GetLibraryLogger()
{
    return *Quillon::Service::GetApp()->GetLogFacility().GetLogger("SsoClient");
}

DevSts::TimePoint ReadProcessClock()
{
    return DevSts::TimePoint(
        std::chrono::microseconds(Quillon::System::GetUtcDateTime().GetUtcTime()));
}

} // namespace

StateDir::StateDir()
{
    std::string pattern = (fs::temp_directory_path() / "sso-service-test-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("mkdtemp failed");
    }
    _path = pattern;
    for (const std::string name : {"sts", "client"}) {
        Write(name + ".key", ReadTestData("keys/" + name + "-key.pem"));
        Write(name + ".pem", ReadTestData("keys/" + name + "-cert.pem"));
    }
}

StateDir::~StateDir()
{
    std::error_code ignored;
    fs::remove_all(_path, ignored);
}

std::string StateDir::Read(const std::string& name) const
{
    std::ifstream file(_path / name, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void StateDir::Write(const std::string& name, const std::string& text) const
{
    std::ofstream file(_path / name, std::ios::binary | std::ios::trunc);
    file << text;
    if (!file.flush()) {
        throw std::runtime_error("cannot write " + name);
    }
}

DevSts::Options MakeServerOptions(const StateDir& state, bool plainHttp)
{
    DevSts::Options options;
    options.stateDir = state.Path();
    options.plainHttp = plainHttp;
    options.clock = &ReadProcessClock;
    return options;
}

HolderOfKeyConfig MakeIdentity(const std::string& keyName, const std::string& certificateName)
{
    return {GetTestKey(keyName), GetTestCertificates(certificateName).front()};
}

TokenSpec MakeSpec(long long lifetimeSec)
{
    TokenSpec spec;
    spec.tokenLifetimeSec = lifetimeSec;
    return spec;
}

long long GetLifetimeSec(const SamlToken& token)
{
    constexpr long long MicrosecondsPerSecond = 1'000'000;
    return (token.GetEndDate().GetUtcTime() - token.GetStartDate().GetUtcTime())
           / MicrosecondsPerSecond;
}

PrincipalId Alice()
{
    return {"alice", "example.test"};
}

PrincipalId ServiceUser()
{
    return {"service", "example.test"};
}

StsTest::StsTest(bool plainHttp)
    : server(MakeServerOptions(state, plainHttp))
{
    server.Start();
    config.url = server.Url();
    config.trustedCertificates = GetTestCertificates("sts");
    if (!plainHttp) {
        Quillon::Ssl::SSLContextOptions options;
        options.useSystemAuthorities = false;
        options.authorities = Quillon::Crypto::ParsePemCertificates(state.Read("ca.pem"));
        sslContext = CreateSSLContext(options);
        config.sslContext = sslContext.get();
    }
}

ServicePtr StsTest::MakeService() const
{
    return MakeService(MakeIdentity());
}

ServicePtr StsTest::MakeBearerService() const
{
    return MakeService(boost::none);
}

ServicePtr StsTest::MakeService(const boost::optional<HolderOfKeyConfig>& identity) const
{
    SecurityTokenServiceConfig own = config;
    own.holderOfKeyConfig = identity;
    return CreateSecurityTokenService(own);
}

std::string StsTest::DescribeServer() const
{
    const std::string url = server.Url();
    const std::size_t colon = url.rfind(':');
    return "127.0.0.1 port " + url.substr(colon + 1, url.rfind('/') - colon - 1);
}

void StsTest::AnswerNext(int status, const std::string& body, const std::string& contentType)
{
    server.OnNextReply([=](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        reply.status = status;
        reply.body = body;
        reply.contentType = contentType;
    });
}

void StsTest::ReplaceInNextReply(const std::string& from, const std::string& to)
{
    server.OnNextReply([=](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        reply.body = Replaced(reply.body, from, to);
    });
}

std::string Replaced(const std::string& text, const std::string& from, const std::string& to)
{
    const std::size_t at = text.find(from);
    if (at == std::string::npos) {
        throw std::logic_error("not in the text: " + from);
    }
    return text.substr(0, at) + to + text.substr(at + from.size());
}

LogRecorder::LogRecorder()
{
    GetLibraryLogger().SetLevel(Quillon::Service::LOG_LEVEL_TRACE);
    Quillon::Service::GetApp()->GetLogFacility().SetSink(
        [this](const std::string& logger, int level, const std::string& text) {
            const std::lock_guard<std::mutex> lock(_mutex);
            _lines.push_back(logger + "[" + std::to_string(level) + "]: " + text);
        });
}

LogRecorder::~LogRecorder()
{
    Quillon::Service::GetApp()->GetLogFacility().SetSink(Quillon::Service::LogSink());
    GetLibraryLogger().SetLevel(Quillon::Service::LOG_LEVEL_WARNING);
}

std::vector<std::string> LogRecorder::TakeLines()
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return std::exchange(_lines, {});
}
