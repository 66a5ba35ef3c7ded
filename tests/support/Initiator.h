#pragma once

#include <gssapi/gssapi.h>
#include <gssapi/gssapi_ext.h>
#include <string>

namespace Testing {

enum class Mechanism
{
    SPNEGO,
    KERBEROS ///< without SPNEGO around it
};

/** The client's side of a negotiation, over the GSS-API. Every failure is a std::runtime_error. */
class Initiator
{
public:
    /**
     * @param ccache   the file with the client's ticket-granting ticket.
     * @param service  a principal.
     */
    Initiator(
        const std::string& ccache,
        const std::string& service,
        OM_uint32 flags = GSS_C_MUTUAL_FLAG,
        Mechanism mechanism = Mechanism::SPNEGO);
    ~Initiator();
    Initiator(const Initiator&) = delete;
    Initiator& operator=(const Initiator&) = delete;

    /** Takes a leg of the service, empty at first, and gives the next one for it. */
    std::string Step(const std::string& leg = "");

    /** Tells whether the context stands, and with it whatever was asked for. */
    bool IsComplete() const { return _isComplete; }

    /** Tells whether the service has proved who it is. */
    bool IsMutual() const { return _isComplete && (_granted & GSS_C_MUTUAL_FLAG) != 0; }

private:
    gss_OID _mechanism;
    OM_uint32 _wanted;
    OM_uint32 _granted = 0;
    gss_cred_id_t _credential = GSS_C_NO_CREDENTIAL;
    gss_name_t _service = GSS_C_NO_NAME;
    gss_ctx_id_t _context = GSS_C_NO_CONTEXT;
    bool _isComplete = false;
};

} // namespace Testing
