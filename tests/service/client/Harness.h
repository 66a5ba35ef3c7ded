#pragma once

#include "devsts/http/Server.h"
#include "quillon/service/Logger.h"
#include "quillon/ssl/SSLContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "support/FixedClock.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <list>
#include <mutex>
#include <string>
#include <vector>

inline constexpr char Now[] = "2026-11-20T12:00:00Z";
inline constexpr char AlicesName[] = "alice@example.test";
inline constexpr char AlicesPassword[] = "alice-secret";
inline constexpr char ServiceName[] = "service@example.test";

using TokenPtr = boost::shared_ptr<const SsoClient::SamlToken>;
using ServicePtr = boost::shared_ptr<SsoClient::SecurityTokenService>;

/** A state directory of the STS whose RSA keys are those of the test data, which saves a second. */
class StateDir
{
public:
    StateDir();
    ~StateDir();
    StateDir(const StateDir&) = delete;
    StateDir& operator=(const StateDir&) = delete;

    const std::filesystem::path& Path() const { return _path; }
    std::string Read(const std::string& name) const;
    void Write(const std::string& name, const std::string& text) const;

private:
    std::filesystem::path _path;
};

/** Options of a server that reads the time from where the library reads it. */
DevSts::Options MakeServerOptions(const StateDir& state, bool plainHttp);

SsoClient::HolderOfKeyConfig MakeIdentity(
    const std::string& keyName = "client", const std::string& certificateName = "client");

SsoClient::TokenSpec MakeSpec(long long lifetimeSec = 300);

/** Length of the token's validity in seconds. */
long long GetLifetimeSec(const SsoClient::SamlToken& token);

SsoClient::PrincipalId Alice();
SsoClient::PrincipalId ServiceUser();

/** The development STS of one test, and services that use it. */
class StsTest : public testing::Test
{
protected:
    explicit StsTest(bool plainHttp);

    /** A client of its own key and certificate, and one without. */
    ServicePtr MakeService() const;
    ServicePtr MakeBearerService() const;
    ServicePtr MakeService(const boost::optional<SsoClient::HolderOfKeyConfig>& identity) const;

    /** What the library calls the server in its messages. */
    std::string DescribeServer() const;

    /** Lets the next reply be this, whatever is asked. */
    void AnswerNext(int status, const std::string& body, const std::string& contentType);

    /** Replaces `from`, which must be there, in the next reply. */
    void ReplaceInNextReply(const std::string& from, const std::string& to);

    StateDir state;
    FixedClock clock{Now};
    DevSts::Server server;
    SsoClient::SecurityTokenServiceConfig config; ///< of a client without an identity
    Quillon::Ref<Quillon::Ssl::SSLContext> sslContext;
};

class HttpsStsTest : public StsTest
{
protected:
    HttpsStsTest()
        : StsTest(false)
    {}
};

class HttpStsTest : public StsTest
{
protected:
    HttpStsTest()
        : StsTest(true)
    {}
};

/** `text` with the first `from`, which must be there, replaced. */
std::string Replaced(const std::string& text, const std::string& from, const std::string& to);

/** Takes what all loggers write, at full verbosity, as long as it lives. */
class LogRecorder
{
public:
    LogRecorder();
    ~LogRecorder();
    LogRecorder(const LogRecorder&) = delete;
    LogRecorder& operator=(const LogRecorder&) = delete;

    std::vector<std::string> TakeLines();

private:
    std::mutex _mutex;
    std::vector<std::string> _lines;
};
