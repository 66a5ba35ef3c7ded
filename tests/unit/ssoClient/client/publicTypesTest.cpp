#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/message/xmlCommonBuilders.h"
#include "ssoClient/protocol/RequestBuilder.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"
#include "ssoClient/wire/xmlReading.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <functional>
#include <type_traits>
#include <utility>
#include <vector>

// Numbers, order of members and destructors are part of the binary interface: callers that were
// built against an older header go by them.

using namespace SsoClient;
using testing::ElementsAre;

namespace {

/** Whether each of the members lies behind the one before. */
template <class Owner, class... Members>
bool AreInOrder(const Owner& owner, Members Owner::*... members)
{
    const std::vector<const void*> addresses{&(owner.*members)...};
    return std::adjacent_find(addresses.begin(), addresses.end(), std::greater_equal<>())
           == addresses.end();
}

template <class Interface>
class InterfaceWithoutVirtualDestructor : public testing::Test
{};

using Interfaces = testing::Types<
    SamlToken,
    SecurityTokenService,
    RequestBuilder,
    ResponseHandler,
    Transport,
    TransportSession,
    XMLBaseBuilder,
    NodeFilter,
    InternalApi::GssNegotiationContext>;
TYPED_TEST_SUITE(InterfaceWithoutVirtualDestructor, Interfaces);

} // namespace

TYPED_TEST(InterfaceWithoutVirtualDestructor, IsAbstractAndHasNone)
{
    EXPECT_TRUE(std::is_abstract_v<TypeParam>);
    EXPECT_FALSE(std::has_virtual_destructor_v<TypeParam>);
}

TEST(DeletingThroughAnInterface, DoesNotCompile)
{
    EXPECT_FALSE(std::is_destructible_v<SecurityTokenService>);
    EXPECT_FALSE(std::is_destructible_v<InternalApi::GssNegotiationContext>);
    EXPECT_FALSE(std::is_destructible_v<SamlToken>);
}

TEST(Confirmation, KeepsItsNumbers)
{
    EXPECT_EQ(0, static_cast<int>(TokenSpec::CONFIRMATION_DEFAULT));
    EXPECT_EQ(1, static_cast<int>(TokenSpec::CONFIRMATION_BEARER));
}

TEST(ConfirmationType, KeepsItsNumbers)
{
    EXPECT_EQ(0, static_cast<int>(SamlToken::CONFIRM_BEARER));
    EXPECT_EQ(1, static_cast<int>(SamlToken::CONFIRM_HOLDER_OF_KEY));
}

TEST(TokenSpec, KeepsTheOrderOfItsMembers)
{
    EXPECT_TRUE(AreInOrder(
        TokenSpec(),
        &TokenSpec::tokenLifetimeSec,
        &TokenSpec::audienceRestriction,
        &TokenSpec::advice,
        &TokenSpec::delegable,
        &TokenSpec::delegateTo,
        &TokenSpec::renewable,
        &TokenSpec::confirmation));
}

TEST(TokenSpec, CopiesEveryMember)
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 5'000'000'000;
    spec.audienceRestriction = {"b", "a"};
    spec.advice = {{"source", {{"name", {"value"}}}}};
    spec.delegable = true;
    spec.delegateTo = "proxy";
    spec.renewable = true;
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;

    TokenSpec assigned;
    assigned = spec;
    for (const TokenSpec& copy : {TokenSpec(spec), assigned}) {
        EXPECT_EQ(copy.tokenLifetimeSec, 5'000'000'000);
        EXPECT_THAT(copy.audienceRestriction, ElementsAre("a", "b"));
        ASSERT_EQ(copy.advice.size(), 1U);
        EXPECT_EQ(copy.advice[0].source, "source");
        EXPECT_THAT(copy.advice[0].attributes.at(0).values, ElementsAre("value"));
        EXPECT_TRUE(copy.delegable);
        EXPECT_EQ(copy.delegateTo.get_value_or(""), "proxy");
        EXPECT_TRUE(copy.renewable);
        EXPECT_EQ(copy.confirmation, TokenSpec::CONFIRMATION_BEARER);
    }
}

TEST(HolderOfKeyConfig, KeepsTheOrderOfItsMembers)
{
    EXPECT_TRUE(AreInOrder(
        HolderOfKeyConfig(), &HolderOfKeyConfig::privateKey, &HolderOfKeyConfig::certificate));
}

TEST(SecurityTokenServiceConfig, KeepsTheOrderOfItsMembers)
{
    EXPECT_TRUE(AreInOrder(
        SecurityTokenServiceConfig(),
        &SecurityTokenServiceConfig::url,
        &SecurityTokenServiceConfig::trustedCertificates,
        &SecurityTokenServiceConfig::sslPeerParameter,
        &SecurityTokenServiceConfig::holderOfKeyConfig,
        &SecurityTokenServiceConfig::sslContext));
}

TEST(Delegate, KeepsTheOrderOfItsMembers)
{
    const Delegate delegate{PrincipalId("a", "b"), Quillon::System::DateTime()};
    EXPECT_TRUE(AreInOrder(delegate, &Delegate::subject, &Delegate::delegationDate));
}

TEST(Advice, KeepsTheOrderOfItsMembers)
{
    EXPECT_TRUE(AreInOrder(Advice(), &Advice::source, &Advice::attributes));
    EXPECT_TRUE(AreInOrder(AdviceAttribute(), &AdviceAttribute::name, &AdviceAttribute::values));
}

TEST(NegotiationResult, KeepsTheOrderOfItsMembers)
{
    using InternalApi::NegotiationResult;
    EXPECT_TRUE(
        AreInOrder(NegotiationResult(), &NegotiationResult::leg, &NegotiationResult::token));
}
