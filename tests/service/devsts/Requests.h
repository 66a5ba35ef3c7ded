#pragma once

#include <map>
#include <string>

// Requests written by hand.

namespace DevStsTests {

namespace Ns {

constexpr const char* Soap = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr const char* Wst = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
constexpr const char* Wsse =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr const char* Wsu =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
constexpr const char* Saml = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr const char* Ds = "http://www.w3.org/2000/09/xmldsig#";

} // namespace Ns

/** The prefixes that test expressions use. */
const std::map<std::string, std::string>& Prefixes();

/** A whole envelope; the header part stands after the timestamp. */
std::string Envelope(const std::string& headerPart, const std::string& body);

std::string UsernameToken(const std::string& name, const std::string& password);

/** The same with Alice's. */
std::string AlicesPassword();

/** The body of an Issue request; `extras` stand at its end. */
std::string IssueBody(const std::string& keyType = "Bearer", const std::string& extras = "");

/** Alice asks for a bearer token of one hour; `extras` stand at the end of the body. */
std::string PasswordRequest(const std::string& extras = "");

std::string DelegateTo(const std::string& name);

} // namespace DevStsTests
