#include "ssoClientGss/Credentials.h"

#include "ssoClientGss/Exceptions.h"

#include <array>

namespace SsoClient::Gss {

namespace {

/** A keytab that nobody fills. */
constexpr const char* NoKeytab = "MEMORY:ssoclient-gss-no-keytab";

/** A path may have a colon in it, which would end the type of a name. */
std::string ToTypedName(const std::string& name)
{
    return name.front() == '/' ? "FILE:" + name : name;
}

KerberosContext CreateKerberosContext()
{
    krb5_context context = nullptr;
    const krb5_error_code code = krb5_init_context(&context);
    if (code != 0) {
        throw NegotiationException(
            "Cannot read the Kerberos configuration: " + GetKerberosError(nullptr, code));
    }
    return KerberosContext(context);
}

/** Kerberos calls that belong to one log-on, whose failures are told alike. */
class LogOnCalls
{
public:
    LogOnCalls(krb5_context context, const std::string& principal, const std::string& keytab)
        : _context(context)
        , _principal(principal)
        , _keytab(keytab)
    {}

    TemporaryCache CreateCache() const
    {
        krb5_ccache cache = nullptr;
        Check(krb5_cc_new_unique(_context, "MEMORY", nullptr, &cache));
        return TemporaryCache(cache, {_context});
    }

    std::string GetName(krb5_ccache cache) const
    {
        char* name = nullptr;
        Check(krb5_cc_get_full_name(_context, cache, &name));
        return KerberosText(name, {_context}).get();
    }

    void LogOn(krb5_ccache cache) const
    {
        const KerberosPrincipal principal = ParsePrincipal();
        const KerberosKeytab keytab = OpenKeytab();
        FindKey(keytab.get(), principal.get());
        const LogOnOptions options = CreateOptions(cache);
        krb5_creds ticket{};
        Check(krb5_get_init_creds_keytab(
            _context, &ticket, principal.get(), keytab.get(), 0, nullptr, options.get()));
        // The cache has its own copy.
        krb5_free_cred_contents(_context, &ticket);
    }

private:
    KerberosPrincipal ParsePrincipal() const
    {
        krb5_principal principal = nullptr;
        Check(krb5_parse_name(_context, _principal.c_str(), &principal));
        return KerberosPrincipal(principal, {_context});
    }

    KerberosKeytab OpenKeytab() const
    {
        krb5_keytab keytab = nullptr;
        Check(krb5_kt_resolve(_context, ToTypedName(_keytab).c_str(), &keytab));
        return KerberosKeytab(keytab, {_context});
    }

    /** Kerberos would ask the KDC first, and tell its failure instead of the keytab's. */
    void FindKey(krb5_keytab keytab, krb5_principal principal) const
    {
        krb5_keytab_entry entry{};
        Check(krb5_kt_get_entry(_context, keytab, principal, 0, 0, &entry));
        krb5_free_keytab_entry_contents(_context, &entry);
    }

    LogOnOptions CreateOptions(krb5_ccache cache) const
    {
        krb5_get_init_creds_opt* raw = nullptr;
        Check(krb5_get_init_creds_opt_alloc(_context, &raw));
        LogOnOptions options(raw, {_context});
        Check(krb5_get_init_creds_opt_set_out_ccache(_context, raw, cache));
        return options;
    }

    void Check(krb5_error_code code) const
    {
        if (code != 0) {
            throw NegotiationException(
                "Cannot log on as '" + _principal + "' with the keytab '" + _keytab
                + "': " + GetKerberosError(_context, code));
        }
    }

    krb5_context _context;
    const std::string& _principal;
    const std::string& _keytab;
};

gss_OID_set_desc SetOf(gss_OID mechanism)
{
    return {1, mechanism};
}

void Check(OM_uint32 major, OM_uint32 minor, gss_OID mechanism, const KerberosOptions& options)
{
    if (GSS_ERROR(major)) {
        throw NegotiationException(
            "Cannot use " + DescribeCredentials(options) + ": "
            + GetGssError(major, minor, mechanism));
    }
}

/**
 * Takes the credentials of one mechanism.
 *
 * @param cache  its name; empty for whatever GSS takes on its own.
 */
GssCredential Acquire(gss_OID mechanism, const std::string& cache, const KerberosOptions& options)
{
    // Without this keytab GSS would use the host's to fill or renew the named cache, and so act
    // as somebody who was not named.
    std::array<gss_key_value_element_desc, 2> elements{
        {{"ccache", cache.c_str()}, {"client_keytab", NoKeytab}}};
    const gss_key_value_set_desc store{elements.size(), elements.data()};
    gss_OID_set_desc mechanisms = SetOf(mechanism);
    gss_cred_id_t credential = GSS_C_NO_CREDENTIAL;
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_acquire_cred_from(
        &minor,
        GSS_C_NO_NAME,
        GSS_C_INDEFINITE,
        &mechanisms,
        GSS_C_INITIATE,
        cache.empty() ? GSS_C_NO_CRED_STORE : &store,
        &credential,
        nullptr,
        nullptr);
    Check(major, minor, mechanism, options);
    return GssCredential(credential);
}

} // namespace

KeytabLogOn::KeytabLogOn(const std::string& principal, const std::string& keytab)
    : _context(CreateKerberosContext())
{
    const LogOnCalls calls(_context.get(), principal, keytab);
    _cache = calls.CreateCache();
    _cacheName = calls.GetName(_cache.get());
    calls.LogOn(_cache.get());
}

Credentials::Credentials(const KerberosOptions& options)
{
    std::string cache;
    if (!options.keytab.empty()) {
        cache = _logOn.emplace(options.principal, options.keytab).GetCacheName();
    } else if (!options.ccache.empty()) {
        cache = ToTypedName(options.ccache);
    }

    // SPNEGO does not say why a mechanism has no credentials; Kerberos, asked first, does.
    Acquire(gss_mech_krb5, cache, options);
    _credential = Acquire(&spnegoMechanism, cache, options);
    // Other mechanisms that this host has are not offered.
    gss_OID_set_desc offered = SetOf(gss_mech_krb5);
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_set_neg_mechs(&minor, _credential.get(), &offered);
    Check(major, minor, &spnegoMechanism, options);
}

std::string DescribeCredentials(const KerberosOptions& options)
{
    if (!options.keytab.empty()) {
        return "the keytab '" + options.keytab + "' of '" + options.principal + "'";
    }
    return options.ccache.empty() ? "the default credentials"
                                  : "the credential cache '" + options.ccache + "'";
}

} // namespace SsoClient::Gss
