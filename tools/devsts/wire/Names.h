#pragma once

// The namespaces and identifiers that this STS reads and writes. The three authorities are
// settings of the build, because they differ between token services.

namespace DevSts::Names {

constexpr const char* Soap = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr const char* Wst = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
constexpr const char* Wsse =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr const char* Wsse11 = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
constexpr const char* Wsu =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
constexpr const char* Wsa = "http://www.w3.org/2005/08/addressing";
constexpr const char* Saml = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr const char* Del = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";
constexpr const char* Ds = "http://www.w3.org/2000/09/xmldsig#";
constexpr const char* Xs = "http://www.w3.org/2001/XMLSchema";
constexpr const char* Xsi = "http://www.w3.org/2001/XMLSchema-instance";
constexpr const char* Rsa = SSOCLIENT_RSA_AUTHORITY "/names/2009/12/std-ext/SAML2.0";
constexpr const char* RsaAdvice =
    SSOCLIENT_RSA_AUTHORITY "/names/2009/12/std-ext/WS-Trust1.4/advice";

// [WST13 3.1, 4, 5, 7]
constexpr const char* ActionIssue = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
constexpr const char* ActionContinue =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue";
constexpr const char* ActionRenew = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew";
constexpr const char* ActionValidate =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate";
constexpr const char* RequestIssue = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Issue";
constexpr const char* RequestRenew = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Renew";
constexpr const char* RequestValidate = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Validate";
constexpr const char* KeyBearer = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Bearer";
constexpr const char* KeyPublic = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/PublicKey";
constexpr const char* TokenStatus = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Status";
constexpr const char* StatusValid = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid";
constexpr const char* StatusInvalid =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/invalid";

constexpr const char* PasswordText = "http://docs.oasis-open.org/wss/2004/01/"
                                     "oasis-200401-wss-username-token-profile-1.0#PasswordText";
constexpr const char* Base64Binary = "http://docs.oasis-open.org/wss/2004/01/"
                                     "oasis-200401-wss-soap-message-security-1.0#Base64Binary";
constexpr const char* Spnego = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";
constexpr const char* X509v3 = "http://docs.oasis-open.org/wss/2004/01/"
                               "oasis-200401-wss-x509-token-profile-1.0#X509v3";
// The two spellings of the profile's name are the profile's own. [WSS-SAML11 3.4]
constexpr const char* SamlV2 =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
constexpr const char* SamlId =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";

constexpr const char* MethodBearer = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr const char* MethodHolderOfKey = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
constexpr const char* FormatEntity = "urn:oasis:names:tc:SAML:2.0:nameid-format:entity";
constexpr const char* FormatUri = "urn:oasis:names:tc:SAML:2.0:attrname-format:uri";
constexpr const char* FormatUpn = SSOCLIENT_CLAIMS_AUTHORITY "/claims/UPN";
constexpr const char* ContextPassword =
    "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport";
constexpr const char* ContextCertificate = "urn:oasis:names:tc:SAML:2.0:ac:classes:X509";
constexpr const char* ContextKerberos = "urn:oasis:names:tc:SAML:2.0:ac:classes:Kerberos";

constexpr const char* AttributeGroups =
    SSOCLIENT_RSA_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char* AttributeGivenName =
    SSOCLIENT_CLAIMS_AUTHORITY "/ws/2005/05/identity/claims/givenname";
constexpr const char* AttributeSurname =
    SSOCLIENT_CLAIMS_AUTHORITY "/ws/2005/05/identity/claims/surname";
constexpr const char* AttributeIsSolution =
    SSOCLIENT_ISSUER_AUTHORITY "/schemas/attr-names/2011/07/isSolution";
constexpr const char* Issuer = SSOCLIENT_ISSUER_AUTHORITY "/sts";

} // namespace DevSts::Names
