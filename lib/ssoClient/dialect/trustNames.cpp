#include "ssoClient/dialect/trustNames.h"

#include "ssoClient/wire/wireNames.h"

namespace SsoClient::Wire {

namespace {

constexpr TrustNames TrustNames13 = {
    WsTrustNamespace,
    IssueAction,
    IssueResponseAction,
    RenewAction,
    ValidateAction,
    IssueRequestType,
    RenewRequestType,
    ValidateRequestType,
    BearerKeyType,
    PublicKeyType,
    StatusTokenType,
    ValidStatus,
    InvalidStatus};

#define SSOCLIENT_TRUST_2005 "http://schemas.xmlsoap.org/ws/2005/02/trust"

// The draft has no key type for bearer tokens; the one of identity selectors fills the gap.
constexpr TrustNames TrustNames200502 = {
    SSOCLIENT_TRUST_2005,
    SSOCLIENT_TRUST_2005 "/RST/Issue",
    SSOCLIENT_TRUST_2005 "/RSTR/Issue",
    SSOCLIENT_TRUST_2005 "/RST/Renew",
    SSOCLIENT_TRUST_2005 "/RST/Validate",
    SSOCLIENT_TRUST_2005 "/Issue",
    SSOCLIENT_TRUST_2005 "/Renew",
    SSOCLIENT_TRUST_2005 "/Validate",
    "http://schemas.xmlsoap.org/ws/2005/05/identity/NoProofKey",
    SSOCLIENT_TRUST_2005 "/PublicKey",
    SSOCLIENT_TRUST_2005 "/RSTR/Status",
    SSOCLIENT_TRUST_2005 "/status/valid",
    SSOCLIENT_TRUST_2005 "/status/invalid"};

#undef SSOCLIENT_TRUST_2005

} // namespace

const TrustNames& GetTrustNames(TrustVersion version) noexcept
{
    return version == TrustVersion::WS_TRUST_1_3 ? TrustNames13 : TrustNames200502;
}

const char* GetSoapNamespace(SoapVersion version) noexcept
{
    return version == SoapVersion::SOAP_1_1 ? SoapNamespace : Soap12Namespace;
}

} // namespace SsoClient::Wire
