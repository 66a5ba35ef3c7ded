#include "NegotiationHarness.h"
#include "Requests.h"

#include <future>

namespace DevStsTests {

namespace {

/** Alice waits for the answer to her second leg, which would get her a token. */
class PendingNegotiation : public NegotiationTest
{
protected:
    PendingNegotiation()
        : _alice(
            Realm::Shared().Tickets("alice"), ServicePrincipal, GSS_C_MUTUAL_FLAG | GSS_C_DCE_STYLE)
        , _first(PostIssue(FirstRequest(_alice.Step())))
        , _context(ContextOf(_first))
        , _cookie(CookieOf(_first))
        , _leg(_alice.Step(LegOf(_first)))
    {}

    static std::string NoSuchContext(const std::string& context)
    {
        return "No negotiation is under way with the Context '" + context + "'";
    }

    static std::string NoCookie(const std::string& context)
    {
        return "The request does not carry the cookie of the negotiation '" + context + "'";
    }

    Initiator _alice;
    HttpResult _first;
    std::string _context;
    std::string _cookie;
    std::string _leg;
};

TEST_F(PendingNegotiation, UnknownContextIsRefused)
{
    const std::string unknown = "urn:uuid:5a3c1f6e-0d4b-4c57-9d3e-2f8a7b6c5d4e";
    EXPECT_EQ(
        FaultText(PostNext(unknown, _leg, _cookie), "wst:InvalidRequest"), NoSuchContext(unknown));
    EXPECT_EQ(PostNext(_context, _leg, _cookie).status, 200);
}

TEST_F(PendingNegotiation, LegOfAnotherNegotiationIsRefused)
{
    const HttpResult other = BeginToWait();
    const HttpResult reply = PostNext(ContextOf(other), _leg, CookieOf(other));
    EXPECT_EQ(
        FaultText(reply, "wst:FailedAuthentication"),
        "The negotiation has failed: Invalid token was supplied");
    EXPECT_EQ(PostNext(_context, _leg, _cookie).status, 200);
}

TEST_F(PendingNegotiation, MissingCookieIsRefused)
{
    EXPECT_EQ(FaultText(PostNext(_context, _leg, ""), "wst:InvalidRequest"), NoCookie(_context));
}

TEST_F(PendingNegotiation, ForeignCookieIsRefusedAndTheNegotiationGoesOn)
{
    const std::string foreign = CookieOf(BeginToWait());
    EXPECT_EQ(
        FaultText(PostNext(_context, _leg, foreign), "wst:InvalidRequest"), NoCookie(_context));
    EXPECT_EQ(PostNext(_context, _leg, _cookie).status, 200);
}

TEST_F(PendingNegotiation, FinishedOneIsGone)
{
    EXPECT_EQ(PostNext(_context, _leg, _cookie).status, 200);
    EXPECT_EQ(
        FaultText(PostNext(_context, _leg, _cookie), "wst:InvalidRequest"),
        NoSuchContext(_context));
}

TEST_F(PendingNegotiation, FailedOneIsGone)
{
    EXPECT_EQ(
        FaultText(PostNext(_context, "garbage", _cookie), "wst:FailedAuthentication"),
        "The negotiation has failed: Invalid token was supplied");
    EXPECT_EQ(
        FaultText(PostNext(_context, _leg, _cookie), "wst:InvalidRequest"),
        NoSuchContext(_context));
}

TEST_F(PendingNegotiation, OneOfManyEqualLegsAtOnceIsTaken)
{
    std::vector<std::future<int>> replies(16);
    for (std::future<int>& reply : replies) {
        reply = std::async(
            std::launch::async, [this] { return PostNext(_context, _leg, _cookie).status; });
    }
    int taken = 0;
    for (std::future<int>& reply : replies) {
        taken += reply.get() == 200 ? 1 : 0;
    }
    EXPECT_EQ(taken, 1);
}

std::string LaterRequest(const std::string& request)
{
    return Replaced(
        Replaced(request, "2026-11-20T12:00:00.000Z", "2026-11-20T12:05:00.000Z"),
        "2026-11-20T12:10:00.000Z",
        "2026-11-20T12:15:00.000Z");
}

TEST_F(PendingNegotiation, NearlyAgedOneGoesOn)
{
    _now = StartTime() + std::chrono::minutes(5) - std::chrono::microseconds(1);
    EXPECT_EQ(PostNext(LaterRequest(NextRequest(_context, _leg)), _cookie).status, 200);
}

TEST_F(PendingNegotiation, AgedOneIsGone)
{
    _now = StartTime() + std::chrono::minutes(5);
    EXPECT_EQ(
        FaultText(
            PostNext(LaterRequest(NextRequest(_context, _leg)), _cookie), "wst:InvalidRequest"),
        NoSuchContext(_context));
}

TEST_F(PendingNegotiation, OldMessageIsRefusedAndTheNegotiationGoesOn)
{
    const std::string old = Replaced(
        Replaced(
            NextRequest(_context, _leg), "2026-11-20T12:00:00.000Z", "2026-11-20T11:40:00.000Z"),
        "2026-11-20T12:10:00.000Z",
        "2026-11-20T11:50:00.000Z");
    EXPECT_EQ(
        FaultText(PostNext(old, _cookie), "wst:ExpiredData"),
        "The message created at 2026-11-20T11:40:00.000Z has expired");
    EXPECT_EQ(PostNext(_context, _leg, _cookie).status, 200);
}

/** A server on which three negotiations may wait. */
class FewNegotiations : public NegotiationTest
{
protected:
    FewNegotiations()
        : NegotiationTest(3)
    {
        for (int i = 0; i < 3; ++i) {
            _waiting = BeginToWait();
            EXPECT_EQ(_waiting.status, 200);
        }
    }

    HttpResult _waiting; ///< the last one
};

TEST_F(FewNegotiations, OneTooManyIsRefused)
{
    EXPECT_EQ(
        FaultText(BeginToWait(), "wst:RequestFailed"), "Too many negotiations are under way: 3");
}

TEST_F(FewNegotiations, EndedOneMakesRoom)
{
    EXPECT_EQ(PostNext(ContextOf(_waiting), "garbage", CookieOf(_waiting)).status, 500);
    EXPECT_EQ(BeginToWait().status, 200);
    EXPECT_EQ(
        FaultText(BeginToWait(), "wst:RequestFailed"), "Too many negotiations are under way: 3");
}

TEST_F(FewNegotiations, AgedOnesMakeRoom)
{
    _now = StartTime() + std::chrono::minutes(5);
    EXPECT_EQ(PostIssue(LaterRequest(FirstRequest(OfferOfKerberos()))).status, 200);
}

TEST_F(FewNegotiations, OneLegNeedsNoRoom)
{
    Initiator alice = Alice();
    EXPECT_EQ(PostIssue(FirstRequest(alice.Step())).status, 200);
}

} // namespace

} // namespace DevStsTests
