#include "Requests.h"

namespace DevStsTests {

namespace {

std::string Declare(const std::string& prefix, const std::string& uri)
{
    return " xmlns:" + prefix + "=\"" + uri + "\"";
}

} // namespace

const std::map<std::string, std::string>& Prefixes()
{
    static const std::map<std::string, std::string> prefixes = {
        {"soapenv", Ns::Soap},
        {"wst", Ns::Wst},
        {"wsse", Ns::Wsse},
        {"wsu", Ns::Wsu},
        {"saml", Ns::Saml},
        {"ds", Ns::Ds},
        {"ec", "http://www.w3.org/2001/10/xml-exc-c14n#"},
        {"del", "urn:oasis:names:tc:SAML:2.0:conditions:delegation"},
        {"rsa", SSOCLIENT_RSA_AUTHORITY "/names/2009/12/std-ext/SAML2.0"},
        {"xsi", "http://www.w3.org/2001/XMLSchema-instance"}};
    return prefixes;
}

std::string Envelope(const std::string& headerPart, const std::string& body)
{
    return "<soapenv:Envelope" + Declare("soapenv", Ns::Soap) + "><soapenv:Header><wsse:Security"
           + Declare("wsse", Ns::Wsse) + "><wsu:Timestamp" + Declare("wsu", Ns::Wsu)
           + "><wsu:Created>2026-11-20T12:00:00.000Z</wsu:Created>"
             "<wsu:Expires>2026-11-20T12:10:00.000Z</wsu:Expires></wsu:Timestamp>"
           + headerPart + "</wsse:Security></soapenv:Header><soapenv:Body" + Declare("wst", Ns::Wst)
           + ">" + body + "</soapenv:Body></soapenv:Envelope>";
}

std::string UsernameToken(const std::string& name, const std::string& password)
{
    return "<wsse:UsernameToken" + Declare("wsse", Ns::Wsse) + "><wsse:Username>" + name
           + "</wsse:Username><wsse:Password "
             "Type=\"http://docs.oasis-open.org/wss/2004/01/"
             "oasis-200401-wss-username-token-profile-1.0#PasswordText\">"
           + password + "</wsse:Password></wsse:UsernameToken>";
}

std::string AlicesPassword()
{
    return UsernameToken("alice@example.test", "alice-secret");
}

std::string IssueBody(const std::string& keyType, const std::string& extras)
{
    return "<wst:RequestSecurityToken" + Declare("wst", Ns::Wst)
           + "><wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
             "<wst:RequestType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Issue"
             "</wst:RequestType>"
             "<wst:KeyType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/"
           + keyType + "</wst:KeyType><wst:Lifetime" + Declare("wsu", Ns::Wsu)
           + "><wsu:Created>2026-11-20T12:00:00.001Z</wsu:Created>"
             "<wsu:Expires>2026-11-20T13:00:00.001Z</wsu:Expires></wst:Lifetime>"
             "<wst:Renewing Allow=\"false\" OK=\"false\"/>"
             "<wst:Delegatable>false</wst:Delegatable>"
           + extras + "</wst:RequestSecurityToken>";
}

std::string PasswordRequest(const std::string& extras)
{
    return Envelope(AlicesPassword(), IssueBody("Bearer", extras));
}

std::string DelegateTo(const std::string& name)
{
    return "<wst:DelegateTo><wsse:UsernameToken" + Declare("wsse", Ns::Wsse) + "><wsse:Username>"
           + name + "</wsse:Username></wsse:UsernameToken></wst:DelegateTo>";
}

} // namespace DevStsTests
