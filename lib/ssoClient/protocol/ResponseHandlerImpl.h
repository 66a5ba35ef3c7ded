#pragma once

#include "ssoClient/protocol/ResponseHandler.h"

namespace SsoClient {

/** Keeps nothing from one reply to the next. */
class ResponseHandlerImpl final : public ResponseHandler
{
public:
    void HandleAcquireTokenResponse(Quillon::Reader* body, std::string& tokenXml) const override;
    bool HandleValidateSubjectResponse(Quillon::Reader* body) const override;
    void HandleRenewTokenResponse(Quillon::Reader* body, std::string& tokenXml) const override;
    void HandleSPNegoResponse(Quillon::Reader* body, SPNegoResponse& response) const override;
};

} // namespace SsoClient
