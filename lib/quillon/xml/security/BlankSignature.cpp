#include "core/quote.h"
#include "quillon/StringUtil.h"
#include "quillon/xml/security/Identifiers.h"
#include "quillon/xml/security/Signature.h"
#include "xml/Arena.h"
#include "xml/security/Algorithms.h"
#include "xml/security/canonicalDigest.h"
#include "xml/security/signatureTarget.h"

#include <list>

namespace Quillon::Xml::Security {

namespace {

void RequireExclusive(const std::string& identifier)
{
    if (identifier != ExclusiveC14n) {
        throw XmlSecurityException(
            "Signing uses Exclusive XML Canonicalization, not " + Quote(identifier));
    }
}

class NewReference final : public Reference
{
public:
    explicit NewReference(std::string uri)
        : _uri(std::move(uri))
    {}

    const std::string& GetUri() const noexcept override { return _uri; }

    void SetDigestMethod(const std::string& identifier) override
    {
        _hash = GetDigestAlgorithm(identifier);
        _digestMethod = identifier;
    }

    void AddTransform(const std::string& identifier) override
    {
        RequireExclusive(identifier);
        _transforms.push_back(identifier);
    }

    const std::string& GetDigestMethod() const noexcept { return _digestMethod; }
    const std::vector<std::string>& GetTransforms() const noexcept { return _transforms; }

    /** [XMLDSIG 4.3.3.2]: with no canonicalization named, the inclusive one gives the octets. */
    Crypto::DigestValue Compute(const ElementNode& context) const
    {
        CanonicalizationMethod method;
        method.isExclusive = !_transforms.empty();
        return DigestElement(_hash, method, FindTarget(_uri, context), nullptr);
    }

private:
    std::string _uri;
    Crypto::HashAlgorithm _hash = Crypto::HashAlgorithm::SHA256;
    std::string _digestMethod = DigestSha256;
    std::vector<std::string> _transforms;
};

/** A signature to be filled and signed. */
class BlankSignature final : public Signature
{
public:
    BlankSignature(
        ElementNode* context, const std::string& signatureMethod, const std::string& prefix)
        : _context(context)
        , _algorithm(GetSignatureAlgorithm(signatureMethod, SignatureProfile::NARROW))
        , _prefix(prefix)
    {
        CreateElementNode(prefix, "Signature", _element);
        _element->DefineAttribute(prefix.empty() ? "xmlns" : "xmlns:" + prefix, DsNamespace);
    }

    std::vector<const Reference*> GetReferences() const override
    {
        std::vector<const Reference*> references;
        for (const NewReference& reference : _references) {
            references.push_back(&reference);
        }
        return references;
    }

    bool Verify(const KeyInfoResolver* /*resolver*/) const override
    {
        throw InvalidStateException("A signature that was just made is not verified");
    }

    bool CoversBinding(const ElementNode& /*element*/, std::string_view /*prefix*/) const override
    {
        throw InvalidStateException("A signature that was just made is not verified");
    }

    Reference* AddReference(const std::string& uri) override
    {
        if (uri.size() < 2 || uri.front() != '#') {
            throw XmlSecurityException("Reference " + Quote(uri) + " is not of the form '#ID'");
        }
        return &_references.emplace_back(uri);
    }

    void AddKeyInfoContent(ElementNode* content) override { _keyInfoContent.emplace_back(content); }

    ElementNode* GetElement() const noexcept override { return _element.get(); }

    void Sign(const Crypto::PrivateKey* key) override
    {
        if (key == nullptr) {
            throw InvalidArgumentException("A signature needs a private key");
        }
        if (!IsAcceptedKey(_algorithm, key->GetKeyType(), key->GetBits())) {
            throw XmlSecurityException(
                "A key of type " + key->GetDescription() + " cannot sign with "
                + Quote(_algorithm.identifier));
        }
        if (_element->GetFirstChild() != nullptr) {
            throw InvalidStateException("A signature is signed only once");
        }
        const ElementNode& signedInfo = AddSignedInfo();
        CanonicalizationMethod method;
        method.isExclusive = true;
        const Crypto::DigestValue digest =
            DigestElement(_algorithm.hash, method, signedInfo, nullptr);
        AddText(
            *_element,
            "SignatureValue",
            StringUtil::Base64Encode(key->SignDigest(_algorithm.hash, digest.bytes.data())));
        AddKeyInfo();
    }

private:
    const ElementNode& AddSignedInfo()
    {
        ElementNode& signedInfo = AddChild(*_element, "SignedInfo");
        AddAlgorithm(signedInfo, "CanonicalizationMethod", ExclusiveC14n);
        AddAlgorithm(signedInfo, "SignatureMethod", _algorithm.identifier);
        for (const NewReference& reference : _references) {
            AddReferenceElement(signedInfo, reference);
        }
        return signedInfo;
    }

    void AddReferenceElement(ElementNode& signedInfo, const NewReference& reference)
    {
        ElementNode& element = AddChild(signedInfo, "Reference");
        element.DefineAttribute("URI", reference.GetUri());
        if (!reference.GetTransforms().empty()) {
            ElementNode& transforms = AddChild(element, "Transforms");
            for (const std::string& transform : reference.GetTransforms()) {
                AddAlgorithm(transforms, "Transform", transform);
            }
        }
        AddAlgorithm(element, "DigestMethod", reference.GetDigestMethod());
        const Crypto::DigestValue digest = reference.Compute(*_context);
        AddText(
            element, "DigestValue", StringUtil::Base64Encode(digest.bytes.data(), digest.length));
    }

    void AddKeyInfo()
    {
        if (_keyInfoContent.empty()) {
            return;
        }
        ElementNode& keyInfo = AddChild(*_element, "KeyInfo");
        for (const Ref<ElementNode>& content : _keyInfoContent) {
            keyInfo.AppendChild(content.get());
        }
    }

    /** A new last child, made in the arena of the signature itself. */
    ElementNode& AddChild(ElementNode& parent, const char* localName)
    {
        Arena& arena = Arena::Of(*_element);
        const std::string name = _prefix.empty() ? localName : _prefix + ":" + localName;
        ElementNode* child = arena.NewElement(arena.CopyText(name));
        parent.AppendChild(child);
        return *child;
    }

    void AddAlgorithm(ElementNode& parent, const char* localName, std::string_view identifier)
    {
        AddChild(parent, localName).DefineAttribute("Algorithm", identifier);
    }

    void AddText(ElementNode& parent, const char* localName, std::string_view text)
    {
        Arena& arena = Arena::Of(*_element);
        AddChild(parent, localName).AppendChild(arena.NewText(arena.CopyText(text)));
    }

    Ref<ElementNode> _context;
    const SignatureAlgorithm& _algorithm;
    std::string _prefix;
    Ref<ElementNode> _element;
    std::list<NewReference> _references;
    std::vector<Ref<ElementNode>> _keyInfoContent;
};

} // namespace

void CreateBlankSignature(
    ElementNode* context,
    const std::string& canonicalizationMethod,
    const std::string& signatureMethod,
    const std::string& prefix,
    Ref<Signature>& out)
{
    RequireExclusive(canonicalizationMethod);
    out.reset(new BlankSignature(context, signatureMethod, prefix));
}

} // namespace Quillon::Xml::Security
