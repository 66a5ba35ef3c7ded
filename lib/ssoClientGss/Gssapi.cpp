#include "ssoClientGss/Gssapi.h"

namespace SsoClient::Gss {

namespace {

char spnegoBytes[] = "\x2b\x06\x01\x05\x05\x02"; // 1.3.6.1.5.5.2

/** All messages that belong to one status code. */
std::string GetMessages(OM_uint32 code, int type, gss_OID mechanism)
{
    std::string messages;
    OM_uint32 position = 0;
    do {
        GssBuffer message;
        OM_uint32 minor = 0;
        if (GSS_ERROR(
                gss_display_status(&minor, code, type, mechanism, &position, message.Get()))) {
            return messages + "status " + std::to_string(code);
        }
        // Some messages count the zero at their end.
        const std::string text(message.begin(), message.end());
        messages += (messages.empty() ? "" : "; ") + text.substr(0, text.find('\0'));
    } while (position != 0);
    return messages;
}

} // namespace

gss_OID_desc spnegoMechanism = {sizeof spnegoBytes - 1, spnegoBytes};

std::string GetGssError(OM_uint32 major, OM_uint32 minor, gss_OID mechanism)
{
    const std::string text = GetMessages(major, GSS_C_GSS_CODE, mechanism);
    const std::string detail = GetMessages(minor, GSS_C_MECH_CODE, mechanism);
    // What a mechanism leaves unexplained comes out as either, depending on what the process did
    // before. Neither helps.
    return detail == "Unknown error" || detail == "Success" ? text : text + ": " + detail;
}

std::string GetKerberosError(krb5_context context, krb5_error_code code)
{
    return KerberosErrorText(krb5_get_error_message(context, code), {context}).get();
}

} // namespace SsoClient::Gss
