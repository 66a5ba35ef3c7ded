#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"
#include "quillon/xml/Node.h"
#include "quillon/xml/security/Exceptions.h"

#include <list>
#include <string>
#include <string_view>
#include <vector>

namespace Quillon::Xml::Security {

/**
 * What a signature's `KeyInfo` says, reduced to what may pick a trusted key: the certificates it
 * carries, as DER bytes. Everything else in it is passed over; a key never comes out of it.
 */
struct KeyInfo
{
    std::vector<std::vector<unsigned char>> certificates;
};

/** Decides which keys may have made a signature. */
class QUILLON_API KeyInfoResolver : public RefCounted
{
public:
    /**
     * @return the certificates whose keys are to be tried, in order; never empty.
     * @throws XmlSecurityException  none is trusted.
     */
    virtual std::vector<Ref<const Crypto::Certificate>> Resolve(const KeyInfo& keyInfo) const = 0;
};

/**
 * Trusts exactly the given certificates, byte for byte: a `KeyInfo` with certificates only picks
 * among them, and without one each is tried. The certificates' validity dates, names and issuers
 * are not looked at: pinning a certificate is the whole of the trust decision.
 *
 * Thread safety: immutable.
 */
QUILLON_API Ref<KeyInfoResolver> CreateTrustSetKeyResolver(
    const std::list<Ref<const Crypto::Certificate>>& trustedCertificates);

/** Which signature algorithms are accepted; everything else of a signature is held to the same. */
enum class SignatureProfile
{
    NARROW,      ///< as `Signature` describes it
    WITH_RSA_PSS ///< and RSASSA-PSS with SHA-256, SHA-384 and SHA-512, the salt as long as these
};

/** One `ds:Reference` of a signature. */
class QUILLON_API Reference
{
public:
    virtual const std::string& GetUri() const noexcept = 0;

    /** Before signing only. @throws XmlSecurityException  the algorithm is not accepted. */
    virtual void SetDigestMethod(const std::string& identifier) = 0;

    /** Before signing only. @throws XmlSecurityException  not Exclusive XML Canonicalization. */
    virtual void AddTransform(const std::string& identifier) = 0;

protected:
    ~Reference() = default;
};

/**
 * An XML signature [XMLDSIG] held to a narrow profile, bound to the tree that it stands in. It is
 * either read from a document, to be verified (`CreateSignatureFromDom`), or blank, to be filled
 * and signed (`CreateBlankSignature`); an operation of the other kind is an
 * `InvalidStateException`.
 *
 * Verifying accepts: one `SignedInfo` in inclusive or exclusive canonical form; references to the
 * element that encloses the signature (an empty URI when that is the root, or `#` and an ID that
 * one element of the whole document has), with the enveloped-signature transform and then at most
 * one canonicalization; SHA-256, SHA-384 and SHA-512; RSA of 2048 bits or more (PKCS #1 v1.5) and
 * ECDSA on P-256, P-384 and P-521. No HMAC, SHA-1 or MD5; no other transform; no `Object`.
 *
 * Thread safety: const operations, any number of threads; the others, one thread.
 */
class QUILLON_API Signature : public RefCounted
{
public:
    /** In document order; may be empty. */
    virtual std::vector<const Reference*> GetReferences() const = 0;

    /**
     * Verifies the signature value, then every digest.
     *
     * @return false if the signature value or a digest does not match.
     * @throws XmlSecurityException  the signature lies outside the profile, or no trusted key
     *                               fits. The text names what was found.
     *
     * Cost: one public-key operation per key tried, and one pass per reference.
     */
    virtual bool Verify(const KeyInfoResolver* resolver) const = 0;

    /**
     * Adds a reference, after those that are there, with the SHA-256 digest and no transform.
     *
     * @param uri  `#` and the ID of one element in the tree of the signature's context.
     * @return the reference, owned by the signature.
     */
    virtual Reference* AddReference(const std::string& uri) = 0;

    /** Makes `content` the last child of the signature's `KeyInfo`. */
    virtual void AddKeyInfoContent(ElementNode* content) = 0;

    /**
     * Computes the digests and the signature value, each in one pass over the tree as it is.
     *
     * @throws InvalidArgumentException `key` is null.
     * @throws XmlSecurityException     the key does not fit the signature method, or a reference
     *                                  does not name exactly one element.
     * @throws Crypto::CryptoException  the key fails to sign.
     */
    virtual void Sign(const Crypto::PrivateKey* key) = 0;

    /** The `ds:Signature` element. */
    virtual ElementNode* GetElement() const noexcept = 0;

    /**
     * Whether the signature fixes what `prefix` (empty for the default namespace) is bound to at
     * `element`; never if that stands outside the signed element. A name in a value, as that of
     * `xsi:type`, may decide something only then: the exclusive form does not carry a declaration
     * that no element or attribute name uses [EXC-C14N 1.3], so anyone could have changed it. Says
     * nothing about whether the signature verifies.
     *
     * @return true if `element` is in the signed one, and one of the references is in inclusive
     * form, or lists the prefix, or renders the same binding at the element or the nearest of its
     * ancestors that uses the prefix.
     * @throws XmlSecurityException  a canonicalization lies outside the profile.
     */
    virtual bool CoversBinding(const ElementNode& element, std::string_view prefix) const = 0;
};

/**
 * Reads `signatureElement`, which stands in the tree of `parent` and is expected to sign it.
 *
 * @throws SignatureSyntaxException  the element is not built as [XMLDSIG 4] says, or holds a
 *                                   comment inside a value. Algorithms are judged by `Verify`.
 */
QUILLON_API void CreateSignatureFromDom(
    ElementNode* parent, ElementNode* signatureElement, Ref<Signature>& out);

/** The same in a profile that the caller chooses. */
QUILLON_API void CreateSignatureFromDom(
    ElementNode* parent,
    ElementNode* signatureElement,
    SignatureProfile profile,
    Ref<Signature>& out);

/**
 * Makes a signature without references, whose element stands in no tree yet.
 *
 * @param context                 an element of the tree in which references are looked up.
 * @param canonicalizationMethod  Exclusive XML Canonicalization 1.0.
 * @param signatureMethod         an RSA or ECDSA method of the accepted profile.
 * @param prefix                  the prefix of the XML Signature namespace.
 *
 * @throws XmlSecurityException  another method.
 */
QUILLON_API void CreateBlankSignature(
    ElementNode* context,
    const std::string& canonicalizationMethod,
    const std::string& signatureMethod,
    const std::string& prefix,
    Ref<Signature>& out);

} // namespace Quillon::Xml::Security
