#pragma once

// The one place where the library sees GSS-API and Kerberos: their headers, an owner for each of
// their handles, and the translation of their errors.

#include <gssapi/gssapi.h>
#include <gssapi/gssapi_ext.h>
#include <gssapi/gssapi_krb5.h>
#include <krb5.h>

#include <memory>
#include <string>
#include <type_traits>

namespace SsoClient::Gss {

template <auto Release>
struct GssDeleter
{
    template <class T>
    void operator()(T* handle) const noexcept
    {
        OM_uint32 minor = 0;
        Release(&minor, &handle);
    }
};

struct GssContextDeleter
{
    void operator()(gss_ctx_id_t context) const noexcept
    {
        OM_uint32 minor = 0;
        gss_delete_sec_context(&minor, &context, GSS_C_NO_BUFFER);
    }
};

template <class Handle, class Deleter>
using OwnerOf = std::unique_ptr<std::remove_pointer_t<Handle>, Deleter>;

using GssName = OwnerOf<gss_name_t, GssDeleter<gss_release_name>>;
using GssCredential = OwnerOf<gss_cred_id_t, GssDeleter<gss_release_cred>>;
using GssContext = OwnerOf<gss_ctx_id_t, GssContextDeleter>;

/** A buffer that GSS fills. */
class GssBuffer
{
public:
    GssBuffer() = default;
    ~GssBuffer()
    {
        OM_uint32 minor = 0;
        gss_release_buffer(&minor, &_buffer);
    }
    GssBuffer(const GssBuffer&) = delete;
    GssBuffer& operator=(const GssBuffer&) = delete;

    gss_buffer_t Get() { return &_buffer; }
    const unsigned char* begin() const { return static_cast<unsigned char*>(_buffer.value); }
    const unsigned char* end() const { return begin() + _buffer.length; }
    bool empty() const { return _buffer.length == 0; }

private:
    gss_buffer_desc _buffer = GSS_C_EMPTY_BUFFER;
};

struct KerberosContextDeleter
{
    void operator()(krb5_context context) const noexcept { krb5_free_context(context); }
};
using KerberosContext = OwnerOf<krb5_context, KerberosContextDeleter>;

/** For what is freed with the context that made it, which must live longer. */
template <auto Free>
struct KerberosDeleter
{
    krb5_context context = nullptr;

    template <class T>
    void operator()(T* handle) const noexcept
    {
        Free(context, handle);
    }
};

using KerberosPrincipal = OwnerOf<krb5_principal, KerberosDeleter<krb5_free_principal>>;
using KerberosKeytab = OwnerOf<krb5_keytab, KerberosDeleter<krb5_kt_close>>;
using LogOnOptions =
    OwnerOf<krb5_get_init_creds_opt*, KerberosDeleter<krb5_get_init_creds_opt_free>>;
using KerberosText = OwnerOf<char*, KerberosDeleter<krb5_free_string>>;
using KerberosErrorText = OwnerOf<const char*, KerberosDeleter<krb5_free_error_message>>;
/** A credential cache that is emptied and removed, not only closed. */
using TemporaryCache = OwnerOf<krb5_ccache, KerberosDeleter<krb5_cc_destroy>>;

/** The mechanism that negotiates mechanisms [RFC 4178 3.2]. */
extern gss_OID_desc spnegoMechanism;

/**
 * What GSS says about both codes of a call. Kerberos keeps the details with the thread, so that
 * this must be called by the thread that failed, before its next call of GSS.
 */
std::string GetGssError(OM_uint32 major, OM_uint32 minor, gss_OID mechanism);

/** What Kerberos says about the failed call. */
std::string GetKerberosError(krb5_context context, krb5_error_code code);

} // namespace SsoClient::Gss
