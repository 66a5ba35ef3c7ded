#include "ssoClient/client/asyncCalls.h"

#include "ssoClient/Exceptions.h"
#include "support/FakeSamlToken.h"

#include <boost/optional/optional_io.hpp>
#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

#include <stdexcept>
#include <type_traits>

using namespace SsoClient;
using TokenPtr = boost::shared_ptr<const SamlToken>;

namespace {

struct Outcome
{
    int calls = 0;
    TokenPtr token;
    boost::optional<bool> verdict;
    std::string error;

    void TakeToken(const TokenPtr& result, const Quillon::Exception* failure)
    {
        ++calls;
        token = result;
        Describe(failure);
    }

    void TakeVerdict(const boost::optional<bool>& result, const Quillon::Exception* failure)
    {
        ++calls;
        verdict = result;
        Describe(failure);
    }

    void Describe(const Quillon::Exception* failure)
    {
        if (failure != nullptr) {
            error = Quillon::GetClassName(*failure) + ": " + failure->what();
        }
    }
};

const auto NoToken = TokenPtr();
const auto NoVerdict = boost::optional<bool>();

class SyncCallToResultFuncTest : public testing::Test
{
protected:
    SyncCallToResultFuncTest()
        : takeToken([this](const auto& token, const auto* error) { got.TakeToken(token, error); })
        , takeVerdict(
              [this](const auto& verdict, const auto* error) { got.TakeVerdict(verdict, error); })
    {}

    Outcome got;
    boost::function<void(const TokenPtr&, const Quillon::Exception*)> takeToken;
    boost::function<void(const boost::optional<bool>&, const Quillon::Exception*)> takeVerdict;
};

} // namespace

TEST_F(SyncCallToResultFuncTest, DeliversTheToken)
{
    const TokenPtr token = boost::make_shared<FakeSamlToken>();
    SyncCallToResultFunc([&] { return token; }, takeToken, NoToken);
    EXPECT_EQ(got.calls, 1);
    EXPECT_EQ(got.token, token);
    EXPECT_EQ(got.error, "");
}

TEST_F(SyncCallToResultFuncTest, DeliversANullTokenAsSuccess)
{
    SyncCallToResultFunc([] { return TokenPtr(); }, takeToken, NoToken);
    EXPECT_EQ(got.calls, 1);
    EXPECT_EQ(got.error, "");
}

TEST_F(SyncCallToResultFuncTest, DeliversBothVerdicts)
{
    for (const bool verdict : {true, false}) {
        SyncCallToResultFunc([&] { return verdict; }, takeVerdict, NoVerdict);
        EXPECT_EQ(got.verdict, boost::optional<bool>(verdict));
        EXPECT_EQ(got.error, "");
    }
}

TEST_F(SyncCallToResultFuncTest, DeliversTheExceptionAndTheDefault)
{
    SyncCallToResultFunc(
        []() -> bool { throw InvalidCredentialsException("no"); }, takeVerdict, NoVerdict);
    EXPECT_EQ(got.calls, 1);
    EXPECT_EQ(got.verdict, boost::none);
    EXPECT_EQ(got.error, "InvalidCredentialsException: no");
}

TEST_F(SyncCallToResultFuncTest, LetsOtherExceptionsLeaveUndelivered)
{
    const auto fail = []() -> TokenPtr { throw std::bad_alloc(); };
    EXPECT_THROW(SyncCallToResultFunc(fail, takeToken, NoToken), std::bad_alloc);
    EXPECT_EQ(got.calls, 0);
}

TEST_F(SyncCallToResultFuncTest, CallsACompletionThatThrowsOnceOnly)
{
    int calls = 0;
    const auto complain = [&](const TokenPtr&, const Quillon::Exception*) {
        ++calls;
        throw SsoException("completion");
    };
    EXPECT_THROW(SyncCallToResultFunc([] { return TokenPtr(); }, complain, NoToken), SsoException);
    EXPECT_EQ(calls, 1);
}

TEST_F(SyncCallToResultFuncTest, LetsWhatACompletionThrowsAboutAFailureLeave)
{
    const auto complain = [](const TokenPtr&, const Quillon::Exception* error) { error->Throw(); };
    const auto fail = []() -> TokenPtr { throw ParseException("token"); };
    EXPECT_THROW(SyncCallToResultFunc(fail, complain, NoToken), ParseException);
}

TEST_F(SyncCallToResultFuncTest, RaisesTheEmptyFunctionErrorForAnEmptyCompletion)
{
    const boost::function<void(const TokenPtr&, const Quillon::Exception*)> empty;
    try {
        SyncCallToResultFunc([] { return TokenPtr(); }, empty, NoToken);
        FAIL() << "no exception";
    } catch (const boost::bad_function_call& error) {
        EXPECT_STREQ(error.what(), "call to empty boost::function");
    }
}
