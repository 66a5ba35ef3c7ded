#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/system/DateTime.h"
#include "ssoClient/Advice.h"
#include "ssoClient/Delegate.h"
#include "ssoClient/PrincipalId.h"

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/**
 * A SAML 2.0 assertion that was verified when the object was made (see `CreateSamlToken`).
 *
 * There is no virtual destructor: a token is made straight into a `boost::shared_ptr` of its own
 * class and never deleted through this interface. Operations with an out parameter replace what
 * it holds.
 *
 * Thread safety: immutable; any number of threads.
 */
class SSOCLIENT_API SamlToken
{
public:
    enum ConfirmationType : int
    {
        CONFIRM_BEARER = 0,
        CONFIRM_HOLDER_OF_KEY = 1
    };

    /** The assertion's ID. */
    virtual const std::string& GetId() const = 0;

    /** NotBefore and NotOnOrAfter of the conditions [SAML-CORE 2.5.1.2]. */
    virtual const Quillon::System::DateTime& GetStartDate() const = 0;
    virtual const Quillon::System::DateTime& GetEndDate() const = 0;

    virtual const PrincipalId& GetSubject() const = 0;
    virtual bool IsRenewable() const = 0;
    virtual bool IsDelegable() const = 0;

    /** Whether the subject is a solution (service) principal. */
    virtual bool IsSolution() const = 0;

    virtual ConfirmationType GetConfirmationMethod() const = 0;

    /** The subject's given name and surname; empty where the token does not tell. */
    virtual void GetFullName(std::pair<std::string, std::string>& out) const = 0;
    virtual void GetGroups(std::vector<PrincipalId>& out) const = 0;

    /** First delegate first. */
    virtual void GetDelegationChain(std::vector<Delegate>& out) const = 0;
    virtual void GetAudience(std::set<std::string>& out) const = 0;
    virtual void GetAdvice(std::vector<Advice>& out) const = 0;

    /** The holder-of-key certificate, owned by the token; null for a bearer token. */
    virtual const Quillon::Crypto::Certificate* GetConfirmationCertificate() const = 0;

    /** The assertion's XML, for forwarding it. A bearer token's XML is a credential: guard it. */
    virtual const std::string& ToXml() const = 0;

protected:
    ~SamlToken() = default;
};

} // namespace SsoClient
