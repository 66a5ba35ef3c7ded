#include "Harness.h"

#include "support/FakeSamlToken.h"

#include <gmock/gmock.h>

#include <latch>
#include <set>
#include <thread>

using namespace SsoClient;

namespace {

constexpr int ThreadCount = 8;

/** The operations that one thread runs with a service that it shares with others. */
class Worker
{
public:
    Worker(const SecurityTokenService& service, int index, int operationCount)
        : _service(service)
        , _index(index)
        , _operationCount(operationCount)
    {}

    void Run()
    {
        for (int i = 0; i < _operationCount; ++i) {
            try {
                RunOne(i);
            } catch (const std::exception& error) {
                problems.push_back(
                    "operation " + std::to_string(i) + " of thread " + std::to_string(_index) + ": "
                    + Quillon::GetClassName(error) + ": " + error.what());
            }
        }
    }

    std::vector<std::string> problems;
    std::set<std::string> tokenIds;
    int tokenCount = 0;
    int verdictCount = 0;

private:
    void RunOne(int i)
    {
        constexpr int Kinds = 5;
        const bool isOdd = (i / Kinds) % 2 == 1;
        switch (i % Kinds) {
        case 0:
            return AcquireByPassword(i, isOdd);
        case 1:
            return AcquireByCertificate(i);
        case 2:
            return Check(
                *_service.AcquireTokenByToken(*_own, GetSpec(i)), GetSpec(i), ServiceUser());
        case 3:
            return Renew(i);
        default:
            return Validate(isOdd);
        }
    }

    // No two operations ask for the same.
    TokenSpec GetSpec(int i) const
    {
        TokenSpec spec = MakeSpec(1000 + _index * _operationCount + i);
        // The exchanged token must not reach further than the one that is presented.
        spec.audienceRestriction = {"urn:example:thread-" + std::to_string(_index)};
        return spec;
    }

    void AcquireByPassword(int i, bool isBob)
    {
        const TokenSpec spec = GetSpec(i);
        const TokenPtr token =
            isBob ? _service.AcquireToken("bob@example.test", "bob-secret", spec)
                  : _service.AcquireToken("alice@example.test", AlicesPassword, spec);
        Check(*token, spec, isBob ? PrincipalId("bob", "example.test") : Alice());
    }

    void AcquireByCertificate(int i)
    {
        // Long enough for what is asked for when it is exchanged.
        TokenSpec spec = GetSpec(i + ThreadCount * _operationCount);
        spec.renewable = true;
        _own = _service.AcquireTokenByCertificate(spec);
        Check(*_own, spec, ServiceUser());
    }

    void Renew(int i)
    {
        TokenSpec spec = GetSpec(i);
        spec.renewable = true;
        Check(*_service.RenewToken(*_own, spec.tokenLifetimeSec), spec, ServiceUser());
    }

    void Validate(bool isChanged)
    {
        FakeSamlToken token;
        token.xml = isChanged ? Replaced(_own->ToXml(), "service@", "Service@") : _own->ToXml();
        ++verdictCount;
        if (_service.ValidateSubject(token) == isChanged) {
            throw std::runtime_error("wrong verdict");
        }
    }

    void Check(const SamlToken& token, const TokenSpec& spec, const PrincipalId& subject)
    {
        ++tokenCount;
        tokenIds.insert(token.GetId());
        std::set<std::string> audience;
        token.GetAudience(audience);
        if (token.GetSubject() != subject || GetLifetimeSec(token) != spec.tokenLifetimeSec
            || audience != spec.audienceRestriction || token.IsRenewable() != spec.renewable
            || token.GetConfirmationMethod() != SamlToken::CONFIRM_HOLDER_OF_KEY) {
            throw std::runtime_error("not the token that was asked for");
        }
    }

    const SecurityTokenService& _service;
    const int _index;
    const int _operationCount;
    TokenPtr _own;
};

void ExpectRightResults(const SecurityTokenService& service, int operationsPerThread)
{
    std::vector<Worker> workers;
    workers.reserve(ThreadCount);
    for (int index = 0; index < ThreadCount; ++index) {
        workers.emplace_back(service, index, operationsPerThread);
    }
    std::latch start(ThreadCount);
    std::vector<std::thread> threads;
    threads.reserve(ThreadCount);
    for (Worker& worker : workers) {
        threads.emplace_back([&worker, &start] {
            start.arrive_and_wait();
            worker.Run();
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }

    std::set<std::string> tokenIds;
    int tokenCount = 0;
    int verdictCount = 0;
    for (const Worker& worker : workers) {
        EXPECT_THAT(worker.problems, testing::IsEmpty());
        tokenIds.insert(worker.tokenIds.begin(), worker.tokenIds.end());
        tokenCount += worker.tokenCount;
        verdictCount += worker.verdictCount;
    }
    EXPECT_EQ(tokenCount + verdictCount, ThreadCount * operationsPerThread);
    EXPECT_EQ(tokenIds.size(), static_cast<std::size_t>(tokenCount));
}

/** Every operation that began has ended, under its own id. */
void ExpectPairedFrames(const std::vector<std::string>& lines, std::size_t operations)
{
    std::set<std::string> open;
    std::size_t ended = 0;
    for (const std::string& line : lines) {
        const std::string id = line.substr(0, line.find(' ', line.find("opId=")));
        if (line.find(" START operation ") != std::string::npos) {
            EXPECT_TRUE(open.insert(id).second) << line;
        } else if (line.find(" END operation ") != std::string::npos) {
            EXPECT_EQ(open.erase(id), 1U) << line;
            ++ended;
        }
    }
    EXPECT_TRUE(open.empty());
    EXPECT_EQ(ended, operations);
}

class SharedServiceOverHttp : public HttpStsTest
{};
class SharedServiceOverHttps : public HttpsStsTest
{};

} // namespace

TEST_F(SharedServiceOverHttp, ServesEightThreads)
{
    const ServicePtr service = MakeService();
    LogRecorder log;
    ExpectRightResults(*service, 250);
    ExpectPairedFrames(log.TakeLines(), 2000);
}

// Fewer, because most of the time goes into handshakes, one for each operation.
TEST_F(SharedServiceOverHttps, ServesEightThreads)
{
    ExpectRightResults(*MakeService(), 25);
}
