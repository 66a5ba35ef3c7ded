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
            nullptr, "Name", [] { return "description"; }, [](Call&) { return 7; }));
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
    SsoClient::Run(nullptr, "Name", describe, [](Call&) {});
    const FakeTransport transport;
    const boost::shared_ptr<const ResponseHandler> handler =
        boost::make_shared<ReplyIsToken>(transport);
    SsoClient::Run(
        Road{nullptr, transport, handler},
        "Name",
        describe,
        [](Request&) {},
        [](const ResponseHandler&, Quillon::Reader*) {});
    EXPECT_EQ(0, descriptions);
    EXPECT_EQ(transport.sessionsMade, 1);
}

TEST(Run, BuildsThenConnectsThenReads)
{
    const FakeTransport transport;
    const boost::shared_ptr<const ResponseHandler> handler =
        boost::make_shared<ReplyIsToken>(transport);
    const int result = SsoClient::Run(
        Road{nullptr, transport, handler},
        "Name",
        [] { return "description"; },
        [&](Request& request) {
            EXPECT_EQ(transport.sessionsMade, 0);
            request.body = "built";
        },
        [&](const ResponseHandler& reader, Quillon::Reader*) {
            EXPECT_EQ(&reader, handler.get());
            EXPECT_EQ(transport.sent.at(0).body, "built");
            EXPECT_EQ(transport.sessionsAlive, 0);
            return 7;
        });
    EXPECT_EQ(7, result);
}

TEST(Run, LogsTheEndOfWhatFails)
{
    const LogCapture log(64);
    const auto fail = [](Call&) { throw std::runtime_error("failed"); };
    EXPECT_EQ("runtime_error: failed", GetFailure([&fail] {
                  SsoClient::Run(
                      nullptr, "Name", [] { return "description"; }, fail);
              }));
    EXPECT_THAT(log.lines.back(), ContainsRegex(FrameLinePattern("END", "Name")));
}
