#include "NegotiationHarness.h"

#include "Requests.h"
#include "support/TestKdc.h"

#include <openssl/evp.h>

namespace DevStsTests {

class Realm::Impl
{
public:
    Testing::TestKdc kdc;
};

const std::filesystem::path& NegotiationState()
{
    static const StateCopy copy;
    static const std::filesystem::path path = copy.Path();
    return path;
}

Realm::Realm()
    : _impl(std::make_unique<Impl>())
{
    for (const std::string principal : {"alice", "mallory"}) {
        _impl->kdc.LogOn(principal, Tickets(principal));
    }
}

Realm::~Realm() = default;

const Realm& Realm::Shared()
{
    static const Realm realm;
    return realm;
}

std::string Realm::File(const std::string& name) const
{
    return _impl->kdc.GetFile(name);
}

std::string Realm::Tickets(const std::string& principal) const
{
    return File(principal + ".tickets");
}

std::string ToBase64(const std::string& bytes)
{
    std::string text(4 * ((bytes.size() + 2) / 3) + 1, '\0');
    const int size = EVP_EncodeBlock(
        reinterpret_cast<unsigned char*>(text.data()),
        reinterpret_cast<const unsigned char*>(bytes.data()),
        static_cast<int>(bytes.size()));
    text.resize(static_cast<std::size_t>(size));
    return text;
}

std::string FromBase64(const std::string& text)
{
    std::string bytes(text.size(), '\0');
    const int size = EVP_DecodeBlock(
        reinterpret_cast<unsigned char*>(bytes.data()),
        reinterpret_cast<const unsigned char*>(text.data()),
        static_cast<int>(text.size()));
    if (size < 0) {
        ADD_FAILURE() << "not Base64: " << text;
        return "";
    }
    // The block decoder counts the padding as zeros.
    const std::size_t last = text.find_last_not_of('=');
    const std::size_t padding = last == std::string::npos ? 0 : text.size() - last - 1;
    bytes.resize(static_cast<std::size_t>(size) - padding);
    return bytes;
}

std::string BinaryExchange(const std::string& base64)
{
    return "<wst:BinaryExchange "
           "ValueType=\"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego\" "
           "EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
           "oasis-200401-wss-soap-message-security-1.0#Base64Binary\">"
           + base64 + "</wst:BinaryExchange>";
}

std::string FirstBody(const std::string& leg, const std::string& keyType, const std::string& extras)
{
    return Replaced(
        IssueBody(keyType, extras + BinaryExchange(ToBase64(leg))),
        "<wst:RequestSecurityToken ",
        "<wst:RequestSecurityToken Context=\"urn:uuid:5a3c1f6e-0d4b-4c57-9d3e-2f8a7b6c5d4e\" ");
}

std::string FirstRequest(const std::string& leg)
{
    return Envelope("", FirstBody(leg));
}

std::string NextBody(const std::string& context, const std::string& leg)
{
    return "<wst:RequestSecurityTokenResponse Context=\"" + context + "\">"
           + BinaryExchange(ToBase64(leg)) + "</wst:RequestSecurityTokenResponse>";
}

std::string NextRequest(const std::string& context, const std::string& leg)
{
    return Envelope("", NextBody(context, leg));
}

// NegTokenInit with mechTypes and nothing else. [RFC4178 4.2.1]
std::string OfferOfKerberos()
{
    static const std::string spnego = "\x06\x06\x2b\x06\x01\x05\x05\x02";
    static const std::string kerberos = "\x06\x09\x2a\x86\x48\x86\xf7\x12\x01\x02\x02";
    return "\x60\x1b" + spnego + "\xa0\x11\x30\x0f\xa0\x0d\x30\x0b" + kerberos;
}

namespace {

DevSts::Options NegotiatingOptions(std::size_t pendingNegotiations)
{
    DevSts::Options options;
    options.keytab = Realm::Shared().File("service.keytab");
    options.pendingNegotiations = pendingNegotiations;
    return options;
}

} // namespace

NegotiationTest::NegotiationTest(std::size_t pendingNegotiations)
    : ServerTest(NegotiationState(), NegotiatingOptions(pendingNegotiations))
{}

Initiator NegotiationTest::Alice(OM_uint32 flags)
{
    return Initiator(Realm::Shared().Tickets("alice"), ServicePrincipal, flags);
}

HttpResult NegotiationTest::PostNext(const std::string& request, const std::string& cookie)
{
    DevSts::Headers headers;
    if (!cookie.empty()) {
        headers.emplace("Cookie", cookie);
    }
    return Post(std::string(Ns::Wst) + "/RSTR/Issue", request, headers);
}

HttpResult NegotiationTest::PostNext(
    const std::string& context, const std::string& leg, const std::string& cookie)
{
    return PostNext(NextRequest(context, leg), cookie);
}

std::string NegotiationTest::CookieOf(const HttpResult& reply)
{
    const auto header = reply.headers.find("Set-Cookie");
    if (header == reply.headers.end()) {
        ADD_FAILURE() << "no cookie";
        return "";
    }
    return header->second.substr(0, header->second.find(';'));
}

std::string NegotiationTest::ContextOf(const HttpResult& reply)
{
    return FindOne(reply.body, "//wst:RequestSecurityTokenResponse/@Context");
}

std::string NegotiationTest::LegOf(const HttpResult& reply)
{
    return FromBase64(FindOne(reply.body, "//wst:RequestSecurityTokenResponse/wst:BinaryExchange"));
}

HttpResult NegotiationTest::BeginToWait()
{
    return PostIssue(FirstRequest(OfferOfKerberos()));
}

} // namespace DevStsTests
