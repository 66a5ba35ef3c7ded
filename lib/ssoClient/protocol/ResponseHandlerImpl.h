#pragma once

#include "ssoClient/ServiceDialect.h"
#include "ssoClient/SoapFault.h"
#include "ssoClient/protocol/ResponseHandler.h"

namespace SsoClient {

/** How replies are read, and who is shown their faults. */
struct ReplyForm
{
    ServiceDialect dialect;
    FaultObserver faultObserver; ///< may be empty
};

/** Keeps nothing from one reply to the next. */
class ResponseHandlerImpl final : public ResponseHandler
{
public:
    explicit ResponseHandlerImpl(ReplyForm form = ReplyForm());

    void HandleAcquireTokenResponse(Quillon::Reader* body, std::string& tokenXml) const override;
    bool HandleValidateSubjectResponse(Quillon::Reader* body) const override;
    void HandleRenewTokenResponse(Quillon::Reader* body, std::string& tokenXml) const override;
    void HandleSPNegoResponse(Quillon::Reader* body, SPNegoResponse& response) const override;
    boost::shared_ptr<const ResponseHandler> ShowingFaultsTo(
        const FaultObserver& observer) const override;

private:
    ReplyForm _form;
};

} // namespace SsoClient
