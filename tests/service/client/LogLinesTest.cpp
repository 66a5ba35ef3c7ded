#include "Operations.h"

#include "ssoClient/Descriptions.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::ElementsAreArray;

namespace {

/** The lines that every operation writes to the log, from its start to its end. */
class LoggedOperation : public EveryOperationTest
{
protected:
    enum class Progress
    {
        REFUSED, ///< nothing was sent
        UNANSWERED,
        ANSWERED ///< the reply cannot be used
    };

    /** The lines without the id, which has to be the same in the first and the last. */
    std::vector<std::string> TakeLines()
    {
        std::vector<std::string> lines = log.TakeLines();
        if (lines.size() < 2) {
            ADD_FAILURE() << "too few lines";
            return lines;
        }
        const std::string id = CutId(lines.front());
        EXPECT_THAT(
            id,
            testing::MatchesRegex("[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-"
                                  "[0-9a-f]{12}"));
        EXPECT_EQ(CutId(lines.back()), id);
        return lines;
    }

    static std::string CutId(std::string& line)
    {
        const std::string mark = "opId=";
        const std::size_t from = line.find(mark) + mark.size();
        const std::size_t to = line.find(' ', from);
        const std::string id = line.substr(from, to - from);
        line.erase(from, to - from);
        return id;
    }

    std::vector<std::string> ExpectedLines(Progress progress, const std::string& result = "") const
    {
        const std::string name = GetParam().name;
        std::vector<std::string> lines{
            "opId= START operation SecurityTokenServiceImpl::" + name,
            GetParam().getRequestLine(*token)};
        // Only this one tells how far it has come.
        if (name == "AcquireToken" && progress != Progress::REFUSED) {
            lines.push_back("SecurityTokenServiceImpl::AcquireToken sending request");
            if (progress == Progress::ANSWERED) {
                lines.push_back("SecurityTokenServiceImpl::AcquireToken processing response");
            }
        }
        if (!result.empty()) {
            lines.push_back(result);
        }
        lines.push_back("opId= END operation SecurityTokenServiceImpl::" + name);
        for (std::string& line : lines) {
            line.insert(0, "SsoClient[64]: ");
        }
        return lines;
    }

    LogRecorder log;
};

/** The description of what the operations acquire, all of which ask for 300 seconds from `Now`. */
std::string DescribeAcquired(const std::string& name)
{
    const bool isAlices = name == "AcquireToken";
    return std::string("Successfully acquired token: SamlToken [subject={Name: ")
           + (isAlices ? "alice" : "service") + "; Domain:example.test}, groups=["
           + (isAlices ? "{Name: Administrators; Domain:EXAMPLE}, {Name: Users; Domain:EXAMPLE}"
                       : "{Name: SolutionUsers; Domain:EXAMPLE}")
           + "], delegationChain=[], startTime=2026-11-20T12:00:00.000Z, "
             "expirationTime=2026-11-20T12:05:00.000Z, renewable="
           + (name == "RenewToken" ? "true" : "false") + ", delegable=false, isSolution="
           + (isAlices ? "false" : "true") + ",confirmationType=1]";
}

/** The operations that need the caller's own key. */
class LoggedOperationWithoutIdentity : public LoggedOperation
{};

INSTANTIATE_TEST_SUITE_P(
    All, LoggedOperation, testing::ValuesIn(GetOperations()), GetOperationName);

INSTANTIATE_TEST_SUITE_P(
    All,
    LoggedOperationWithoutIdentity,
    testing::ValuesIn(SelectOperations(&Operation::needsIdentity)),
    GetOperationName);

} // namespace

TEST_P(LoggedOperation, WritesItsResult)
{
    EXPECT_EQ(Run(), "none");
    const std::string result =
        GetParam().givesToken ? DescribeAcquired(GetParam().name) : "Result: true";
    EXPECT_THAT(TakeLines(), ElementsAreArray(ExpectedLines(Progress::ANSWERED, result)));
}

TEST_P(LoggedOperation, WritesTheEndWhenTheServerIsGone)
{
    server.Stop();
    EXPECT_NE(Run(), "none");
    EXPECT_THAT(TakeLines(), ElementsAreArray(ExpectedLines(Progress::UNANSWERED)));
}

TEST_P(LoggedOperation, WritesTheEndWhenTheStatusIsBad)
{
    AnswerNext(503, "", "text/html");
    EXPECT_NE(Run(), "none");
    EXPECT_THAT(TakeLines(), ElementsAreArray(ExpectedLines(Progress::UNANSWERED)));
}

TEST_P(LoggedOperation, WritesTheEndAfterAFault)
{
    AnswerNext(500, "<E><Body><Fault><faultcode>Server</faultcode></Fault></Body></E>", "text/xml");
    EXPECT_NE(Run(), "none");
    EXPECT_THAT(TakeLines(), ElementsAreArray(ExpectedLines(Progress::ANSWERED)));
}

TEST_P(LoggedOperationWithoutIdentity, WritesTheEnd)
{
    EXPECT_NE(RunOn(*MakeBearerService()), "none");
    EXPECT_THAT(TakeLines(), ElementsAreArray(ExpectedLines(Progress::REFUSED)));
}

TEST_P(LoggedOperation, WritesNoResultForChangedReply)
{
    ReplaceInNextReply(
        GetParam().givesToken ? "@example.test" : "/status/valid",
        GetParam().givesToken ? "@Example.test" : "/status/maybe");
    EXPECT_NE(Run(), "none");
    EXPECT_THAT(TakeLines(), ElementsAreArray(ExpectedLines(Progress::ANSWERED)));
}

TEST_P(LoggedOperation, WritesNothingBelowLevel64)
{
    Quillon::Service::GetApp()->GetLogFacility().GetLogger("SsoClient")->SetLevel(63);
    EXPECT_EQ(Run(), "none");
    EXPECT_THAT(log.TakeLines(), testing::IsEmpty());
}

TEST_P(LoggedOperation, WritesAnotherIdEachTime)
{
    Run();
    std::string first = log.TakeLines().front();
    Run();
    std::string second = log.TakeLines().front();
    EXPECT_NE(CutId(first), CutId(second));
}
