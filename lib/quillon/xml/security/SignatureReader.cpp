#include "core/quote.h"
#include "quillon/StringUtil.h"
#include "quillon/xml/security/Identifiers.h"
#include "xml/security/SignatureModel.h"
#include "xml/treeWalk.h"

#include <algorithm>
#include <array>
#include <map>

namespace Quillon::Xml::Security {

namespace {

[[noreturn]] void Fail(const std::string& what)
{
    throw SignatureSyntaxException(what);
}

bool IsBlankText(const Node& node) noexcept
{
    const TextNode* text = AsText(&node);
    return text != nullptr
           && text->GetText().find_first_not_of("\t\n\r ") == std::string_view::npos;
}

/** Goes through the child elements of one element; comments and blanks between are passed over. */
class ChildCursor
{
public:
    explicit ChildCursor(const ElementNode& parent)
        : _parent(parent)
        , _node(parent.GetFirstChild())
    {
        SkipInsignificant();
    }

    /** The child element that is next in line; null at the end. */
    const ElementNode* Get() const noexcept { return AsElement(_node); }

    bool IsAt(std::string_view localName) const noexcept
    {
        return _node != nullptr && Get()->HasQName(localName, DsNamespace);
    }

    const ElementNode& Take(std::string_view localName)
    {
        if (!IsAt(localName)) {
            Fail(
                "Expected element " + Quote(localName) + " in " + Quote(_parent.GetLocalName())
                + ", found " + DescribeNext());
        }
        const ElementNode& element = *Get();
        Advance();
        return element;
    }

    void Advance()
    {
        _node = _node->GetNextSibling();
        SkipInsignificant();
    }

    void RequireEnd() const
    {
        if (_node != nullptr) {
            Fail("Unexpected " + DescribeNext() + " in " + Quote(_parent.GetLocalName()));
        }
    }

private:
    void SkipInsignificant()
    {
        while (_node != nullptr
               && (_node->GetNodeType() == NodeType::COMMENT || IsBlankText(*_node))) {
            _node = _node->GetNextSibling();
        }
        if (_node != nullptr && Get() == nullptr) {
            Fail(
                std::string("Unexpected ") + ToString(_node->GetNodeType()) + " in "
                + Quote(_parent.GetLocalName()));
        }
    }

    std::string DescribeNext() const
    {
        return _node == nullptr ? "nothing" : Quote(Get()->GetName());
    }

    const ElementNode& _parent;
    const Node* _node;
};

std::string_view RequireAttribute(const ElementNode& element, std::string_view name)
{
    const Attribute* attribute = element.FindAttribute(name);
    if (attribute == nullptr) {
        Fail(Quote(element.GetLocalName()) + " has no attribute " + Quote(name));
    }
    return attribute->value;
}

/** The bytes of an element whose whole content is one text: a comment inside is refused. */
std::vector<unsigned char> ReadBase64(const ElementNode& element)
{
    const TextNode* text = AsText(element.GetFirstChild());
    if (text == nullptr || text->GetNextSibling() != nullptr) {
        Fail(Quote(element.GetLocalName()) + " must hold text and nothing else");
    }
    std::vector<unsigned char> bytes;
    try {
        StringUtil::Base64Decode(text->GetText(), bytes);
    } catch (const Base64FormatException& error) {
        Fail(Quote(element.GetLocalName()) + " is not Base64: " + error.what());
    }
    return bytes;
}

/**
 * [EXC-C14N 4]: `InclusiveNamespaces` carries a list and nothing else. Whatever stands in
 * SignedInfo is canonicalized before the signature value is known to be genuine, so nothing may
 * stand in it unread.
 */
const Attribute* ReadPrefixList(const ElementNode& element)
{
    RequireAttribute(element, "PrefixList");
    if (element.GetFirstChild() != nullptr) {
        Fail("'InclusiveNamespaces' must be empty");
    }
    for (const Attribute& attribute : element.GetAttributes()) {
        if (attribute.name != "PrefixList" && !attribute.IsNamespaceDeclaration()) {
            Fail("Unexpected attribute " + Quote(attribute.name) + " on 'InclusiveNamespaces'");
        }
    }
    return element.FindAttribute("PrefixList");
}

AlgorithmUse ReadAlgorithm(const ElementNode& element)
{
    AlgorithmUse use;
    use.identifier = RequireAttribute(element, "Algorithm");
    for (ChildCursor child(element); child.Get() != nullptr; child.Advance()) {
        if (use.prefixList == nullptr
            && child.Get()->HasQName("InclusiveNamespaces", ExclusiveC14n)) {
            use.prefixList = ReadPrefixList(*child.Get());
        } else {
            use.foreignChild = child.Get()->GetName();
        }
    }
    return use;
}

std::vector<AlgorithmUse> ReadTransforms(const ElementNode& transforms)
{
    std::vector<AlgorithmUse> uses;
    ChildCursor child(transforms);
    do {
        uses.push_back(ReadAlgorithm(child.Take("Transform")));
    } while (child.Get() != nullptr);
    return uses;
}

ReferenceModel ReadReference(const ElementNode& element)
{
    ReferenceModel reference;
    reference.uri = RequireAttribute(element, "URI");
    ChildCursor child(element);
    if (child.IsAt("Transforms")) {
        reference.transforms = ReadTransforms(child.Take("Transforms"));
    }
    reference.digestMethod = ReadAlgorithm(child.Take("DigestMethod"));
    reference.digestValue = ReadBase64(child.Take("DigestValue"));
    child.RequireEnd();
    return reference;
}

void ReadSignedInfo(const ElementNode& element, SignatureModel& model)
{
    model.signedInfo = &element;
    ChildCursor child(element);
    model.canonicalization = ReadAlgorithm(child.Take("CanonicalizationMethod"));
    model.signatureMethod = ReadAlgorithm(child.Take("SignatureMethod"));
    while (child.Get() != nullptr) {
        model.references.push_back(ReadReference(child.Take("Reference")));
    }
}

/** Whether `element` may stand where a schema says `##other`: in a namespace, and not in ours. */
bool IsForeign(const ElementNode& element) noexcept
{
    std::string_view namespaceUri;
    return element.LookupNamespace(element.GetPrefix(), namespaceUri) && !namespaceUri.empty()
           && namespaceUri != DsNamespace;
}

/** Refuses an element that the schema does not have among the children of `parent`. */
template <std::size_t Count>
void RequireAllowed(
    const ElementNode& element,
    const ElementNode& parent,
    const std::array<std::string_view, Count>& names)
{
    const bool isNamed = std::any_of(names.begin(), names.end(), [&](std::string_view name) {
        return element.HasQName(name, DsNamespace);
    });
    if (!isNamed && !IsForeign(element)) {
        Fail("Unexpected " + Quote(element.GetName()) + " in " + Quote(parent.GetLocalName()));
    }
}

// [XMLDSIG 4.4.4]
constexpr std::array<std::string_view, 5> X509DataContent{
    "X509IssuerSerial", "X509SKI", "X509SubjectName", "X509Certificate", "X509CRL"};

void ReadX509Data(const ElementNode& element, KeyInfo& keyInfo)
{
    for (ChildCursor child(element); child.Get() != nullptr; child.Advance()) {
        RequireAllowed(*child.Get(), element, X509DataContent);
        if (child.IsAt("X509Certificate")) {
            keyInfo.certificates.push_back(ReadBase64(*child.Get()));
        }
    }
}

// [XMLDSIG 4.4]
constexpr std::array<std::string_view, 7> KeyInfoContent{
    "KeyName", "KeyValue", "RetrievalMethod", "X509Data", "PGPData", "SPKIData", "MgmtData"};

/** Gathers the certificates; whatever else a key information may hold picks no trusted key. */
KeyInfo ReadKeyInfo(const ElementNode& element)
{
    KeyInfo keyInfo;
    for (ChildCursor data(element); data.Get() != nullptr; data.Advance()) {
        RequireAllowed(*data.Get(), element, KeyInfoContent);
        if (data.IsAt("X509Data")) {
            ReadX509Data(*data.Get(), keyInfo);
        }
    }
    return keyInfo;
}

/**
 * Refuses names whose prefix nothing declares. Counts the declarations in scope: a look-up in the
 * tree would go through all ancestors for each of the names.
 */
class PrefixCheck
{
public:
    /** @param outer  the element around those that are walked through; null if there is none. */
    explicit PrefixCheck(const ElementNode* outer)
    {
        for (; outer != nullptr; outer = outer->GetParent()) {
            Open(*outer);
        }
    }

    void Enter(const ElementNode& element)
    {
        Open(element);
        RequireDeclared(element, element.GetPrefix());
        for (const Attribute& attribute : element.GetAttributes()) {
            if (!attribute.IsNamespaceDeclaration()) {
                RequireDeclared(element, attribute.GetPrefix());
            }
        }
    }
    void Leave(const ElementNode& element)
    {
        for (const Attribute& attribute : element.GetAttributes()) {
            if (attribute.IsNamespaceDeclaration()) {
                Close(GetDeclaredPrefix(attribute));
            }
        }
    }
    template <class Leaf>
    void Visit(const Leaf& /*leaf*/) const noexcept
    {}

private:
    static std::string_view GetDeclaredPrefix(const Attribute& declaration) noexcept
    {
        return declaration.GetPrefix().empty() ? std::string_view() : declaration.GetLocalName();
    }

    void Open(const ElementNode& element)
    {
        for (const Attribute& attribute : element.GetAttributes()) {
            if (attribute.IsNamespaceDeclaration()) {
                ++_declarations[GetDeclaredPrefix(attribute)];
            }
        }
    }

    void Close(std::string_view prefix)
    {
        const auto found = _declarations.find(prefix);
        if (--found->second == 0) {
            _declarations.erase(found);
        }
    }

    void RequireDeclared(const ElementNode& element, std::string_view prefix) const
    {
        if (!prefix.empty() && _declarations.count(prefix) == 0) {
            Fail(Quote(element.GetName()) + " uses the undeclared prefix " + Quote(prefix));
        }
    }

    std::map<std::string_view, std::size_t> _declarations{{"xml", 1}}; // [XML Names 3]
};

/**
 * Verifying canonicalizes what the signature signs and SignedInfo, which refuses an undeclared
 * prefix. The rest of the signature is not canonicalized, so it is looked through here.
 */
void RequireDeclaredPrefixes(const ElementNode& signature, const ElementNode& signedInfo)
{
    PrefixCheck check(signature.GetParent());
    WalkTree(signature, &signedInfo, check);
}

} // namespace

SignatureSyntaxException::~SignatureSyntaxException() = default;

SignatureModel ReadSignature(const ElementNode& signature)
{
    if (!signature.HasQName("Signature", DsNamespace)) {
        Fail("Expected element 'Signature', found " + Quote(signature.GetName()));
    }
    SignatureModel model;
    ChildCursor child(signature);
    ReadSignedInfo(child.Take("SignedInfo"), model);
    model.signatureValue = ReadBase64(child.Take("SignatureValue"));
    if (child.IsAt("KeyInfo")) {
        model.keyInfo = ReadKeyInfo(child.Take("KeyInfo"));
    }
    child.RequireEnd();
    RequireDeclaredPrefixes(signature, *model.signedInfo);
    return model;
}

} // namespace Quillon::Xml::Security
