#pragma once

#include "quillon/xml/security/Identifiers.h"

/** Every namespace and identifier that goes over the wire. Prefixes are chosen by the writers. */
namespace SsoClient::Wire {

// SOAP 1.1 and 1.2, WS-Trust 1.3 and WS-Addressing 1.0.
inline constexpr char SoapNamespace[] = "http://schemas.xmlsoap.org/soap/envelope/";
inline constexpr char Soap12Namespace[] = "http://www.w3.org/2003/05/soap-envelope";
inline constexpr char WsTrustNamespace[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
inline constexpr char WsAddressingNamespace[] = "http://www.w3.org/2005/08/addressing";

inline constexpr char AnonymousAddress[] = "http://www.w3.org/2005/08/addressing/anonymous";

// What requests take from WS-Trust 1.4, WS-Policy and the claims of identity selectors.
inline constexpr char WsTrust14Namespace[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200802";
inline constexpr char WsPolicyNamespace[] = "http://schemas.xmlsoap.org/ws/2004/09/policy";
inline constexpr char IdentityNamespace[] = "http://schemas.xmlsoap.org/ws/2005/05/identity";

inline constexpr char IssueAction[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
inline constexpr char IssueResponseAction[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue";
inline constexpr char RenewAction[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew";
inline constexpr char ValidateAction[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate";

inline constexpr char IssueRequestType[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Issue";
inline constexpr char RenewRequestType[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Renew";
inline constexpr char ValidateRequestType[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Validate";
inline constexpr char BearerKeyType[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/Bearer";
inline constexpr char PublicKeyType[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/PublicKey";
inline constexpr char StatusTokenType[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Status";
inline constexpr char ValidStatus[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid";
inline constexpr char InvalidStatus[] =
    "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/invalid";

/** The value type of a SPNEGO leg, from the WS-Trust draft of February 2005. */
inline constexpr char SpnegoValueType[] = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";

// WS-Security 1.0 and 1.1 and its token profiles.
inline constexpr char WsseNamespace[] =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
inline constexpr char Wsse11Namespace[] =
    "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
inline constexpr char WsuNamespace[] =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
inline constexpr char PasswordTextType[] =
    "http://docs.oasis-open.org/wss/2004/01/"
    "oasis-200401-wss-username-token-profile-1.0#PasswordText";
inline constexpr char Base64BinaryEncoding[] =
    "http://docs.oasis-open.org/wss/2004/01/"
    "oasis-200401-wss-soap-message-security-1.0#Base64Binary";
inline constexpr char X509v3ValueType[] =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-x509-token-profile-1.0#X509v3";

// The two spellings of the profile's name differ in it as well.
inline constexpr char Saml20TokenType[] =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
inline constexpr char Saml20TokenTypeWithHyphen[] =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
inline constexpr char SamlIdValueType[] =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";

/** The Id of the signature by the holder-of-key private key, for `wst:UseKey` to point at. */
inline constexpr char ProofSignatureId[] = "holderOfKeyProofSignature";

// SAML 2.0. The namespace of assertions is also the token type of an issued assertion.
inline constexpr char SamlNamespace[] = "urn:oasis:names:tc:SAML:2.0:assertion";
inline constexpr char DelegationNamespace[] = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";
inline constexpr char BearerMethod[] = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
inline constexpr char HolderOfKeyMethod[] = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";

// XML Encryption 1.0 and what 1.1 adds.
inline constexpr char XencNamespace[] = "http://www.w3.org/2001/04/xmlenc#";
inline constexpr char Xenc11Namespace[] = "http://www.w3.org/2009/xmlenc11#";

// XML Signature and XML Schema.
using Quillon::Xml::Security::DsNamespace;
inline constexpr char XsNamespace[] = "http://www.w3.org/2001/XMLSchema";
inline constexpr char XsiNamespace[] = "http://www.w3.org/2001/XMLSchema-instance";

// Names whose authority the build configures.
extern const char RsaNamespace[];
extern const char RsaAdviceNamespace[];
extern const char GroupIdentityAttribute[];
extern const char UpnClaim[];
extern const char GivenNameClaim[];
extern const char SurnameClaim[];
extern const char IsSolutionAttribute[];

} // namespace SsoClient::Wire
