#include "ssoClient/client/operation.h"

#include "logCapture.h"
#include "serviceFakes.h"
#include "support/Failure.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::ContainsRegex;
using testing::ElementsAre;

TEST(Run, LogsWhatIsAskedForBetweenBeginAndEnd)
{
    const LogCapture log(64);
    EXPECT_EQ(
        7,
        SsoClient::Run(
            "Name", [] { return "description"; }, [] { return 7; }));
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "Name")),
            "SsoClient[64]: description",
            ContainsRegex(FrameLinePattern("END", "Name"))));
}

TEST(Run, DescribesNothingBelowLevel64)
{
    const LogCapture log(63);
    int descriptions = 0;
    const auto describe = [&descriptions] {
        ++descriptions;
        return "description";
    };
    SsoClient::Run("Name", describe, [] {});
    const FakeTransport transport;
    SsoClient::Run(
        transport, "Name", describe, [](Request&) {}, [](Quillon::Reader*) {});
    EXPECT_EQ(0, descriptions);
    EXPECT_EQ(transport.sessionsMade, 1);
}

TEST(Run, BuildsThenConnectsThenReads)
{
    const FakeTransport transport;
    const int result = SsoClient::Run(
        transport,
        "Name",
        [] { return "description"; },
        [&](Request& request) {
            EXPECT_EQ(transport.sessionsMade, 0);
            request.body = "built";
        },
        [&](Quillon::Reader*) {
            EXPECT_EQ(transport.sent.at(0).body, "built");
            EXPECT_EQ(transport.sessionsAlive, 0);
            return 7;
        });
    EXPECT_EQ(7, result);
}

TEST(Run, LogsTheEndOfWhatFails)
{
    const LogCapture log(64);
    const auto fail = [] { throw std::runtime_error("failed"); };
    EXPECT_EQ("runtime_error: failed", GetFailure([&fail] {
                  SsoClient::Run(
                      "Name", [] { return "description"; }, fail);
              }));
    EXPECT_THAT(log.lines.back(), ContainsRegex(FrameLinePattern("END", "Name")));
}
