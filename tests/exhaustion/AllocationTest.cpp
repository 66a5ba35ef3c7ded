#include "Operations.h"

#include "ssoClientGss/KerberosNegotiationHandler.h"
#include "support/TestKdc.h"

#include <gmock/gmock.h>

#include <iostream>

using namespace Exhaustion;
using Faults::Kind;

namespace {

void ExpectNoFinding(const std::vector<Operation>& operations, const Run& run)
{
    for (const Operation& operation : operations) {
        const Report report = Exhaust(operation, run);
        std::cout << operation.name << ": " << report.failed << " of " << report.calls
                  << " allocations failed" << std::endl;
        EXPECT_GT(report.failed, 0U) << operation.name;
        for (const std::string& finding : report.findings) {
            ADD_FAILURE() << finding;
        }
    }
}

Run EachAllocation(unsigned long stride)
{
    Run run;
    run.stride = stride;
    return run;
}

Run EachAllocationAndTheRest(unsigned long stride)
{
    Run run = EachAllocation(stride);
    run.fromThereOn = true;
    return run;
}

} // namespace

TEST(LackOfMemory, EndsReading)
{
    ExpectNoFinding(GetReadings(), EachAllocation(3));
    ExpectNoFinding(GetReadings(), EachAllocationAndTheRest(31));
}

TEST(LackOfMemory, LeavesNoKeyThatSignsWrongly)
{
    // OpenSSL makes new numbers for the blinding with each 32nd signature, so that the same
    // allocation is another one each time.
    constexpr int Signatures = 32;
    const Operation signing = GetSigning();
    for (int i = 0; i < Signatures; ++i) {
        ExpectNoFinding({signing}, EachAllocation(1));
        EXPECT_EQ(signing.run(), signing.result);
    }
    ExpectNoFinding({signing}, EachAllocationAndTheRest(1));
}

TEST(LackOfMemory, HasNoTokenAccepted)
{
    ExpectNoFinding(GetJudgements(), EachAllocation(5));
    ExpectNoFinding(GetJudgements(), EachAllocationAndTheRest(31));
}

TEST(LackOfMemory, EndsAnOperation)
{
    const Client client;
    ExpectNoFinding(client.GetOperations(), EachAllocation(67));
    ExpectNoFinding(client.GetOperations(), EachAllocationAndTheRest(211));
}

TEST(LackOfMemory, EndsAnOperationOverPlainHttp)
{
    const Client client({"--http"});
    ExpectNoFinding(client.GetOperations(), EachAllocation(23));
    ExpectNoFinding(client.GetOperations(), EachAllocationAndTheRest(211));
}

TEST(LackOfMemory, EndsAnAsynchronousOperation)
{
    const Client client;
    ExpectNoFinding(client.GetAsyncOperations(), EachAllocation(67));
    ExpectNoFinding(client.GetAsyncOperations(), EachAllocationAndTheRest(211));
}

TEST(LackOfMemory, EndsALookUpOfAName)
{
    const Client client({"--http"}, "localhost");
    ExpectNoFinding({client.GetOperations().front()}, EachAllocation(23));
}

TEST(LackOfMemory, EndsANegotiation)
{
    const Testing::TestKdc kdc;
    const Client client({"--keytab", kdc.GetFile("service.keytab")});
    const auto service = SsoClient::CreateSecurityTokenService(client.MakeConfig());
    SsoClient::Gss::KerberosOptions options;
    options.url = client.MakeConfig().url;
    options.ccache = kdc.GetFile("alice.ccache");
    kdc.LogOn("alice", options.ccache);
    const Operation negotiation{
        "AcquireTokenByGSS",
        [&] {
            const auto handler = SsoClient::Gss::CreateKerberosNegotiationHandler(options);
            return service->AcquireTokenByGSS(MakeSpec(), *handler)->GetSubject().GetName();
        },
        "alice"};
    // Kerberos itself ends the process: krb5_get_credentials frees what it has not set, if there is
    // no memory for a name.
    Exhaustion::Run run = EachAllocation(101);
    run.spared = "krb5";
    ExpectNoFinding({negotiation}, run);
}
