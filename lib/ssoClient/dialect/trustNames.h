#pragma once

#include "ssoClient/ServiceDialect.h"

namespace SsoClient::Wire {

/** What one version of WS-Trust calls what requests and replies name. */
struct TrustNames
{
    const char* trustNamespace;
    const char* issueAction;
    const char* issueResponseAction;
    const char* renewAction;
    const char* validateAction;
    const char* issueRequestType;
    const char* renewRequestType;
    const char* validateRequestType;
    const char* bearerKeyType;
    const char* publicKeyType;
    const char* statusTokenType;
    const char* validStatus;
    const char* invalidStatus;
};

const TrustNames& GetTrustNames(TrustVersion version) noexcept;

/** The namespace of envelopes. */
const char* GetSoapNamespace(SoapVersion version) noexcept;

} // namespace SsoClient::Wire
