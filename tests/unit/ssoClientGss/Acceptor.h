#pragma once

#include "Realm.h"

#include <array>

/** The service's side of a negotiation, with the keys of the realm's `service.keytab`. */
class Acceptor
{
public:
    explicit Acceptor(
        const Testing::TestKdc& kdc, gss_OID mechanism = &SsoClient::Gss::spnegoMechanism)
    {
        const std::string keytab = kdc.GetFile("service.keytab");
        // A replay cache is a file, which the test does not need.
        std::array<gss_key_value_element_desc, 2> elements{
            {{"keytab", keytab.c_str()}, {"rcache", "none:"}}};
        const gss_key_value_set_desc store{elements.size(), elements.data()};
        gss_OID_set_desc mechanisms{1, mechanism};
        gss_cred_id_t credential = GSS_C_NO_CREDENTIAL;
        OM_uint32 minor = 0;
        const OM_uint32 major = gss_acquire_cred_from(
            &minor,
            GSS_C_NO_NAME,
            GSS_C_INDEFINITE,
            &mechanisms,
            GSS_C_ACCEPT,
            &store,
            &credential,
            nullptr,
            nullptr);
        RequireGss(major, minor);
        _credential.reset(credential);
    }

    /** @return the leg for the client; throws if the client's is not acceptable. */
    SsoClient::Leg Accept(SsoClient::Leg leg)
    {
        gss_buffer_desc input{leg.size(), leg.data()};
        SsoClient::Gss::GssBuffer output;
        gss_ctx_id_t context = _context.release();
        OM_uint32 minor = 0;
        const OM_uint32 major = gss_accept_sec_context(
            &minor,
            &context,
            _credential.get(),
            &input,
            GSS_C_NO_CHANNEL_BINDINGS,
            nullptr,
            nullptr,
            output.Get(),
            nullptr,
            nullptr,
            nullptr);
        _context.reset(context);
        RequireGss(major, minor);
        return {output.begin(), output.end()};
    }

    gss_ctx_id_t GetContext() const { return _context.get(); }

    OM_uint32 GetFlags() const
    {
        OM_uint32 minor = 0;
        OM_uint32 flags = 0;
        const OM_uint32 major = gss_inquire_context(
            &minor, _context.get(), nullptr, nullptr, nullptr, nullptr, &flags, nullptr, nullptr);
        RequireGss(major, minor);
        return flags;
    }

    std::string GetClient() const { return GetName(true); }
    std::string GetService() const { return GetName(false); }

private:
    std::string GetName(bool ofClient) const
    {
        OM_uint32 minor = 0;
        gss_name_t name = GSS_C_NO_NAME;
        OM_uint32 major = gss_inquire_context(
            &minor,
            _context.get(),
            ofClient ? &name : nullptr,
            ofClient ? nullptr : &name,
            nullptr,
            nullptr,
            nullptr,
            nullptr,
            nullptr);
        RequireGss(major, minor);
        const SsoClient::Gss::GssName owner(name);
        SsoClient::Gss::GssBuffer text;
        major = gss_display_name(&minor, name, text.Get(), nullptr);
        RequireGss(major, minor);
        return {text.begin(), text.end()};
    }

    SsoClient::Gss::GssCredential _credential;
    SsoClient::Gss::GssContext _context;
};
