#include "devsts/negotiation/Kerberos.h"

#include <array>
#include <gssapi/gssapi_ext.h>

namespace DevSts {

namespace {

// 1.3.6.1.5.5.2 and 1.2.840.113554.1.2.2 in DER. [RFC4178 3.2], [RFC4121 1]
char SpnegoBytes[] = "\x2b\x06\x01\x05\x05\x02";
char KerberosBytes[] = "\x2a\x86\x48\x86\xf7\x12\x01\x02\x02";
gss_OID_desc Spnego{sizeof SpnegoBytes - 1, SpnegoBytes};
gss_OID_desc Kerberos{sizeof KerberosBytes - 1, KerberosBytes};

class GssBuffer
{
public:
    GssBuffer() = default;
    ~GssBuffer()
    {
        OM_uint32 ignored = 0;
        gss_release_buffer(&ignored, &_buffer);
    }
    GssBuffer(const GssBuffer&) = delete;
    GssBuffer& operator=(const GssBuffer&) = delete;

    gss_buffer_t Out() { return &_buffer; }

    std::string Text() const
    {
        return _buffer.length == 0
                   ? std::string()
                   : std::string(static_cast<const char*>(_buffer.value), _buffer.length);
    }

private:
    gss_buffer_desc _buffer = GSS_C_EMPTY_BUFFER;
};

std::string StatusText(OM_uint32 status, int type, gss_OID mechanism)
{
    std::string text;
    OM_uint32 next = 0;
    do {
        GssBuffer part;
        OM_uint32 ignored = 0;
        if (gss_display_status(&ignored, status, type, mechanism, &next, part.Out())
            != GSS_S_COMPLETE) {
            return text + "status " + std::to_string(status);
        }
        text += (text.empty() ? "" : "; ") + part.Text();
    } while (next != 0);
    return text;
}

void Require(OM_uint32 major, OM_uint32 minor, gss_OID mechanism)
{
    if (GSS_ERROR(major) == 0) {
        return;
    }
    const std::string text = StatusText(major, GSS_C_GSS_CODE, GSS_C_NO_OID);
    // SPNEGO has codes of its own that have no text.
    const std::string detail = StatusText(minor, GSS_C_MECH_CODE, mechanism);
    throw GssError(minor == 0 || detail == "Unknown error" ? text : text + ": " + detail);
}

// GSS finds no credential for a mechanism that it knows, and else knows no such mechanism.
void RequireMechanism(OM_uint32 major)
{
    const OM_uint32 error = GSS_ROUTINE_ERROR(major);
    if (error == GSS_S_NO_CRED || error == GSS_S_BAD_MECH) {
        throw GssError(
            "Only SPNEGO with Kerberos inside is negotiated: "
            + StatusText(major, GSS_C_GSS_CODE, GSS_C_NO_OID));
    }
}

GssCredential Acquire(const gss_key_value_set_desc& store, gss_OID mechanism)
{
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
    GssCredential owner(credential);
    Require(major, minor, mechanism);
    return owner;
}

std::string DisplayName(gss_name_t name)
{
    OM_uint32 minor = 0;
    GssBuffer text;
    const OM_uint32 major = gss_display_name(&minor, name, text.Out(), nullptr);
    Require(major, minor, &Spnego);
    return text.Text();
}

} // namespace

void GssDeleter::operator()(gss_cred_id_t credential) const
{
    OM_uint32 ignored = 0;
    gss_release_cred(&ignored, &credential);
}

void GssDeleter::operator()(gss_ctx_id_t context) const
{
    OM_uint32 ignored = 0;
    gss_delete_sec_context(&ignored, &context, GSS_C_NO_BUFFER);
}

void GssDeleter::operator()(gss_name_t name) const
{
    OM_uint32 ignored = 0;
    gss_release_name(&ignored, &name);
}

Acceptor::Acceptor(const std::filesystem::path& keytab, const std::filesystem::path& replays)
{
    const std::string keytabName = "FILE:" + keytab.string();
    const std::string replayName = "file2:" + replays.string();
    std::array<gss_key_value_element_desc, 2> elements{
        {{"keytab", keytabName.c_str()}, {"rcache", replayName.c_str()}}};
    const gss_key_value_set_desc store{elements.size(), elements.data()};
    // SPNEGO would only say that it finds no mechanism; Kerberos tells what is wrong.
    Acquire(store, &Kerberos);
    _credential = Acquire(store, &Spnego);
    // Mechanisms that a machine adds as plug-ins stay outside.
    gss_OID_set_desc kerberosOnly{1, &Kerberos};
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_set_neg_mechs(&minor, _credential.get(), &kerberosOnly);
    Require(major, minor, &Spnego);
}

std::string SecurityContext::Accept(const Acceptor& acceptor, const std::string& leg)
{
    gss_buffer_desc input{leg.size(), const_cast<char*>(leg.data())};
    GssBuffer output;
    gss_ctx_id_t context = _context.release();
    gss_name_t client = GSS_C_NO_NAME;
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_accept_sec_context(
        &minor,
        &context,
        acceptor.Get(),
        &input,
        GSS_C_NO_CHANNEL_BINDINGS,
        &client,
        nullptr,
        output.Out(),
        nullptr,
        nullptr,
        nullptr);
    _context.reset(context);
    const GssName clientOwner(client);
    RequireMechanism(major);
    Require(major, minor, &Spnego);
    _isComplete = (major & GSS_S_CONTINUE_NEEDED) == 0;
    if (_isComplete) {
        _principal = DisplayName(client);
    }
    return output.Text();
}

} // namespace DevSts
