#pragma once

#include "ssoClient/Exceptions.h"
#include "ssoClientGss/Export.h"

namespace SsoClient::Gss {

/**
 * A Kerberos negotiation cannot begin or go on. The text says what was being done with which
 * service, cache, keytab or principal, and why Kerberos or GSS refused it, in their words.
 */
class SSOCLIENT_GSS_API NegotiationException
    : public Quillon::ExceptionOf<NegotiationException, SsoException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~NegotiationException() override;
};

} // namespace SsoClient::Gss
