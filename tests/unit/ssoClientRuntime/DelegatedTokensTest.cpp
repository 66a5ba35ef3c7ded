#include "ssoClientRuntime/DelegatedTokens.h"

#include "ScriptedService.h"
#include "VirtualEnvironment.h"

#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/PoolSupport.h"

#include "ssoClient/Exceptions.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <boost/smart_ptr/weak_ptr.hpp>
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

using namespace SsoClient;
using namespace std::chrono_literals;
using Testing::ScriptedService;
using Testing::Token;
using Testing::VirtualEnvironment;

namespace {

class DelegatedTokensTest : public testing::Test
{
protected:
    DelegatedTokensTest() { options.environment = environment; }

    boost::shared_ptr<VirtualEnvironment> environment = boost::make_shared<VirtualEnvironment>();
    boost::shared_ptr<ScriptedService> service = boost::make_shared<ScriptedService>(environment);
    DelegatedTokensOptions options;
    TokenSpec spec;

    static FakeSamlToken Present(const std::string& xml)
    {
        FakeSamlToken token;
        token.xml = xml;
        token.endDate = Quillon::System::DateTime("2011-07-06T09:00:00Z");
        return token;
    }

    /** Asks twice, in two ways, and says whether there was one exchange for both. */
    bool AreTheSame(const TokenSpec& one, const TokenSpec& other)
    {
        const auto tokens = CreateDelegatedTokens(options);
        const FakeSamlToken user = Present("<user/>");
        return tokens->GetToken(service, user, one) == tokens->GetToken(service, user, other);
    }

    template <class Change>
    bool Counts(const Change& change)
    {
        TokenSpec other = spec;
        change(other);
        return !AreTheSame(spec, other) && AreTheSame(other, other);
    }
};

TEST_F(DelegatedTokensTest, ExchangesAPresentedTokenOnce)
{
    const auto tokens = CreateDelegatedTokens(options);
    const Token token = tokens->GetToken(service, Present("<user/>"), spec);
    EXPECT_EQ("_1", token->GetId());
    EXPECT_EQ(token, tokens->GetToken(service, Present("<user/>"), spec));
    EXPECT_EQ(1U, service->calls.size());
    EXPECT_EQ(1U, tokens->GetStatus().hits);
    EXPECT_EQ(1U, tokens->GetStatus().misses);
}

TEST_F(DelegatedTokensTest, NeverGivesOneUsersTokenToAnother)
{
    const auto tokens = CreateDelegatedTokens(options);
    const std::vector<std::string> texts = {"<user/>", "<user />", "<user/> ", "<USER/>", "", "<u"};
    for (const std::string& text : texts) {
        tokens->GetToken(service, Present(text), spec);
    }
    EXPECT_EQ(texts.size(), service->calls.size());
    FakeSamlToken alike = Present("<user/>");
    alike.id = "_other";
    EXPECT_EQ("_1", tokens->GetToken(service, alike, spec)->GetId()) << "the text counts";
}

TEST_F(DelegatedTokensTest, NeverGivesOneServicesTokenForAnothers)
{
    const auto tokens = CreateDelegatedTokens(options);
    const auto other = boost::make_shared<ScriptedService>(environment);
    const Token token = tokens->GetToken(service, Present("<user/>"), spec);
    EXPECT_NE(token, tokens->GetToken(other, Present("<user/>"), spec));
    EXPECT_EQ(1U, other->calls.size());
}

TEST_F(DelegatedTokensTest, KeepsAServiceWhoseAddressItCompares)
{
    const auto tokens = CreateDelegatedTokens(options);
    tokens->GetToken(service, Present("<user/>"), spec);
    const boost::weak_ptr<ScriptedService> kept = service;
    service.reset();
    EXPECT_FALSE(kept.expired());
    tokens->Clear();
    EXPECT_TRUE(kept.expired());
}

TEST_F(DelegatedTokensTest, TellsEveryFieldOfTheSpecApart)
{
    spec.audienceRestriction = {"a", "b"};
    spec.advice = {{"source", {{"name", {"value", "other"}}}}};
    spec.delegateTo = std::string("proxy");
    EXPECT_TRUE(AreTheSame(spec, spec));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.tokenLifetimeSec = 301; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.audienceRestriction = {"ab"}; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.audienceRestriction = {}; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.advice.clear(); }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.advice[0].source += "s"; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.advice[0].attributes[0].name += "s"; }));
    EXPECT_TRUE(
        Counts([](TokenSpec& other) { other.advice[0].attributes[0].values = {"valueother"}; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.delegable = true; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.delegateTo = boost::none; }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.delegateTo = std::string("prox"); }));
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.renewable = true; }));
    EXPECT_TRUE(
        Counts([](TokenSpec& other) { other.confirmation = TokenSpec::CONFIRMATION_BEARER; }));
    spec.delegateTo = boost::none;
    EXPECT_TRUE(Counts([](TokenSpec& other) { other.delegateTo = std::string(); }));
}

// What is in one field cannot look as if it were in two.
TEST_F(DelegatedTokensTest, TellsNeighbouringFieldsApart)
{
    TokenSpec other = spec;
    spec.audienceRestriction = {"1;a1;b"};
    other.audienceRestriction = {"1;a", "b"};
    EXPECT_FALSE(AreTheSame(spec, other));
    spec.audienceRestriction = {"a", "bc"};
    other.audienceRestriction = {"ab", "c"};
    EXPECT_FALSE(AreTheSame(spec, other));
    spec.audienceRestriction = {"a"};
    other.audienceRestriction = {};
    other.advice = {{"a", {}}};
    EXPECT_FALSE(AreTheSame(spec, other));
}

TEST_F(DelegatedTokensTest, KeepsATokenUntilItHasLittleLeft)
{
    const auto tokens = CreateDelegatedTokens(options);
    const FakeSamlToken user = Present("<user/>");
    tokens->GetToken(service, user, spec);
    environment->Pass(59min);
    EXPECT_EQ("_1", tokens->GetToken(service, user, spec)->GetId());
    environment->Pass(1us);
    EXPECT_EQ("_2", tokens->GetToken(service, user, spec)->GetId());
    environment->StepWall(-8h);
    environment->Pass(59min + 1us);
    EXPECT_EQ("_3", tokens->GetToken(service, user, spec)->GetId());
    EXPECT_EQ(1U, tokens->GetStatus().entries);
}

TEST_F(DelegatedTokensTest, KeepsNoTokenBeyondTheEndOfThePresentedOne)
{
    const auto tokens = CreateDelegatedTokens(options);
    FakeSamlToken user = Present("<user/>");
    user.endDate = Testing::After(environment->GetWallTime(), 10min);
    tokens->GetToken(service, user, spec);
    environment->Pass(10min);
    EXPECT_EQ("_1", tokens->GetToken(service, user, spec)->GetId());
    environment->Pass(1us);
    EXPECT_EQ("_2", tokens->GetToken(service, user, spec)->GetId());
    EXPECT_EQ(0U, tokens->GetStatus().entries);
}

TEST_F(DelegatedTokensTest, GivesAShortTokenOnlyToWhoWaitedForIt)
{
    const auto tokens = CreateDelegatedTokens(options);
    service->lifetime = 59s;
    EXPECT_EQ("_1", tokens->GetToken(service, Present("<user/>"), spec)->GetId());
    EXPECT_EQ("_2", tokens->GetToken(service, Present("<user/>"), spec)->GetId());
    EXPECT_EQ(0U, tokens->GetStatus().entries);
}

TEST_F(DelegatedTokensTest, GivesNoExpiredToken)
{
    const auto tokens = CreateDelegatedTokens(options);
    service->clockAhead = -61min;
    EXPECT_EQ(
        "InvalidTokenException: The token that came was issued at 2011-07-05T07:59:00.000Z and ends"
        " at 2011-07-05T08:59:00.000Z, which is too early at 2011-07-05T09:00:00.000Z",
        GetFailure([&] { tokens->GetToken(service, Present("<user/>"), spec); }));
}

TEST_F(DelegatedTokensTest, ThrowsWhatTheExchangeFailsWithAndKeepsNothing)
{
    const auto tokens = CreateDelegatedTokens(options);
    service->before = [] { throw InvalidCredentialsException("revoked"); };
    EXPECT_EQ("InvalidCredentialsException: revoked", GetFailure([&] {
                  tokens->GetToken(service, Present("<user/>"), spec);
              }));
    service->before = [] {};
    EXPECT_EQ("_2", tokens->GetToken(service, Present("<user/>"), spec)->GetId());
    EXPECT_EQ(0U, tokens->GetStatus().underWay);
    EXPECT_EQ(
        "InvalidArgumentException: Invalid argument : there is no token service",
        GetFailure([&] { tokens->GetToken(nullptr, Present("<user/>"), spec); }));
}

TEST_F(DelegatedTokensTest, WhatWasUsedLeastRecentlyGoesFirst)
{
    options.maxEntries = 2;
    const auto tokens = CreateDelegatedTokens(options);
    tokens->GetToken(service, Present("<a/>"), spec);
    tokens->GetToken(service, Present("<b/>"), spec);
    tokens->GetToken(service, Present("<a/>"), spec);
    tokens->GetToken(service, Present("<c/>"), spec);
    EXPECT_EQ(2U, tokens->GetStatus().entries);
    EXPECT_EQ(1U, tokens->GetStatus().evicted);
    EXPECT_EQ("_1", tokens->GetToken(service, Present("<a/>"), spec)->GetId());
    EXPECT_EQ("_4", tokens->GetToken(service, Present("<b/>"), spec)->GetId());
}

TEST_F(DelegatedTokensTest, IsBoundedInBytes)
{
    options.maxBytes = 20'000;
    const auto tokens = CreateDelegatedTokens(options);
    for (char letter = 'a'; letter <= 'z'; ++letter) {
        tokens->GetToken(service, Present(std::string(4'000, letter)), spec);
        EXPECT_GE(20'000U, tokens->GetStatus().bytes);
    }
    EXPECT_EQ(3U, tokens->GetStatus().entries);
    EXPECT_LT(15'000U, tokens->GetStatus().bytes);
    tokens->GetToken(service, Present(std::string(20'000, 'a')), spec);
    EXPECT_EQ(3U, tokens->GetStatus().entries) << "one that never fits makes no room";
    tokens->Clear();
    EXPECT_EQ(0U, tokens->GetStatus().bytes);
}

TEST_F(DelegatedTokensTest, KeepsNothingIfThereIsNoRoomAtAll)
{
    options.maxEntries = 0;
    const auto tokens = CreateDelegatedTokens(options);
    EXPECT_EQ("_1", tokens->GetToken(service, Present("<a/>"), spec)->GetId());
    EXPECT_EQ("_2", tokens->GetToken(service, Present("<a/>"), spec)->GetId());
}

TEST_F(DelegatedTokensTest, GivesNoTokenThatWasRefused)
{
    const auto tokens = CreateDelegatedTokens(options);
    tokens->GetToken(service, Present("<a/>"), spec);
    tokens->GetToken(service, Present("<b/>"), spec);
    tokens->Invalidate("_1");
    EXPECT_EQ("_3", tokens->GetToken(service, Present("<a/>"), spec)->GetId());
    EXPECT_EQ("_2", tokens->GetToken(service, Present("<b/>"), spec)->GetId());
}

TEST_F(DelegatedTokensTest, ForgetsAUser)
{
    const auto tokens = CreateDelegatedTokens(options);
    TokenSpec other = spec;
    other.renewable = true;
    tokens->GetToken(service, Present("<a/>"), spec);
    tokens->GetToken(service, Present("<a/>"), other);
    tokens->GetToken(service, Present("<b/>"), spec);
    tokens->Forget(Present("<a/>"));
    EXPECT_EQ(1U, tokens->GetStatus().entries);
    EXPECT_EQ("_3", tokens->GetToken(service, Present("<b/>"), spec)->GetId());
}

TEST_F(DelegatedTokensTest, ForgetsAUserWhoseExchangeIsUnderWay)
{
    const auto tokens = CreateDelegatedTokens(options);
    service->before = [&] { tokens->Forget(Present("<a/>")); };
    EXPECT_EQ("_1", tokens->GetToken(service, Present("<a/>"), spec)->GetId());
    EXPECT_EQ(0U, tokens->GetStatus().entries);
    EXPECT_EQ("_2", tokens->GetToken(service, Present("<b/>"), spec)->GetId());
    EXPECT_EQ(1U, tokens->GetStatus().entries);
    service->before = [&] { tokens->Clear(); };
    EXPECT_EQ("_3", tokens->GetToken(service, Present("<c/>"), spec)->GetId());
    EXPECT_EQ(0U, tokens->GetStatus().entries);
}

TEST_F(DelegatedTokensTest, HasOneExchangeForAKeyHoweverManyWantIt)
{
    const auto tokens = CreateDelegatedTokens(options);
    Testing::Gate gate;
    service->before = gate.MakeWaiter();
    std::vector<std::thread> callers;
    for (int caller = 0; caller < 8; ++caller) {
        callers.emplace_back(
            [&] { EXPECT_EQ("_1", tokens->GetToken(service, Present("<a/>"), spec)->GetId()); });
    }
    while (tokens->GetStatus().hits < 7) {
        std::this_thread::yield();
    }
    EXPECT_EQ(1U, tokens->GetStatus().underWay);
    gate.Open();
    for (std::thread& caller : callers) {
        caller.join();
    }
    EXPECT_EQ(1U, service->calls.size());
    EXPECT_EQ(1U, tokens->GetStatus().misses);
}

TEST_F(DelegatedTokensTest, NeverJoinsTheExchangeOfAnotherUser)
{
    const auto tokens = CreateDelegatedTokens(options);
    service->before = [&] {
        service->before = [] {};
        EXPECT_EQ("_2", tokens->GetToken(service, Present("<b/>"), spec)->GetId());
    };
    tokens->GetToken(service, Present("<a/>"), spec);
    EXPECT_EQ(2U, service->calls.size());
}

TEST_F(DelegatedTokensTest, RefusesOptionsThatMakeNoSense)
{
    options.minRemainingValidity = -1ms;
    EXPECT_THROW(CreateDelegatedTokens(options), Quillon::InvalidArgumentException);
}

} // namespace
