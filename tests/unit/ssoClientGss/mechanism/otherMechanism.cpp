// A mechanism as a host may have it beside Kerberos, with credentials for everybody. GSS finds it
// through the file that GSS_MECH_CONFIG names.

#include "ssoClientGss/Gssapi.h"

#define EXPORTED extern "C" __attribute__((visibility("default")))

namespace {

char credential = 0;

OM_uint32 Acquire(OM_uint32* minor, gss_cred_id_t* result)
{
    *minor = 0;
    *result = reinterpret_cast<gss_cred_id_t>(&credential);
    return GSS_S_COMPLETE;
}

} // namespace

EXPORTED OM_uint32 gss_acquire_cred_from(
    OM_uint32* minor,
    gss_name_t /*name*/,
    OM_uint32 /*lifetime*/,
    gss_OID_set /*mechanisms*/,
    gss_cred_usage_t /*usage*/,
    gss_const_key_value_set_t /*store*/,
    gss_cred_id_t* result,
    gss_OID_set* /*actual*/,
    OM_uint32* /*validity*/)
{
    return Acquire(minor, result);
}

// GSS asks a mechanism for credentials only if it has this one as well.
EXPORTED OM_uint32 gss_acquire_cred(
    OM_uint32* minor,
    gss_name_t /*name*/,
    OM_uint32 /*lifetime*/,
    gss_OID_set /*mechanisms*/,
    gss_cred_usage_t /*usage*/,
    gss_cred_id_t* result,
    gss_OID_set* /*actual*/,
    OM_uint32* /*validity*/)
{
    return Acquire(minor, result);
}

EXPORTED OM_uint32 gss_release_cred(OM_uint32* minor, gss_cred_id_t* result)
{
    *minor = 0;
    *result = GSS_C_NO_CREDENTIAL;
    return GSS_S_COMPLETE;
}
