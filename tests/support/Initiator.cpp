#include "Initiator.h"

#include <gssapi/gssapi_krb5.h>
#include <stdexcept>

namespace Testing {

namespace {

char spnegoBytes[] = "\x2b\x06\x01\x05\x05\x02";
gss_OID_desc spnego{sizeof spnegoBytes - 1, spnegoBytes};

std::string Text(OM_uint32 status, int type, gss_OID mechanism)
{
    OM_uint32 minor = 0;
    OM_uint32 next = 0;
    gss_buffer_desc buffer = GSS_C_EMPTY_BUFFER;
    gss_display_status(&minor, status, type, mechanism, &next, &buffer);
    std::string text(static_cast<const char*>(buffer.value), buffer.length);
    gss_release_buffer(&minor, &buffer);
    return text;
}

void Require(OM_uint32 major, OM_uint32 minor, gss_OID mechanism)
{
    if (GSS_ERROR(major) != 0) {
        throw std::runtime_error(
            Text(major, GSS_C_GSS_CODE, mechanism) + ": "
            + Text(minor, GSS_C_MECH_CODE, mechanism));
    }
}

gss_buffer_desc Buffer(const std::string& text)
{
    return {text.size(), const_cast<char*>(text.data())};
}

} // namespace

Initiator::Initiator(
    const std::string& ccache, const std::string& service, OM_uint32 flags, Mechanism mechanism)
    : _mechanism(mechanism == Mechanism::SPNEGO ? &spnego : const_cast<gss_OID>(gss_mech_krb5))
    , _wanted(flags)
{
    const std::string cache = "FILE:" + ccache;
    gss_key_value_element_desc element{"ccache", cache.c_str()};
    const gss_key_value_set_desc store{1, &element};
    gss_OID_set_desc mechanisms{1, _mechanism};
    OM_uint32 minor = 0;
    OM_uint32 major = gss_acquire_cred_from(
        &minor,
        GSS_C_NO_NAME,
        GSS_C_INDEFINITE,
        &mechanisms,
        GSS_C_INITIATE,
        &store,
        &_credential,
        nullptr,
        nullptr);
    Require(major, minor, _mechanism);
    gss_buffer_desc name = Buffer(service);
    major =
        gss_import_name(&minor, &name, const_cast<gss_OID>(GSS_KRB5_NT_PRINCIPAL_NAME), &_service);
    Require(major, minor, _mechanism);
}

Initiator::~Initiator()
{
    OM_uint32 ignored = 0;
    gss_delete_sec_context(&ignored, &_context, GSS_C_NO_BUFFER);
    gss_release_name(&ignored, &_service);
    gss_release_cred(&ignored, &_credential);
}

std::string Initiator::Step(const std::string& leg)
{
    gss_buffer_desc input = Buffer(leg);
    gss_buffer_desc output = GSS_C_EMPTY_BUFFER;
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_init_sec_context(
        &minor,
        _credential,
        &_context,
        _service,
        _mechanism,
        _wanted,
        GSS_C_INDEFINITE,
        GSS_C_NO_CHANNEL_BINDINGS,
        &input,
        nullptr,
        &output,
        &_granted,
        nullptr);
    std::string next;
    if (output.length > 0) {
        next.assign(static_cast<const char*>(output.value), output.length);
    }
    OM_uint32 ignored = 0;
    gss_release_buffer(&ignored, &output);
    Require(major, minor, _mechanism);
    _isComplete = major == GSS_S_COMPLETE;
    return next;
}

} // namespace Testing
