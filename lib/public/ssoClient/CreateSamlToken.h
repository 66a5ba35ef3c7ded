#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/xml/Node.h"
#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <list>
#include <string>

namespace SsoClient {

/** The clock tolerance of the factories that take none, in seconds. */
inline constexpr long long DefaultClockToleranceSec = 600;

/**
 * Reads and verifies a SAML 2.0 assertion: its shape, its validity now, its signature by one of
 * the trusted certificates over the whole assertion.
 *
 * @param xml                the assertion, UTF-8; kept unchanged as `SamlToken::ToXml`.
 * @param trustedCerts       the certificates whose keys may have signed, byte for byte. Their own
 *                           validity dates are not looked at. With an empty list nothing verifies.
 * @param clockToleranceSec  by how much the validity window is widened at both ends.
 *
 * @throws ParseException                      a deviation in shape or values, or out of validity.
 *                                             The text may be as long as `xml`.
 * @throws InvalidSignatureException           the signature does not verify.
 * @throws Quillon::Xml::XMLParseException     `xml` is not well-formed or exceeds a limit.
 * @throws Quillon::Crypto::CryptoException    the confirmation certificate cannot be decoded.
 * @throws Quillon::Base64FormatException      the confirmation certificate is not Base64.
 * @throws Quillon::InvalidArgumentException   a trusted certificate is null.
 *
 * Thread safety: any number of threads, also with the same certificates. In a forked child it works
 * if the process had no thread but the forking one. Cost: one parse, one
 * hash and one public-key operation.
 */
SSOCLIENT_API boost::shared_ptr<const SamlToken> CreateSamlToken(
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCerts,
    long long clockToleranceSec);

/** The same with a clock tolerance of 600 seconds. */
SSOCLIENT_API boost::shared_ptr<const SamlToken> CreateSamlToken(
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCerts);

/** The same for one trusted certificate, which is referenced only during the call. */
SSOCLIENT_API boost::shared_ptr<const SamlToken> CreateSamlToken(
    const std::string& xml, const Quillon::Crypto::Certificate* trustedCert);

/**
 * The same for an assertion that is already parsed, possibly inside a larger document. The
 * token's XML is then the assertion's inclusive canonical form; the tree is not kept. That form
 * takes on the `xml:` attributes of the elements around the assertion: if there are any, the
 * token is good, but `CreateSamlToken` may refuse its XML. The canonical form has no comments, so a
 * comment beside a blank of a value is refused with a `ParseException`: the value would be another
 * in the token's XML.
 *
 * @throws Quillon::Xml::Security::XmlSecurityException  the assertion has no canonical form: a
 *                                                       prefix is not declared.
 */
SSOCLIENT_API boost::shared_ptr<const SamlToken> CreateSamlTokenFromDom(
    Quillon::Xml::ElementNode* assertion,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCerts,
    long long clockToleranceSec);
SSOCLIENT_API boost::shared_ptr<const SamlToken> CreateSamlTokenFromDom(
    Quillon::Xml::ElementNode* assertion,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCerts);

} // namespace SsoClient
