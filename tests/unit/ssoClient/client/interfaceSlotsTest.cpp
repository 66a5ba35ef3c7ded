#include "ssoClient/Exceptions.h"
#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/protocol/RequestBuilder.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"

#include <gmock/gmock.h>

#include <cstring>
#include <type_traits>
#include <vector>

// The order of virtual operations is part of the binary interface: callers that were built against
// an older header call by position.

using namespace SsoClient;
using testing::ElementsAre;

namespace {

/** Position in the table of virtual functions [Itanium C++ ABI 2.3]. */
template <class Member>
std::size_t GetSlot(Member member)
{
    std::size_t offset = 0;
    std::memcpy(&offset, &member, sizeof offset);
    return (offset - 1) / sizeof(void*);
}

template <class... Members>
std::vector<std::size_t> GetSlots(Members... members)
{
    return {GetSlot(members)...};
}

} // namespace

TEST(SecurityTokenServiceInterface, KeepsItsOrder)
{
    EXPECT_THAT(
        GetSlots(
            &SecurityTokenService::AcquireToken,
            &SecurityTokenService::AcquireTokenByGSS,
            &SecurityTokenService::AcquireTokenByCertificate,
            &SecurityTokenService::AcquireTokenByToken,
            &SecurityTokenService::ValidateSubject,
            &SecurityTokenService::RenewToken,
            &SecurityTokenService::AcquireTokenAsync,
            &SecurityTokenService::AcquireTokenByGssAsync,
            &SecurityTokenService::AcquireTokenByCertificateAsync,
            &SecurityTokenService::AcquireTokenByTokenAsync,
            &SecurityTokenService::ValidateSubjectAsync,
            &SecurityTokenService::RenewTokenAsync),
        ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11));
}

TEST(RequestBuilderInterface, KeepsItsOrder)
{
    EXPECT_THAT(
        GetSlots(
            &RequestBuilder::BuildUserPassTokenRequest,
            &RequestBuilder::BuildInitialSPNegoRequest,
            &RequestBuilder::BuildContinuedSPNegoRequest,
            &RequestBuilder::BuildCertificateTokenRequest,
            &RequestBuilder::BuildExchangeTokenRequest,
            &RequestBuilder::BuildValidateSubjectRequest,
            &RequestBuilder::BuildRenewRequest),
        ElementsAre(0, 1, 2, 3, 4, 5, 6));
}

TEST(ResponseHandlerInterface, KeepsItsOrder)
{
    EXPECT_THAT(
        GetSlots(
            &ResponseHandler::HandleAcquireTokenResponse,
            &ResponseHandler::HandleValidateSubjectResponse,
            &ResponseHandler::HandleRenewTokenResponse,
            &ResponseHandler::HandleSPNegoResponse),
        ElementsAre(0, 1, 2, 3));
}

TEST(TransportInterfaces, KeepTheirOrder)
{
    EXPECT_THAT(GetSlots(&Transport::CreateSession), ElementsAre(0));
    EXPECT_THAT(
        GetSlots(&TransportSession::SendRequest, &TransportSession::SendRequestAsync),
        ElementsAre(0, 1));
}

TEST(GssNegotiationContextInterface, HasOneOperation)
{
    EXPECT_THAT(GetSlots(&InternalApi::GssNegotiationContext::NegotiateToken), ElementsAre(0));
}

TEST(SamlTokenInterface, KeepsItsOrder)
{
    EXPECT_THAT(
        GetSlots(
            &SamlToken::GetId,
            &SamlToken::GetStartDate,
            &SamlToken::GetEndDate,
            &SamlToken::GetSubject,
            &SamlToken::IsRenewable,
            &SamlToken::IsDelegable,
            &SamlToken::IsSolution,
            &SamlToken::GetConfirmationMethod,
            &SamlToken::GetFullName,
            &SamlToken::GetGroups,
            &SamlToken::GetDelegationChain,
            &SamlToken::GetAudience,
            &SamlToken::GetAdvice,
            &SamlToken::GetConfirmationCertificate,
            &SamlToken::ToXml),
        ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14));
}

namespace {

template <class Error>
class ExceptionInterface : public testing::Test
{};

using Errors = testing::Types<
    SsoException,
    InvalidTokenException,
    ParseException,
    InvalidSignatureException,
    CommunicationException,
    InvalidCredentialsException,
    Quillon::InvalidArgumentException,
    Quillon::InvalidStateException>;
TYPED_TEST_SUITE(ExceptionInterface, Errors);

} // namespace

TYPED_TEST(ExceptionInterface, KeepsItsOrder)
{
    EXPECT_TRUE(std::has_virtual_destructor_v<TypeParam>);
    EXPECT_THAT(
        GetSlots(
            &TypeParam::what,
            &TypeParam::GetBacktrace,
            &TypeParam::Dump,
            &TypeParam::Where,
            &TypeParam::Clone,
            &TypeParam::Throw),
        ElementsAre(2, 3, 4, 5, 6, 7)); // the destructor has two entries
}
