#include "ssoClient/wire/wireNames.h"

#include <gtest/gtest.h>

#include <string>

namespace Wire = SsoClient::Wire;

namespace {

bool EndsWith(const std::string& text, const std::string& end)
{
    return text.size() > end.size() && text.substr(text.size() - end.size()) == end;
}

} // namespace

// The authorities differ from build to build, the paths do not.
TEST(WireNames, ConfiguredNamesKeepTheirPaths)
{
    EXPECT_TRUE(EndsWith(Wire::RsaNamespace, "/names/2009/12/std-ext/SAML2.0"));
    EXPECT_TRUE(EndsWith(Wire::RsaAdviceNamespace, "/names/2009/12/std-ext/WS-Trust1.4/advice"));
    EXPECT_TRUE(
        EndsWith(Wire::GroupIdentityAttribute, "/schemas/attr-names/2009/01/GroupIdentity"));
    EXPECT_TRUE(EndsWith(Wire::UpnClaim, "/claims/UPN"));
    EXPECT_TRUE(EndsWith(Wire::GivenNameClaim, "/ws/2005/05/identity/claims/givenname"));
    EXPECT_TRUE(EndsWith(Wire::SurnameClaim, "/ws/2005/05/identity/claims/surname"));
    EXPECT_TRUE(EndsWith(Wire::IsSolutionAttribute, "/schemas/attr-names/2011/07/isSolution"));
}

TEST(WireNames, TrustIdentifiersBeginWithTheNamespace)
{
    const std::string trust = Wire::WsTrustNamespace;
    EXPECT_EQ("http://docs.oasis-open.org/ws-sx/ws-trust/200512", trust);
    EXPECT_EQ(trust + "/RST/Issue", Wire::IssueAction);
    EXPECT_EQ(trust + "/RSTR/Issue", Wire::IssueResponseAction);
    EXPECT_EQ(trust + "/RST/Renew", Wire::RenewAction);
    EXPECT_EQ(trust + "/RST/Validate", Wire::ValidateAction);
    EXPECT_EQ(trust + "/Issue", Wire::IssueRequestType);
    EXPECT_EQ(trust + "/Renew", Wire::RenewRequestType);
    EXPECT_EQ(trust + "/Validate", Wire::ValidateRequestType);
    EXPECT_EQ(trust + "/Bearer", Wire::BearerKeyType);
    EXPECT_EQ(trust + "/PublicKey", Wire::PublicKeyType);
    EXPECT_EQ(trust + "/RSTR/Status", Wire::StatusTokenType);
    EXPECT_EQ(trust + "/status/valid", Wire::ValidStatus);
    EXPECT_EQ(trust + "/status/invalid", Wire::InvalidStatus);
}
