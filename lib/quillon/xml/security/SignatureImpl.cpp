#include "core/quote.h"
#include "quillon/xml/security/Identifiers.h"
#include "xml/security/Algorithms.h"
#include "xml/security/Canonicalization.h"
#include "xml/security/SignatureModel.h"
#include "xml/security/canonicalDigest.h"
#include "xml/security/namespaceCoverage.h"
#include "xml/security/signatureTarget.h"

#include <algorithm>
#include <cstring>

namespace Quillon::Xml::Security {

namespace {

/** Each reference costs a pass over the signed element; a token has one. */
constexpr std::size_t MaxReferences = 8;

void RequireNoChild(const AlgorithmUse& use)
{
    if (!use.foreignChild.empty() || use.prefixList != nullptr) {
        throw XmlSecurityException(
            "Algorithm " + Quote(use.identifier) + " does not take the parameter "
            + Quote(use.prefixList != nullptr ? "InclusiveNamespaces" : use.foreignChild));
    }
}

CanonicalizationMethod GetCanonicalization(const AlgorithmUse& use)
{
    CanonicalizationMethod method;
    method.isExclusive = use.identifier == ExclusiveC14n;
    if (!method.isExclusive && use.identifier != InclusiveC14n) {
        throw XmlSecurityException(
            "Canonicalization " + Quote(use.identifier) + " is not accepted");
    }
    AlgorithmUse other = use;
    if (method.isExclusive && use.prefixList != nullptr) {
        method.inclusivePrefixes = ParsePrefixList(use.prefixList->value);
        other.prefixList = nullptr;
    }
    RequireNoChild(other);
    return method;
}

/** A reference that was found to lie inside the profile. */
struct CheckedReference
{
    const ReferenceModel* model;
    CanonicalizationMethod canonicalization;
    Crypto::HashAlgorithm hash;
};

/** [XMLDSIG 4.3.3.2]: with no canonicalization named, the inclusive one gives the octets. */
CanonicalizationMethod CheckTransforms(const std::vector<AlgorithmUse>& transforms)
{
    if (transforms.empty() || transforms.front().identifier != EnvelopedSignature) {
        throw XmlSecurityException(
            transforms.empty() ? "The reference has no enveloped-signature transform"
                               : "Transform " + Quote(transforms.front().identifier)
                                     + " stands where enveloped-signature must");
    }
    RequireNoChild(transforms.front());
    CanonicalizationMethod method =
        transforms.size() == 1 ? CanonicalizationMethod() : GetCanonicalization(transforms[1]);
    if (transforms.size() > 2) {
        throw XmlSecurityException(
            "Transform " + Quote(transforms[2].identifier) + " follows a canonicalization");
    }
    return method;
}

CheckedReference CheckReference(const ReferenceModel& reference, const ElementNode& parent)
{
    RequireTarget(reference.uri, parent);
    CheckedReference checked{
        &reference,
        CheckTransforms(reference.transforms),
        GetDigestAlgorithm(reference.digestMethod.identifier)};
    RequireNoChild(reference.digestMethod);
    return checked;
}

/** The keys that the algorithm can use at all. @throws XmlSecurityException if there is none. */
std::vector<const Crypto::PublicKey*> SelectKeys(
    const SignatureAlgorithm& algorithm,
    const std::vector<Ref<const Crypto::Certificate>>& certificates)
{
    std::vector<const Crypto::PublicKey*> keys;
    for (const Ref<const Crypto::Certificate>& certificate : certificates) {
        const Crypto::PublicKey& key = certificate->GetPublicKey();
        if (IsAcceptedKey(algorithm, key.GetKeyType(), key.GetBits())) {
            keys.push_back(&key);
        }
    }
    if (keys.empty()) {
        throw XmlSecurityException(
            "No trusted key fits signature algorithm " + Quote(algorithm.identifier)
            + "; the first one tried is " + certificates.front()->GetPublicKey().GetDescription());
    }
    return keys;
}

bool VerifyWith(
    const Crypto::PublicKey& key,
    const SignatureAlgorithm& algorithm,
    const Crypto::DigestValue& digest,
    const std::vector<unsigned char>& value)
{
    const auto verify =
        algorithm.isPss ? &Crypto::PublicKey::VerifyPssDigest : &Crypto::PublicKey::VerifyDigest;
    return (key.*verify)(algorithm.hash, digest.bytes.data(), value.data(), value.size());
}

[[noreturn]] void RefuseToSign()
{
    throw InvalidStateException("A signature that was read from a document is not signed again");
}

/** A reference as it was read. */
class ReadReference final : public Reference
{
public:
    explicit ReadReference(const std::string& uri)
        : _uri(uri)
    {}

    const std::string& GetUri() const noexcept override { return _uri; }
    void SetDigestMethod(const std::string& /*identifier*/) override { RefuseToSign(); }
    void AddTransform(const std::string& /*identifier*/) override { RefuseToSign(); }

private:
    const std::string& _uri;
};

class SignatureImpl final : public Signature
{
public:
    SignatureImpl(ElementNode* parent, ElementNode* element, SignatureProfile profile)
        : _parent(parent)
        , _element(element)
        , _profile(profile)
        , _model(ReadSignature(*element))
    {
        for (const ReferenceModel& reference : _model.references) {
            _references.emplace_back(reference.uri);
        }
    }

    std::vector<const Reference*> GetReferences() const override
    {
        std::vector<const Reference*> references;
        for (const ReadReference& reference : _references) {
            references.push_back(&reference);
        }
        return references;
    }

    ElementNode* GetElement() const noexcept override { return _element.get(); }
    Reference* AddReference(const std::string& /*uri*/) override { RefuseToSign(); }
    void AddKeyInfoContent(ElementNode* /*content*/) override { RefuseToSign(); }
    void Sign(const Crypto::PrivateKey* /*key*/) override { RefuseToSign(); }

    bool Verify(const KeyInfoResolver* resolver) const override
    {
        const SignatureAlgorithm& algorithm =
            GetSignatureAlgorithm(_model.signatureMethod.identifier, _profile);
        RequireNoChild(_model.signatureMethod);
        const CanonicalizationMethod method = GetCanonicalization(_model.canonicalization);
        const std::vector<CheckedReference> references = CheckReferences();
        const auto certificates = resolver->Resolve(_model.keyInfo);

        // The signature value comes before any digest: until SignedInfo is known to be genuine,
        // its references are an attacker's instructions.
        return VerifySignedInfo(algorithm, method, certificates)
               && std::all_of(
                   references.begin(), references.end(), [this](const CheckedReference& reference) {
                       return DigestMatches(reference);
                   });
    }

    bool CoversBinding(const ElementNode& element, std::string_view prefix) const override
    {
        return std::any_of(
            _model.references.begin(), _model.references.end(), [&](const auto& reference) {
                return Covers(CheckTransforms(reference.transforms), *_parent, element, prefix);
            });
    }

private:
    std::vector<CheckedReference> CheckReferences() const
    {
        if (_model.references.empty() || _model.references.size() > MaxReferences) {
            throw XmlSecurityException(
                "The signature has " + std::to_string(_model.references.size())
                + " references; 1 to " + std::to_string(MaxReferences) + " are accepted");
        }
        std::vector<CheckedReference> checked;
        checked.reserve(_model.references.size());
        for (const ReferenceModel& reference : _model.references) {
            checked.push_back(CheckReference(reference, *_parent));
        }
        return checked;
    }

    bool VerifySignedInfo(
        const SignatureAlgorithm& algorithm,
        const CanonicalizationMethod& method,
        const std::vector<Ref<const Crypto::Certificate>>& certificates) const
    {
        const auto candidates = SelectKeys(algorithm, certificates);
        const Crypto::DigestValue digest =
            DigestElement(algorithm.hash, method, *_model.signedInfo, nullptr);
        return std::any_of(candidates.begin(), candidates.end(), [&](const Crypto::PublicKey* key) {
            return VerifyWith(*key, algorithm, digest, _model.signatureValue);
        });
    }

    bool DigestMatches(const CheckedReference& reference) const
    {
        const Node* first = reference.model->uri.empty() ? GetFirstTopLevel(*_parent) : nullptr;
        const Crypto::DigestValue digest =
            first != nullptr
                ? DigestDocument(reference.hash, reference.canonicalization, first, _element.get())
                : DigestElement(
                    reference.hash, reference.canonicalization, *_parent, _element.get());
        const std::vector<unsigned char>& expected = reference.model->digestValue;
        return expected.size() == digest.length
               && std::memcmp(expected.data(), digest.bytes.data(), digest.length) == 0;
    }

    Ref<ElementNode> _parent;
    Ref<ElementNode> _element;
    SignatureProfile _profile;
    SignatureModel _model;
    std::vector<ReadReference> _references;
};

} // namespace

void CreateSignatureFromDom(ElementNode* parent, ElementNode* signatureElement, Ref<Signature>& out)
{
    CreateSignatureFromDom(parent, signatureElement, SignatureProfile::NARROW, out);
}

void CreateSignatureFromDom(
    ElementNode* parent,
    ElementNode* signatureElement,
    SignatureProfile profile,
    Ref<Signature>& out)
{
    if (signatureElement->GetParent() != parent) {
        throw SignatureSyntaxException("The signature is not a child of the element that it signs");
    }
    out.reset(new SignatureImpl(parent, signatureElement, profile));
}

} // namespace Quillon::Xml::Security
