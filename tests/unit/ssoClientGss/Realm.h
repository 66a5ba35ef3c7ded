#pragma once

#include "support/TestKdc.h"

#include "ssoClient/Leg.h"
#include "ssoClientGss/Gssapi.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <optional>
#include <stdexcept>
#include <string>

/** Sets an environment variable for as long as the object lives. */
class EnvironmentScope
{
public:
    EnvironmentScope(const char* name, const std::string& value)
        : _name(name)
    {
        if (const char* old = std::getenv(name)) {
            _old = old;
        }
        setenv(name, value.c_str(), 1);
    }

    ~EnvironmentScope()
    {
        if (_old) {
            setenv(_name, _old->c_str(), 1);
        } else {
            unsetenv(_name);
        }
    }

    EnvironmentScope(const EnvironmentScope&) = delete;
    EnvironmentScope& operator=(const EnvironmentScope&) = delete;

private:
    const char* _name;
    std::optional<std::string> _old;
};

/** Fails the test at once if Kerberos refuses what the test itself needs. */
inline void Require(krb5_error_code code)
{
    if (code != 0) {
        throw std::runtime_error(SsoClient::Gss::GetKerberosError(nullptr, code));
    }
}

inline void RequireGss(OM_uint32 major, OM_uint32 minor)
{
    if (GSS_ERROR(major)) {
        throw std::runtime_error(
            SsoClient::Gss::GetGssError(major, minor, &SsoClient::Gss::spnegoMechanism));
    }
}

/** Copies the tickets from one cache to another, each after `change`. */
inline void CopyCache(
    const std::string& from,
    const std::string& to,
    const std::function<void(krb5_creds&)>& change = [](krb5_creds&) {})
{
    using namespace SsoClient::Gss;
    krb5_context raw = nullptr;
    Require(krb5_init_context(&raw));
    const KerberosContext context(raw);
    krb5_ccache source = nullptr;
    krb5_ccache target = nullptr;
    krb5_principal principal = nullptr;
    Require(krb5_cc_resolve(raw, from.c_str(), &source));
    Require(krb5_cc_resolve(raw, to.c_str(), &target));
    Require(krb5_cc_get_principal(raw, source, &principal));
    Require(krb5_cc_initialize(raw, target, principal));
    krb5_free_principal(raw, principal);
    krb5_cc_cursor cursor = nullptr;
    Require(krb5_cc_start_seq_get(raw, source, &cursor));
    krb5_creds ticket{};
    while (krb5_cc_next_cred(raw, source, &cursor, &ticket) == 0) {
        change(ticket);
        Require(krb5_cc_store_cred(raw, target, &ticket));
        krb5_free_cred_contents(raw, &ticket);
    }
    Require(krb5_cc_end_seq_get(raw, source, &cursor));
    Require(krb5_cc_close(raw, source));
    Require(krb5_cc_close(raw, target));
}

/** A realm with a ticket of alice in the cache `alice`, a file of the realm's folder. */
class Realm : public testing::Test
{
protected:
    static void SetUpTestSuite()
    {
        // GSS reads it once for the process: a host that has another mechanism beside Kerberos.
        setenv("GSS_MECH_CONFIG", MECHANISMS_FILE, 1);
        kdc.emplace();
        kdc->LogOn("alice", kdc->GetFile("alice"));
    }

    static void TearDownTestSuite() { kdc.reset(); }

    static inline std::optional<Testing::TestKdc> kdc;
};
