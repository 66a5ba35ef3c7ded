#include "ssoClient/protocol/RequestBuilderImpl.h"

#include "support/FreedMemory.h"
#include "support/TestData.h"

#include <gtest/gtest.h>

using namespace SsoClient;

namespace {

constexpr char Password[] = "Sw0rdfish-that-nothing-else-in-here-is-called";

// From the builder's copy over the tree and the text to the request.
void ExpectNoPasswordLeft(const boost::optional<HolderOfKeyConfig>& identity)
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    const std::string password = Password;
    const RequestBuilderImpl builder(identity);
    const FreedMemory freed(password);
    {
        Request request;
        builder.BuildUserPassTokenRequest("jdoe", password, spec, request);
        ASSERT_NE(request.body.find(password), std::string::npos);
    }
    EXPECT_FALSE(freed.HeldTheText());
}

} // namespace

TEST(BuildUserPassTokenRequest, LeavesNoPasswordInFreedMemory)
{
    ExpectNoPasswordLeft(boost::none);
}

TEST(BuildUserPassTokenRequest, LeavesNoPasswordInFreedMemoryWhenItSigns)
{
    HolderOfKeyConfig identity;
    identity.privateKey = GetTestKey("client");
    identity.certificate = GetTestCertificates("client").front();
    ExpectNoPasswordLeft(identity);
}
