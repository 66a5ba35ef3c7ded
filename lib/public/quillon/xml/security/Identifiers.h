#pragma once

/** Identifiers of XML Signature and of the algorithms of the accepted profile. */
namespace Quillon::Xml::Security {

inline constexpr char DsNamespace[] = "http://www.w3.org/2000/09/xmldsig#";
inline constexpr char EnvelopedSignature[] =
    "http://www.w3.org/2000/09/xmldsig#enveloped-signature";

inline constexpr char InclusiveC14n[] = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";
inline constexpr char ExclusiveC14n[] = "http://www.w3.org/2001/10/xml-exc-c14n#";

inline constexpr char DigestSha256[] = "http://www.w3.org/2001/04/xmlenc#sha256";
inline constexpr char DigestSha384[] = "http://www.w3.org/2001/04/xmldsig-more#sha384";
inline constexpr char DigestSha512[] = "http://www.w3.org/2001/04/xmlenc#sha512";

inline constexpr char RsaSha256[] = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
inline constexpr char RsaSha384[] = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha384";
inline constexpr char RsaSha512[] = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha512";
// RSASSA-PSS with MGF1 on the same hash and a salt as long as the digest [RFC 9231 2.3.10].
inline constexpr char RsaPssSha256[] = "http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1";
inline constexpr char RsaPssSha384[] = "http://www.w3.org/2007/05/xmldsig-more#sha384-rsa-MGF1";
inline constexpr char RsaPssSha512[] = "http://www.w3.org/2007/05/xmldsig-more#sha512-rsa-MGF1";
inline constexpr char EcdsaSha256[] = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256";
inline constexpr char EcdsaSha384[] = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha384";
inline constexpr char EcdsaSha512[] = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha512";

} // namespace Quillon::Xml::Security
