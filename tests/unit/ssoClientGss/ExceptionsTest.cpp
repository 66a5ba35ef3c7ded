#include "ssoClientGss/Exceptions.h"

#include <gtest/gtest.h>

#include <memory>

using namespace SsoClient;

TEST(NegotiationException, IsRaisedAgainAsWhatItWas)
{
    const std::unique_ptr<const Quillon::Exception> clone(
        Gss::NegotiationException("no ticket").Clone());
    try {
        clone->Throw();
        FAIL() << "nothing was thrown";
    } catch (const Gss::NegotiationException& error) {
        EXPECT_STREQ("no ticket", error.what());
        EXPECT_EQ("NegotiationException", Quillon::GetClassName(error));
    }
}

TEST(NegotiationException, IsAnSsoException)
{
    EXPECT_THROW(Gss::NegotiationException("no ticket").Throw(), SsoException);
}
