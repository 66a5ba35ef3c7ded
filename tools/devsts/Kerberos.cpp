#include "devsts/Kerberos.h"

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

std::string ErrorText(OM_uint32 major, OM_uint32 minor)
{
    const std::string text = StatusText(major, GSS_C_GSS_CODE, GSS_C_NO_OID);
    return minor == 0 ? text : text + ": " + StatusText(minor, GSS_C_MECH_CODE, &Spnego);
}

void Require(OM_uint32 major, OM_uint32 minor)
{
    if (GSS_ERROR(major) != 0) {
        throw GssError(ErrorText(major, minor));
    }
}

std::string DisplayName(gss_name_t name)
{
    OM_uint32 minor = 0;
    GssBuffer text;
    const OM_uint32 major = gss_display_name(&minor, name, text.Out(), nullptr);
    Require(major, minor);
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
    gss_OID_set_desc spnegoOnly{1, &Spnego};
    gss_cred_id_t credential = GSS_C_NO_CREDENTIAL;
    OM_uint32 minor = 0;
    OM_uint32 major = gss_acquire_cred_from(
        &minor,
        GSS_C_NO_NAME,
        GSS_C_INDEFINITE,
        &spnegoOnly,
        GSS_C_ACCEPT,
        &store,
        &credential,
        nullptr,
        nullptr);
    _credential.reset(credential);
    Require(major, minor);
    gss_OID_set_desc kerberosOnly{1, &Kerberos};
    major = gss_set_neg_mechs(&minor, credential, &kerberosOnly);
    Require(major, minor);
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
    Require(major, minor);
    _isComplete = (major & GSS_S_CONTINUE_NEEDED) == 0;
    if (_isComplete) {
        _principal = DisplayName(client);
    }
    return output.Text();
}

} // namespace DevSts
