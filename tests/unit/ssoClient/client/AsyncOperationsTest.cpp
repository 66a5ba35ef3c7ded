#include "negotiationFakes.h"
#include "quillon/http/HttpException.h"
#include "quillon/service/Logger.h"
#include "quillon/system/ThreadPool.h"
#include "serviceFakes.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Awaited.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"

#include <boost/optional/optional_io.hpp>
#include <boost/smart_ptr/weak_ptr.hpp>
#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <future>
#include <memory>
#include <mutex>
#include <thread>
#include <typeinfo>

using namespace SsoClient;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;
using TokenPtr = boost::shared_ptr<const SamlToken>;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"

std::string Reply(const std::string& response)
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>" + response
           + "</S:Body></S:Envelope>";
}

std::string TokenResponse()
{
    return "<RequestSecurityTokenResponse><RequestedSecurityToken>" + GetSignedAssertion()
           + "</RequestedSecurityToken></RequestSecurityTokenResponse>";
}

std::string IssueReply()
{
    return Reply(
        "<RequestSecurityTokenResponseCollection>" + TokenResponse()
        + "</RequestSecurityTokenResponseCollection>");
}

std::string StatusReply(const std::string& code)
{
    return Reply(
        "<RequestSecurityTokenResponse><Status><Code>" WST "/status/" + code
        + "</Code></Status></RequestSecurityTokenResponse>");
}

std::string FaultReply(const std::string& code)
{
    return Reply(
        "<S:Fault><faultcode xmlns:w=\"" WST "\">" + code
        + "</faultcode><faultstring>no</faultstring></S:Fault>");
}

class AsyncOperation : public testing::Test
{
protected:
    AsyncOperation()
    {
        GTEST_FLAG_SET(death_test_style, "threadsafe");
        spec.tokenLifetimeSec = 300;
    }

    boost::shared_ptr<const SecurityTokenService> MakeService() const
    {
        return boost::make_shared<SecurityTokenServiceImpl>(
            boost::make_shared<RequestBuilderImpl>(
                HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()}),
            transport,
            boost::make_shared<ResponseHandlerImpl>(),
            GetTestCertificates("sts"));
    }

    static boost::shared_ptr<const SamlToken> MakePresented()
    {
        auto token = boost::make_shared<FakeSamlToken>();
        token->xml = ReadTestData("tokens/accepted/holder-of-key.xml");
        token->confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
        return token;
    }

    TokenSpec spec;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    FixedClock clock{WhenTokensAreValid};
};

} // namespace

TEST_F(AsyncOperation, AcquireTokenAsyncDeliversTheTokenOnAnotherThread)
{
    transport->reply = IssueReply();
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    const auto told = awaited.Get();
    EXPECT_EQ(told.Describe(), "success");
    ASSERT_NE(told.result, nullptr);
    EXPECT_NE(told.thread, std::this_thread::get_id());
    ASSERT_EQ(transport->sent.size(), 1U);
    EXPECT_THAT(transport->sent[0].body, HasSubstr("<wsse:Username>jdoe</wsse:Username>"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr(">s3cret</wsse:Password>"));
}

TEST_F(AsyncOperation, WorksOnCopiesOfItsArguments)
{
    transport->reply = IssueReply();
    AwaitedToken awaited;
    {
        auto service = MakeService();
        std::string user = "jdoe";
        std::string password = "s3cret";
        TokenSpec ownSpec = spec;
        ownSpec.audienceRestriction.insert("somewhere");
        service->AcquireTokenAsync(user, password, ownSpec, awaited.GetCompletion());
        service.reset();
        user = "other";
        password = "other";
        ownSpec.audienceRestriction.clear();
    }
    EXPECT_EQ(awaited.Get().Describe(), "success");
    EXPECT_THAT(transport->sent[0].body, HasSubstr("<wsse:Username>jdoe</wsse:Username>"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr(">s3cret</wsse:Password>"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr("somewhere"));
}

TEST_F(AsyncOperation, AcquireTokenByGssAsyncKeepsTheHandler)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""), NegotiationReply("c1", "", GetSignedAssertion())};
    AwaitedToken awaited;
    auto handler = boost::make_shared<ScriptedHandler>(std::deque<std::string>{"one", "two"});
    MakeService()->AcquireTokenByGssAsync(spec, std::move(handler), awaited.GetCompletion());
    EXPECT_EQ(awaited.Get().Describe(), "success");
    EXPECT_EQ(transport->sent.size(), 2U);
}

TEST_F(AsyncOperation, AcquireTokenByGssAsyncDeliversWhatTheHandlerThrows)
{
    class Refusing final : public NegotiationHandler
    {
        boost::shared_ptr<Leg> Negotiate(const Leg&) override { throw SsoException("no ticket"); }
    };
    AwaitedToken awaited;
    MakeService()->AcquireTokenByGssAsync(
        spec, boost::make_shared<Refusing>(), awaited.GetCompletion());
    EXPECT_EQ(awaited.Get().Describe(), "SsoException: no ticket");
}

TEST_F(AsyncOperation, AcquireTokenByCertificateAsyncDeliversTheToken)
{
    transport->reply = IssueReply();
    AwaitedToken awaited;
    MakeService()->AcquireTokenByCertificateAsync(spec, awaited.GetCompletion());
    EXPECT_NE(awaited.Get().result, nullptr);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Issue");
}

TEST_F(AsyncOperation, AcquireTokenByTokenAsyncKeepsThePresentedToken)
{
    transport->reply = IssueReply();
    AwaitedToken awaited;
    MakeService()->AcquireTokenByTokenAsync(MakePresented(), spec, awaited.GetCompletion());
    EXPECT_NE(awaited.Get().result, nullptr);
    EXPECT_THAT(transport->sent[0].body, HasSubstr("Assertion"));
}

TEST_F(AsyncOperation, RenewTokenAsyncDeliversTheToken)
{
    transport->reply = Reply(TokenResponse());
    AwaitedToken awaited;
    MakeService()->RenewTokenAsync(MakePresented(), 300, awaited.GetCompletion());
    EXPECT_NE(awaited.Get().result, nullptr);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Renew");
}

TEST_F(AsyncOperation, ValidateSubjectAsyncDeliversEachVerdict)
{
    for (const bool verdict : {true, false}) {
        transport->reply = StatusReply(verdict ? "valid" : "invalid");
        AwaitedVerdict awaited;
        MakeService()->ValidateSubjectAsync(MakePresented(), awaited.GetCompletion());
        const auto told = awaited.Get();
        EXPECT_EQ(told.result, boost::optional<bool>(verdict));
        EXPECT_EQ(told.Describe(), "success");
    }
}

TEST_F(AsyncOperation, ValidateSubjectAsyncDeliversAnEmptyVerdictWithTheException)
{
    transport->reply = FaultReply("w:InvalidRequest");
    AwaitedVerdict awaited;
    MakeService()->ValidateSubjectAsync(MakePresented(), awaited.GetCompletion());
    const auto told = awaited.Get();
    EXPECT_EQ(told.result, boost::none);
    EXPECT_EQ(
        told.Describe(), "SsoException: Unexpected SOAP fault: w:InvalidRequest; request failed.");
}

TEST_F(AsyncOperation, DeliversBadCredentialsWithTheirDynamicType)
{
    transport->reply = FaultReply("w:FailedAuthentication");
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    const auto told = awaited.Get();
    EXPECT_EQ(told.result, nullptr);
    EXPECT_EQ(told.Describe(), "InvalidCredentialsException: Authentication failed: no");
    // The clone came from a thread of the pool and is raised on this one.
    EXPECT_THROW(told.error->Throw(), InvalidCredentialsException);
}

namespace {

/** Has an operation fail on a thread of the pool, and raises the clone of its exception here. */
template <class Failure>
void ExpectToKeepItsType(
    const boost::shared_ptr<FakeTransport>& transport,
    const SecurityTokenService& service,
    const TokenPtr& token)
{
    transport->failure = boost::make_shared<Failure>("text");
    const std::string text = transport->failure->what();
    AwaitedVerdict awaited;
    service.ValidateSubjectAsync(token, awaited.GetCompletion());
    const auto told = awaited.Get();
    ASSERT_NE(told.error, nullptr);
    try {
        told.error->Throw();
    } catch (const std::exception& raised) {
        EXPECT_EQ(typeid(raised), typeid(Failure));
        EXPECT_EQ(raised.what(), text);
    }
}

} // namespace

TEST_F(AsyncOperation, DeliversEveryExceptionWithItsDynamicType)
{
    const auto service = MakeService();
    const TokenPtr token = MakePresented();
    ExpectToKeepItsType<SsoException>(transport, *service, token);
    ExpectToKeepItsType<InvalidTokenException>(transport, *service, token);
    ExpectToKeepItsType<ParseException>(transport, *service, token);
    ExpectToKeepItsType<InvalidSignatureException>(transport, *service, token);
    ExpectToKeepItsType<CommunicationException>(transport, *service, token);
    ExpectToKeepItsType<InvalidCredentialsException>(transport, *service, token);
    ExpectToKeepItsType<Quillon::InvalidArgumentException>(transport, *service, token);
    ExpectToKeepItsType<Quillon::InvalidStateException>(transport, *service, token);
    ExpectToKeepItsType<Quillon::Base64FormatException>(transport, *service, token);
    ExpectToKeepItsType<Quillon::TypeMismatchException>(transport, *service, token);
    ExpectToKeepItsType<Quillon::Http::HttpException>(transport, *service, token);
}

TEST_F(AsyncOperation, DeliversBadArgumentsInsteadOfRaisingThem)
{
    spec.tokenLifetimeSec = 0;
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    EXPECT_EQ(
        awaited.Get().Describe(),
        "InvalidArgumentException: Invalid argument : Token lifetime must be positive");
}

TEST_F(AsyncOperation, DeliversAnEmptyAssertionAsNoTokenAndNoError)
{
    AwaitedToken awaited;
    SecurityTokenServiceImpl(
        boost::make_shared<RequestBuilderImpl>(boost::none),
        transport,
        boost::make_shared<ReplyIsToken>(*transport),
        {})
        .AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    const auto told = awaited.Get();
    EXPECT_EQ(told.result, nullptr);
    EXPECT_EQ(told.Describe(), "success");
}

TEST_F(AsyncOperation, ReleasesEverythingAfterItRan)
{
    transport->reply = StatusReply("valid");
    auto presented = MakePresented();
    const boost::weak_ptr<const SamlToken> observer = presented;
    const auto released = std::make_shared<std::promise<void>>();
    auto onRelease = std::shared_ptr<void>(nullptr, [released](void*) { released->set_value(); });
    AwaitedVerdict awaited;
    {
        const auto completion = awaited.GetCompletion();
        const ValidationCompletion keeping =
            [completion,
             onRelease](const boost::optional<bool>& verdict, const Quillon::Exception* error) {
                completion(verdict, error);
            };
        MakeService()->ValidateSubjectAsync(presented, keeping);
    }
    presented.reset();
    onRelease.reset();
    awaited.Get();
    released->get_future().wait();
    // The arguments go with the completion; the pool has at most a last step of that to do.
    while (!observer.expired()) {
        std::this_thread::yield();
    }
}

TEST_F(AsyncOperation, RenewTokenAsyncTakesALifetimeOf64Bits)
{
    transport->reply = Reply(TokenResponse());
    AwaitedToken awaited;
    MakeService()->RenewTokenAsync(MakePresented(), 5'000'000'000, awaited.GetCompletion());
    EXPECT_EQ(awaited.Get().Describe(), "success");
    EXPECT_THAT(
        transport->sent[0].body,
        HasSubstr("<wsu:Expires>2184-11-23T20:53:20.000Z</wsu:Expires></wst:Lifetime>"));
}

namespace {

/** Builds requests that say which audience the spec has, when it is told to go on. */
class WaitingRequestBuilder final : public RequestBuilder
{
public:
    std::promise<void> goOn;

    void BuildUserPassTokenRequest(
        const std::string&,
        const std::string&,
        const TokenSpec& spec,
        Request& request) const override
    {
        Build(spec, request);
    }
    void BuildInitialSPNegoRequest(
        const TokenSpec& spec, const Leg&, Request& request) const override
    {
        Build(spec, request);
    }
    void BuildContinuedSPNegoRequest(const std::string&, const Leg&, Request&) const override {}
    void BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const override
    {
        Build(spec, request);
    }
    void BuildExchangeTokenRequest(
        const SamlToken&, const TokenSpec& spec, Request& request) const override
    {
        Build(spec, request);
    }
    void BuildValidateSubjectRequest(const SamlToken&, Request&) const override {}
    void BuildRenewRequest(const SamlToken&, long long, Request&) const override {}

private:
    void Build(const TokenSpec& spec, Request& request) const
    {
        _mayGoOn.wait();
        for (const std::string& audience : spec.audienceRestriction) {
            request.body += audience;
        }
    }

    std::shared_future<void> _mayGoOn = goOn.get_future();
};

/** Queues an operation whose spec is changed before it is used. @return what was sent. */
template <class Call>
std::string GetAudienceSent(const Call& call)
{
    const auto builder = boost::make_shared<WaitingRequestBuilder>();
    const auto transport = boost::make_shared<FakeTransport>();
    const SecurityTokenServiceImpl service(
        builder, transport, boost::make_shared<ResponseHandlerImpl>(), {});
    AwaitedToken awaited;
    TokenSpec spec;
    spec.audienceRestriction = {"before"};
    call(service, spec, awaited.GetCompletion());
    spec.audienceRestriction = {"after"};
    builder->goOn.set_value();
    awaited.Get(); // an exception: there is no reply
    return transport->sent.at(0).body;
}

} // namespace

TEST_F(AsyncOperation, CopiesItsSpec)
{
    EXPECT_EQ(
        GetAudienceSent([](const auto& service, const TokenSpec& given, const auto& completion) {
            service.AcquireTokenAsync("jdoe", "s3cret", given, completion);
        }),
        "before");
    EXPECT_EQ(
        GetAudienceSent([](const auto& service, const TokenSpec& given, const auto& completion) {
            const auto handler =
                boost::make_shared<ScriptedHandler>(std::deque<std::string>{"one"});
            service.AcquireTokenByGssAsync(given, handler, completion);
        }),
        "before");
    EXPECT_EQ(
        GetAudienceSent([](const auto& service, const TokenSpec& given, const auto& completion) {
            service.AcquireTokenByCertificateAsync(given, completion);
        }),
        "before");
    EXPECT_EQ(
        GetAudienceSent([](const auto& service, const TokenSpec& given, const auto& completion) {
            service.AcquireTokenByTokenAsync(MakePresented(), given, completion);
        }),
        "before");
}

// ------------------------------------------------------------------------ completions

namespace {

/** Counts the calls of a completion until the last copy of it is gone. */
template <class Result>
class Counted
{
public:
    boost::function<void(const Result&, const Quillon::Exception*)> TakeCompletion()
    {
        return [count = std::move(_count)](const Result&, const Quillon::Exception*) {
            ++count->calls;
        };
    }

    int GetCallsWhenAllIsOver() { return _calls.get(); }

private:
    struct Count
    {
        std::promise<int> all;
        std::atomic<int> calls{0};
        ~Count() { all.set_value(calls); }
    };

    std::shared_ptr<Count> _count = std::make_shared<Count>();
    std::future<int> _calls = _count->all.get_future();
};

} // namespace

TEST_F(AsyncOperation, CallsEachCompletionOnce)
{
    const auto service = MakeService();
    const auto countTokens = [](const auto& call) {
        Counted<TokenPtr> counted;
        call(counted.TakeCompletion());
        return counted.GetCallsWhenAllIsOver();
    };
    for (const std::string& reply : {IssueReply(), Reply(TokenResponse()), FaultReply("w:No")}) {
        transport->reply = reply; // each is good for some operations and bad for others
        EXPECT_EQ(1, countTokens([&](const TokenCompletion& completion) {
                      service->AcquireTokenAsync("jdoe", "s3cret", spec, completion);
                  }));
        EXPECT_EQ(1, countTokens([&](const TokenCompletion& completion) {
                      const auto handler =
                          boost::make_shared<ScriptedHandler>(std::deque<std::string>{"one"});
                      service->AcquireTokenByGssAsync(spec, handler, completion);
                  }));
        EXPECT_EQ(1, countTokens([&](const TokenCompletion& completion) {
                      service->AcquireTokenByCertificateAsync(spec, completion);
                  }));
        EXPECT_EQ(1, countTokens([&](const TokenCompletion& completion) {
                      service->AcquireTokenByTokenAsync(MakePresented(), spec, completion);
                  }));
        EXPECT_EQ(1, countTokens([&](const TokenCompletion& completion) {
                      service->RenewTokenAsync(MakePresented(), 300, completion);
                  }));
    }
    for (const std::string& reply : {StatusReply("valid"), FaultReply("w:No")}) {
        transport->reply = reply;
        Counted<boost::optional<bool>> counted;
        service->ValidateSubjectAsync(MakePresented(), counted.TakeCompletion());
        EXPECT_EQ(1, counted.GetCallsWhenAllIsOver());
    }
}

TEST_F(AsyncOperation, RunsCompletionsAtOnce)
{
    transport->reply = StatusReply("valid");
    const auto service = MakeService();
    std::promise<void> firstBegan;
    std::promise<void> secondBegan;
    const std::shared_future<void> second = secondBegan.get_future();
    std::promise<bool> together;
    service->ValidateSubjectAsync(
        MakePresented(), [&](const boost::optional<bool>&, const Quillon::Exception*) {
            firstBegan.set_value();
            // Far longer than it takes: only a pool that waits for this completion makes it end.
            together.set_value(
                second.wait_for(std::chrono::seconds(30)) == std::future_status::ready);
        });
    firstBegan.get_future().wait();
    service->ValidateSubjectAsync(
        MakePresented(),
        [&](const boost::optional<bool>&, const Quillon::Exception*) { secondBegan.set_value(); });
    EXPECT_TRUE(together.get_future().get());
    second.wait();
}

// ------------------------------------------------------------------- what leaves a work item

namespace {

/** Takes the lines of all loggers, from whatever thread. */
class SharedLog
{
public:
    SharedLog()
    {
        Quillon::Service::GetApp()->GetLogFacility().SetSink(
            [this](const std::string&, int level, const std::string& text) {
                _line.set_value(std::to_string(level) + ": " + text);
            });
    }
    ~SharedLog() { Quillon::Service::GetApp()->GetLogFacility().SetSink({}); }
    SharedLog(const SharedLog&) = delete;
    SharedLog& operator=(const SharedLog&) = delete;

    std::string WaitForLine() { return _line.get_future().get(); }

private:
    std::promise<std::string> _line;
};

} // namespace

TEST_F(AsyncOperation, LogsWhatACompletionThrows)
{
    transport->reply = StatusReply("valid");
    SharedLog log;
    MakeService()->ValidateSubjectAsync(
        MakePresented(), [](const boost::optional<bool>&, const Quillon::Exception*) {
            throw SsoException("thrown by the completion");
        });
    const std::string line = log.WaitForLine();
    EXPECT_THAT(line, StartsWith("8: "));
    EXPECT_THAT(line, HasSubstr("SsoException: thrown by the completion"));
}

TEST_F(AsyncOperation, LogsThatACompletionIsEmpty)
{
    transport->reply = StatusReply("valid");
    SharedLog log;
    MakeService()->ValidateSubjectAsync(MakePresented(), ValidationCompletion());
    const std::string line = log.WaitForLine();
    EXPECT_THAT(line, StartsWith("8: "));
    EXPECT_THAT(line, HasSubstr("call to empty boost::function"));
}

TEST_F(AsyncOperation, GoesOnAfterACompletionThatThrew)
{
    transport->reply = StatusReply("valid");
    {
        SharedLog log;
        MakeService()->ValidateSubjectAsync(MakePresented(), ValidationCompletion());
        log.WaitForLine();
    }
    AwaitedVerdict awaited;
    MakeService()->ValidateSubjectAsync(MakePresented(), awaited.GetCompletion());
    EXPECT_EQ(awaited.Get().result, boost::optional<bool>(true));
}

// ------------------------------------------------------------------------ null pointers

namespace {

constexpr char StoppedBeforeAnythingWasQueued[] =
    "PanicVerify failed: _p \\(lib/ssoClient/SecurityTokenServiceImpl:488\\)\n0 threads\n";

/** The pool starts its threads with the first work. */
void CountThreadsAtTheEnd()
{
    std::signal(SIGABRT, [](int) {
        std::fprintf(stderr, "%zu threads\n", Quillon::System::GetThreadPool()->GetThreadCount());
    });
}

const TokenCompletion TokenIsUnexpected = [](const TokenPtr&, const Quillon::Exception*) {
    std::_Exit(0);
};
const ValidationCompletion VerdictIsUnexpected = [](const boost::optional<bool>&,
                                                    const Quillon::Exception*) { std::_Exit(0); };

} // namespace

TEST_F(AsyncOperation, StopsTheProcessOnANullTokenToRenew)
{
    EXPECT_DEATH(
        {
            CountThreadsAtTheEnd();
            MakeService()->RenewTokenAsync(nullptr, 300, TokenIsUnexpected);
        },
        StoppedBeforeAnythingWasQueued);
}

TEST_F(AsyncOperation, StopsTheProcessOnANullTokenToValidate)
{
    EXPECT_DEATH(
        {
            CountThreadsAtTheEnd();
            MakeService()->ValidateSubjectAsync(nullptr, VerdictIsUnexpected);
        },
        StoppedBeforeAnythingWasQueued);
}

TEST_F(AsyncOperation, StopsTheProcessOnANullTokenToPresent)
{
    EXPECT_DEATH(
        {
            CountThreadsAtTheEnd();
            MakeService()->AcquireTokenByTokenAsync(nullptr, spec, TokenIsUnexpected);
        },
        StoppedBeforeAnythingWasQueued);
}

TEST_F(AsyncOperation, StopsTheProcessOnANullHandler)
{
    EXPECT_DEATH(
        {
            CountThreadsAtTheEnd();
            MakeService()->AcquireTokenByGssAsync(spec, nullptr, TokenIsUnexpected);
        },
        StoppedBeforeAnythingWasQueued);
}
