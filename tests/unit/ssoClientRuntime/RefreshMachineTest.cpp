#include "ssoClientRuntime/RefreshMachine.h"

#include "VirtualEnvironment.h"

#include <gtest/gtest.h>

#include <chrono>

using namespace SsoClient;
using namespace std::chrono_literals;
using Testing::AlmostOne;

namespace {

double Seconds(Span span)
{
    return static_cast<double>(span.count()) / 1e6;
}

/** A machine with a clock pair and a chance that the test sets. */
class RefreshMachineTest : public testing::Test
{
protected:
    RefreshMachineTest() { machine.Want(); }

    Moment now{Span(1'000'000h), Span(10h)};
    double chance = 0.5;
    RefreshPolicy policy;
    RefreshMachine machine{policy, [this] { return chance; }};

    void Pass(Span span)
    {
        now.wall += span;
        now.steady += span;
    }

    bool Arrive(Span lifetime = 1h, bool isRenewable = false, Span clockAhead = Span())
    {
        const Span issued = now.wall + clockAhead;
        return machine.Accept(now, now, {{issued, issued + lifetime}, isRenewable});
    }

    /** Has a first token, and then one that came when it was planned. */
    void BecomeRegular(bool isRenewable = false)
    {
        EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
        EXPECT_TRUE(Arrive(1h, isRenewable));
        PassUntilDue();
        EXPECT_NE(Attempt::NONE, machine.Begin(now));
        EXPECT_TRUE(Arrive(1h, isRenewable));
    }

    /** How long it takes until something is due; begins nothing. */
    Span PassUntilDue()
    {
        const Span before = now.steady;
        while (machine.GetWakeUp(now) != now.steady) {
            Pass(*machine.GetWakeUp(now) - now.steady);
        }
        return now.steady - before;
    }

    Span FailAndWait(FailureKind kind)
    {
        EXPECT_NE(Attempt::NONE, machine.Begin(now));
        machine.Fail(now, kind);
        return machine.GetOutage()->nextAttempt - now.steady;
    }
};

TEST_F(RefreshMachineTest, DoesNothingBeforeSomebodyWantsAToken)
{
    RefreshMachine idle(policy, [] { return 0.0; });
    EXPECT_EQ(Attempt::NONE, idle.Begin(now));
    EXPECT_FALSE(idle.GetWakeUp(now));
}

TEST_F(RefreshMachineTest, HasOneAttemptUnderWay)
{
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
    Pass(2h);
    EXPECT_EQ(Attempt::NONE, machine.Begin(now));
    EXPECT_FALSE(machine.GetWakeUp(now));
}

TEST_F(RefreshMachineTest, RefreshesAfterSevenTenthsOfTheLifetime)
{
    BecomeRegular();
    EXPECT_EQ(Span(42min), PassUntilDue());
}

TEST_F(RefreshMachineTest, RefreshesATenthEarlierOrLater)
{
    chance = 0;
    BecomeRegular();
    EXPECT_NEAR(0.9 * 42 * 60, Seconds(PassUntilDue()), 0.01);
    EXPECT_NE(Attempt::NONE, machine.Begin(now));
    chance = AlmostOne;
    Arrive();
    EXPECT_NEAR(1.1 * 42 * 60, Seconds(PassUntilDue()), 0.01);
}

TEST_F(RefreshMachineTest, SpreadsTheFirstRefreshMoreWidely)
{
    chance = 0;
    machine.Begin(now);
    Arrive();
    EXPECT_NEAR(50.4, Seconds(PassUntilDue()), 0.01);
    machine.Begin(now);
    machine.Fail(now, FailureKind::TRANSIENT);
    PassUntilDue();
    machine.Begin(now);
    Arrive();
    EXPECT_NEAR(50.4, Seconds(PassUntilDue()), 0.01) << "after an outage";
    machine.Begin(now);
    Arrive();
    chance = AlmostOne;
    machine.Retry();
    machine.Begin(now);
    Arrive();
    EXPECT_NEAR(42.0, Seconds(PassUntilDue()) / 60, 0.01) << "out of turn";
}

TEST_F(RefreshMachineTest, DrawsTheFirstRefreshLikeAnyOtherIfItIsToldTo)
{
    policy.spreadsFirst = false;
    machine = RefreshMachine(policy, [] { return 0.0; });
    machine.Want();
    machine.Begin(now);
    Arrive();
    EXPECT_NEAR(0.9 * 42 * 60, Seconds(PassUntilDue()), 0.01);
}

TEST_F(RefreshMachineTest, RefreshesWhileThereIsTimeLeftOfAShortToken)
{
    machine.Begin(now);
    ASSERT_TRUE(Arrive(65s));
    EXPECT_LE(PassUntilDue(), Span(4500ms));
    EXPECT_TRUE(machine.IsGood(now));
}

TEST_F(RefreshMachineTest, RefusesATokenThatHasTooLittleLeft)
{
    machine.Begin(now);
    EXPECT_FALSE(Arrive(59s));
    EXPECT_FALSE(machine.IsGood(now));
    EXPECT_EQ(Span(1min), machine.GetOutage()->nextAttempt - now.steady);
    EXPECT_FALSE(machine.IsUnderWay());
}

TEST_F(RefreshMachineTest, HandsATokenOutUntilItHasLessThanAsked)
{
    machine.Begin(now);
    Arrive();
    Pass(59min);
    EXPECT_TRUE(machine.IsGood(now));
    Pass(Span(1));
    EXPECT_FALSE(machine.IsGood(now));
}

TEST_F(RefreshMachineTest, JudgesByElapsedTimeWhenTheWallClockIsSetBack)
{
    machine.Begin(now);
    Arrive();
    now.wall -= 5h;
    Pass(59min);
    EXPECT_TRUE(machine.IsGood(now));
    Pass(Span(1));
    EXPECT_FALSE(machine.IsGood(now));
}

TEST_F(RefreshMachineTest, JudgesByTheWallClockAfterTheMachineSlept)
{
    machine.Begin(now);
    Arrive();
    now.wall += 59min;
    EXPECT_TRUE(machine.IsGood(now));
    now.wall += Span(1);
    EXPECT_FALSE(machine.IsGood(now));
    EXPECT_EQ(now.steady, machine.GetWakeUp(now));
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, NoticesWithinAMinuteThatTheMachineSlept)
{
    machine.Begin(now);
    Arrive();
    EXPECT_EQ(now.steady + 1min, machine.GetWakeUp(now));
}

TEST_F(RefreshMachineTest, TakesTheServicesWordForTheLifetimeAndItsOwnClockForTheEnd)
{
    machine.Begin(now);
    ASSERT_TRUE(Arrive(1h, false, 5min)); // ends in 65 minutes, but was meant to live for 60
    Pass(59min);
    EXPECT_TRUE(machine.IsGood(now));
    Pass(1s);
    EXPECT_FALSE(machine.IsGood(now));
    machine.Begin(now);
    ASSERT_TRUE(Arrive(1h, false, -5min)); // ends in 55 minutes by our clock
    Pass(54min);
    EXPECT_TRUE(machine.IsGood(now));
    Pass(1s);
    EXPECT_FALSE(machine.IsGood(now));
}

TEST_F(RefreshMachineTest, CountsTheLifetimeFromWhenTheTokenWasAskedFor)
{
    machine.Begin(now);
    const Moment asked = now;
    Pass(4min);
    ASSERT_TRUE(machine.Accept(asked, now, {{now.wall, now.wall + 1h}, false}));
    Pass(55min);
    EXPECT_TRUE(machine.IsGood(now));
    Pass(1s);
    EXPECT_FALSE(machine.IsGood(now));
}

TEST_F(RefreshMachineTest, RenewsWhatIsRenewable)
{
    machine.Begin(now);
    Arrive(1h, true);
    PassUntilDue();
    EXPECT_EQ(Attempt::RENEW, machine.Begin(now));
    Arrive(1h, false);
    PassUntilDue();
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, AcquiresAtOnceWhatCannotBeRenewed)
{
    BecomeRegular(true);
    PassUntilDue();
    EXPECT_EQ(Attempt::RENEW, machine.Begin(now));
    machine.Fail(now, FailureKind::REFUSED);
    EXPECT_FALSE(machine.GetOutage());
    EXPECT_EQ(now.steady, machine.GetWakeUp(now));
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, AcquiresAtOnceWhatCannotBeRenewedThoughItWasOutOfTurn)
{
    BecomeRegular(true);
    machine.Retry();
    EXPECT_EQ(Attempt::RENEW, machine.Begin(now));
    machine.Fail(now, FailureKind::REFUSED);
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, RenewsAgainAfterAPassingFailure)
{
    BecomeRegular(true);
    PassUntilDue();
    machine.Begin(now);
    machine.Fail(now, FailureKind::TRANSIENT);
    EXPECT_TRUE(machine.GetOutage());
    PassUntilDue();
    EXPECT_EQ(Attempt::RENEW, machine.Begin(now));
}

TEST_F(RefreshMachineTest, DoesNotRenewWhatIsNoLongerGood)
{
    BecomeRegular(true);
    Pass(59min + 1s);
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, BacksOffWithDecorrelatedJitter)
{
    chance = 0;
    EXPECT_EQ(Span(1s), FailAndWait(FailureKind::TRANSIENT));
    EXPECT_EQ(Attempt::NONE, machine.Begin(now));
    Pass(1s);
    EXPECT_EQ(Span(1s), FailAndWait(FailureKind::TRANSIENT));
    Pass(1s);
    chance = 0.5;
    EXPECT_EQ(Span(2s), FailAndWait(FailureKind::TRANSIENT)); // between 1 and 3
    Pass(2s);
    EXPECT_EQ(Span(3500ms), FailAndWait(FailureKind::TRANSIENT)); // between 1 and 6
}

TEST_F(RefreshMachineTest, WaitsFiveMinutesAtMost)
{
    chance = AlmostOne;
    Span wait{};
    for (int attempt = 0; attempt < 8; ++attempt) {
        wait = FailAndWait(FailureKind::TRANSIENT);
        Pass(wait);
    }
    EXPECT_EQ(Span(5min), wait);
}

TEST_F(RefreshMachineTest, RepeatsAfterAMinuteWhatCannotGetBetter)
{
    EXPECT_EQ(Span(1min), FailAndWait(FailureKind::REFUSED));
    Pass(1min - 1us);
    EXPECT_EQ(Attempt::NONE, machine.Begin(now));
    Pass(1us);
    EXPECT_EQ(Span(2min), FailAndWait(FailureKind::REFUSED));
    Pass(2min);
    EXPECT_EQ(Span(4min), FailAndWait(FailureKind::REFUSED));
    Pass(4min);
    EXPECT_EQ(Span(5min), FailAndWait(FailureKind::REFUSED));
    Pass(5min);
    FailAndWait(FailureKind::TRANSIENT);
    Pass(5min);
    EXPECT_EQ(Span(1min), FailAndWait(FailureKind::REFUSED)) << "not in a row any more";
}

TEST_F(RefreshMachineTest, MayWaitLongerAfterARefusalThanAfterOtherFailures)
{
    policy.refusedWait = 30min;
    machine = RefreshMachine(policy, [] { return 0.5; });
    machine.Want();
    EXPECT_EQ(Span(30min), FailAndWait(FailureKind::REFUSED));
    Pass(30min);
    EXPECT_EQ(Span(30min), FailAndWait(FailureKind::REFUSED));
}

TEST_F(RefreshMachineTest, IsPatientInAnOutageWhileTheTokenIsGood)
{
    BecomeRegular();
    PassUntilDue(); // 17 minutes left
    EXPECT_EQ(Span(2s), FailAndWait(FailureKind::TRANSIENT)) << "may be a passing failure";
    Pass(2s);
    chance = 0;
    EXPECT_EQ((Span(17min) - 2s) / 2, FailAndWait(FailureKind::TRANSIENT));
    PassUntilDue();
    chance = AlmostOne;
    EXPECT_NEAR(
        Seconds(Span(17min - 2s) * 3 / 8), Seconds(FailAndWait(FailureKind::TRANSIENT)), 0.01);
    chance = 0.5;
    PassUntilDue();
    FailAndWait(FailureKind::TRANSIENT);
    EXPECT_GE(machine.GetLease()->steadyUntil, machine.GetOutage()->nextAttempt);
}

TEST_F(RefreshMachineTest, HasNoMorePatienceThanItIsGiven)
{
    machine.Begin(now);
    Arrive(240h);
    PassUntilDue();
    FailAndWait(FailureKind::TRANSIENT);
    PassUntilDue();
    EXPECT_EQ(Span(15min), FailAndWait(FailureKind::TRANSIENT));
    policy.patience = 0s;
    machine = RefreshMachine(policy, [] { return 0.5; });
    machine.Want();
    machine.Begin(now);
    Arrive(240h);
    PassUntilDue();
    FailAndWait(FailureKind::TRANSIENT);
    PassUntilDue();
    EXPECT_EQ(Span(3500ms), FailAndWait(FailureKind::TRANSIENT));
}

TEST_F(RefreshMachineTest, TriesAgainWhenTheTokenIsNoLongerGood)
{
    chance = AlmostOne;
    machine.Begin(now);
    Arrive(3min); // good for 2 minutes
    PassUntilDue();
    Span next{};
    while (machine.IsGood(now) && next != machine.GetLease()->steadyUntil) {
        next = now.steady + FailAndWait(FailureKind::TRANSIENT);
        ASSERT_LE(next, machine.GetLease()->steadyUntil + 1s); // the shortest wait
        PassUntilDue();
    }
    EXPECT_EQ(next, now.steady);
}

TEST_F(RefreshMachineTest, TriesAtOnceWhenSomethingHasChanged)
{
    FailAndWait(FailureKind::REFUSED);
    EXPECT_EQ(Attempt::NONE, machine.Begin(now));
    machine.Retry();
    EXPECT_EQ(now.steady, machine.GetWakeUp(now));
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
    machine.Fail(now, FailureKind::REFUSED);
    EXPECT_EQ(Span(1min), machine.GetOutage()->nextAttempt - now.steady) << "not in a row any more";
}

TEST_F(RefreshMachineTest, AChangeDuringAnAttemptCausesAnotherOne)
{
    machine.Begin(now);
    machine.Retry();
    machine.Fail(now, FailureKind::REFUSED);
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
    machine.Fail(now, FailureKind::REFUSED);
    EXPECT_EQ(Attempt::NONE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, AcquiresAtOnceInThePlaceOfARefusedToken)
{
    BecomeRegular(true);
    Pass(1min);
    EXPECT_FALSE(machine.Forget(now));
    EXPECT_FALSE(machine.IsGood(now));
    EXPECT_FALSE(machine.GetOutage());
    EXPECT_EQ(Attempt::ACQUIRE, machine.Begin(now));
}

TEST_F(RefreshMachineTest, ARowOfRefusedTokensIsARowOfFailures)
{
    machine.Begin(now);
    Span wait{};
    for (int token = 0; token < 20; ++token) {
        ASSERT_TRUE(Arrive());
        Pass(1min - 1us);
        ASSERT_TRUE(machine.Forget(now));
        wait = machine.GetOutage()->nextAttempt - now.steady;
        Pass(wait);
        ASSERT_EQ(Attempt::ACQUIRE, machine.Begin(now));
    }
    EXPECT_EQ(Span(5min), wait);
}

TEST_F(RefreshMachineTest, CountsAnewAfterATokenThatLasted)
{
    chance = AlmostOne;
    for (int attempt = 0; attempt < 8; ++attempt) {
        Pass(FailAndWait(FailureKind::TRANSIENT));
    }
    machine.Begin(now);
    Arrive();
    PassUntilDue();
    chance = 0.5;
    EXPECT_EQ(Span(2s), FailAndWait(FailureKind::TRANSIENT));
}

TEST_F(RefreshMachineTest, RemembersWhenTheFailuresBegan)
{
    const Span began = now.wall;
    Pass(FailAndWait(FailureKind::TRANSIENT));
    Pass(FailAndWait(FailureKind::REFUSED));
    EXPECT_EQ(began, machine.GetOutage()->since.wall);
    machine.Begin(now);
    Arrive();
    EXPECT_FALSE(machine.GetOutage());
}

} // namespace
