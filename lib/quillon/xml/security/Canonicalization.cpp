#include "xml/security/Canonicalization.h"
#include "core/quote.h"

#include "quillon/xml/security/Canonicalizer.h"
#include "quillon/xml/security/Identifiers.h"
#include "xml/security/PrefixTable.h"
#include "xml/treeWalk.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <memory_resource>
#include <tuple>

namespace Quillon::Xml::Security {

namespace {

/** A declaration to be written; the empty prefix is the default namespace. */
struct Binding
{
    std::string_view prefix;
    std::string_view uri;
};

/** An attribute with its sort key. */
struct SortedAttribute
{
    std::string_view uri;
    std::string_view localName;
    const Attribute* attribute;
};

/** The prefix that a declaration declares. */
std::string_view GetDeclaredPrefix(const Attribute& declaration) noexcept
{
    return declaration.name.size() == 5 ? std::string_view() : declaration.name.substr(6);
}

bool IsLetter(char byte) noexcept
{
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z');
}

/** Whether `uri` starts with a scheme [RFC 3986 3.1]. */
bool IsAbsolute(std::string_view uri) noexcept
{
    const std::size_t colon = uri.find(':');
    return colon != std::string_view::npos && IsLetter(uri.front())
           && std::all_of(
               uri.begin(), uri.begin() + static_cast<std::ptrdiff_t>(colon), [](char byte) {
                   return IsLetter(byte) || (byte >= '0' && byte <= '9') || byte == '+'
                          || byte == '-' || byte == '.';
               });
}

/** Whether the element is empty or holds one text and nothing else. */
bool IsLeaf(const ElementNode& element) noexcept
{
    const Node* child = element.GetFirstChild();
    return child == nullptr || (AsText(child) != nullptr && child->GetNextSibling() == nullptr);
}

bool HaveSameTag(const ElementNode& a, const ElementNode& b) noexcept
{
    const AttributeRange ofA = a.GetAttributes();
    const AttributeRange ofB = b.GetAttributes();
    return a.GetName() == b.GetName()
           && std::equal(
               ofA.begin(),
               ofA.end(),
               ofB.begin(),
               ofB.end(),
               [](const Attribute& x, const Attribute& y) {
                   return x.name == y.name && x.value == y.value;
               });
}

/** Writes the nodes of one walk in canonical form. */
class CanonicalVisitor
{
public:
    // The memory is left as it is: what is taken of it is written first.
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init)
    CanonicalVisitor(
        const CanonicalizationMethod& method, const ElementNode& apex, OutputBuffer& out)
        : _method(method)
        , _apex(apex)
        , _out(out)
    {
        _marks.reserve(UsualDepth);
        _attributes.reserve(UsualAttributes);
        _namespaces.reserve(UsualAttributes);
        EnterAncestors(apex.GetParent());
    }

    void Enter(const ElementNode& element)
    {
        _marks.push_back(_prefixes.GetMark());
        if (RepeatsLastLeaf(element)) {
            _out.Append(_leafTag);
            return;
        }
        const std::size_t start = _out.GetPosition();
        WriteStartTag(element);
        _lastLeaf = IsLeaf(element) && _out.ReadBack(start, _leafTag) ? &element : nullptr;
    }

    void Leave(const ElementNode& element)
    {
        _out.AppendEndTag(element.GetName());
        _prefixes.Restore(_marks.back());
        _marks.pop_back();
    }

    void Visit(const TextNode& text) { AppendText(_out, text.GetText()); }
    void Visit(const CommentNode& /*comment*/) {}
    void Visit(const ProcessingInstructionNode& instruction)
    {
        AppendProcessingInstruction(_out, instruction);
    }

private:
    /**
     * Whether the start tag is that of the last leaf, a sibling: as for the thousand values of one
     * attribute. The prefixes are in the state in which that leaf was entered, because a leaf
     * holds no element that could use what it renders.
     */
    bool RepeatsLastLeaf(const ElementNode& element) const noexcept
    {
        return _lastLeaf != nullptr && element.GetParent() == _lastLeaf->GetParent()
               && IsLeaf(element)
               && (element.RepeatsTagOf(*_lastLeaf) || HaveSameTag(element, *_lastLeaf));
    }

    void WriteStartTag(const ElementNode& element)
    {
        DeclareNamespaces(element);
        _out.Append('<');
        _out.Append(element.GetName());
        _namespaces.clear();
        CollectNamespaces(element);
        CollectAttributes(element);
        WriteNamespaces();
        WriteAttributes();
        _out.Append('>');
    }

    /** Brings the declarations of the apex's ancestors into scope, outermost first. */
    void EnterAncestors(const ElementNode* nearest)
    {
        std::pmr::vector<const ElementNode*> ancestors(&_pool);
        for (const ElementNode* element = nearest; element != nullptr;
             element = element->GetParent()) {
            ancestors.push_back(element);
        }
        for (auto element = ancestors.rbegin(); element != ancestors.rend(); ++element) {
            DeclareNamespaces(**element);
        }
    }

    void DeclareNamespaces(const ElementNode& element)
    {
        if (!element.DeclaresNamespaces()) {
            return;
        }
        for (const Attribute& attribute : element.GetAttributes()) {
            if (!attribute.IsNamespaceDeclaration() || attribute.name == "xmlns:xml") {
                continue;
            }
            // [C14N 1.3]: what a relative URI names depends on where the document lies.
            if (!attribute.value.empty() && !IsAbsolute(attribute.value)) {
                throw XmlSecurityException(
                    "The namespace URI " + Quote(attribute.value) + " is relative");
            }
            _prefixes.Bind(GetDeclaredPrefix(attribute), attribute.value);
            if (!_method.isExclusive) {
                _declared.push_back(GetDeclaredPrefix(attribute));
            }
        }
    }

    /** The state of a prefix that a name uses, which must be bound. */
    PrefixState& RequireBound(std::string_view prefix, const ElementNode& element)
    {
        PrefixState* state = _prefixes.Find(prefix);
        if (state == nullptr || state->inScope.empty()) {
            throw XmlSecurityException(
                "Element " + Quote(element.GetName()) + " uses the undeclared prefix "
                + Quote(prefix));
        }
        return *state;
    }

    void CollectAttributes(const ElementNode& element)
    {
        _attributes.clear();
        for (const Attribute& attribute : element.GetAttributes()) {
            if (!element.DeclaresNamespaces() || !attribute.IsNamespaceDeclaration()) {
                AddAttribute(attribute, element);
            }
        }
        if (!_method.isExclusive && &element == &_apex) {
            InheritXmlAttributes();
        }
        // [C14N 2.2]: by namespace, then by local name; those in no namespace first.
        if (_attributes.size() > 1) {
            std::sort(
                _attributes.begin(),
                _attributes.end(),
                [](const SortedAttribute& a, const SortedAttribute& b) {
                    return std::tie(a.uri, a.localName) < std::tie(b.uri, b.localName);
                });
        }
    }

    void AddAttribute(const Attribute& attribute, const ElementNode& element)
    {
        const std::string_view prefix = attribute.GetPrefix();
        if (prefix.empty()) {
            _attributes.push_back(SortedAttribute{{}, attribute.name, &attribute});
            return;
        }
        std::string_view uri = XmlNamespace;
        if (prefix != "xml") {
            PrefixState& state = RequireBound(prefix, element);
            uri = state.inScope;
            if (_method.isExclusive) {
                Render(state);
            }
        }
        _attributes.push_back(
            SortedAttribute{uri, attribute.name.substr(prefix.size() + 1), &attribute});
    }

    /** [C14N 2.4]: the apex of a subset takes on the `xml:` attributes of its ancestors. */
    void InheritXmlAttributes()
    {
        for (const ElementNode* ancestor = _apex.GetParent(); ancestor != nullptr;
             ancestor = ancestor->GetParent()) {
            InheritXmlAttributesOf(*ancestor);
        }
    }

    void InheritXmlAttributesOf(const ElementNode& ancestor)
    {
        for (const Attribute& attribute : ancestor.GetAttributes()) {
            if (attribute.GetPrefix() == "xml" && !HasAttribute(attribute.name)) {
                AddAttribute(attribute, ancestor);
            }
        }
    }

    bool HasAttribute(std::string_view name) const noexcept
    {
        return std::any_of(
            _attributes.begin(), _attributes.end(), [name](const SortedAttribute& sorted) {
                return sorted.attribute->name == name;
            });
    }

    /**
     * Gathers the declarations that this element's canonical form carries, but for those that
     * only its attributes utilize.
     */
    void CollectNamespaces(const ElementNode& element)
    {
        const std::string_view prefix = element.GetPrefix();
        // Looked up in both forms: an undeclared prefix must fail in both.
        PrefixState* state = prefix.empty()    ? _prefixes.Find(prefix)
                             : prefix == "xml" ? nullptr
                                               : &RequireBound(prefix, element);
        if (!_method.isExclusive) {
            CollectInclusive();
            return;
        }
        // [EXC-C14N 3]: the prefixes that the element visibly utilizes, and those on the list.
        if (state != nullptr) {
            Render(*state);
        }
        // Where nothing is declared, the parent has rendered the listed ones as they are.
        if (_marks.size() == 1 || element.DeclaresNamespaces()) {
            for (const std::string& listed : _method.inclusivePrefixes) {
                RenderIfKnown(listed);
            }
        }
    }

    /**
     * [C14N 2.3]: every namespace in scope that the output ancestor does not render the same.
     * Below the apex, only what the element itself declares can differ.
     */
    void CollectInclusive()
    {
        if (_marks.size() == 1) {
            for (PrefixState& state : _prefixes.GetAll()) {
                Render(state);
            }
        } else {
            for (const std::string_view prefix : _declared) {
                RenderIfKnown(prefix);
            }
        }
        _declared.clear();
    }

    void RenderIfKnown(std::string_view prefix)
    {
        if (PrefixState* state = _prefixes.Find(prefix)) {
            Render(*state);
        }
    }

    /** Renders a binding in scope, unless an output ancestor rendered the same. */
    void Render(PrefixState& state)
    {
        // Only the default namespace can be undeclared [XML Names 6.2].
        if (state.inScope == state.rendered || (state.inScope.empty() && !state.prefix.empty())) {
            return;
        }
        _namespaces.push_back(Binding{state.prefix, state.inScope});
        _prefixes.SetRendered(state);
    }

    void WriteNamespaces()
    {
        if (_namespaces.size() > 1) {
            std::sort(
                _namespaces.begin(), _namespaces.end(), [](const Binding& a, const Binding& b) {
                    return a.prefix < b.prefix;
                });
        }
        for (const Binding& binding : _namespaces) {
            _out.Append(" xmlns");
            if (!binding.prefix.empty()) {
                _out.Append(':');
                _out.Append(binding.prefix);
            }
            WriteValue(binding.uri);
        }
    }

    void WriteAttributes()
    {
        for (const SortedAttribute& sorted : _attributes) {
            _out.Append(' ');
            _out.Append(sorted.attribute->name);
            WriteValue(sorted.attribute->value);
        }
    }

    void WriteValue(std::string_view value)
    {
        _out.Append("=\"");
        AppendAttributeValue(_out, value);
        _out.Append('"');
    }

    const CanonicalizationMethod& _method;
    const ElementNode& _apex;
    OutputBuffer& _out;

    // What most documents need of memory is at hand.
    static constexpr std::size_t UsualDepth = 16;
    static constexpr std::size_t UsualAttributes = 8;
    std::array<std::byte, 3072> _memory;
    std::pmr::monotonic_buffer_resource _pool{_memory.data(), _memory.size()};

    PrefixTable _prefixes{_pool};
    std::pmr::vector<std::size_t> _marks{&_pool};
    const ElementNode* _lastLeaf = nullptr;
    std::string _leafTag;
    // Of the element being written; kept to be used again.
    std::pmr::vector<std::string_view> _declared{&_pool};
    std::pmr::vector<SortedAttribute> _attributes{&_pool};
    std::pmr::vector<Binding> _namespaces{&_pool};
};

class CanonicalizerImpl final : public Canonicalizer
{
public:
    explicit CanonicalizerImpl(CanonicalizationMethod method)
        : _method(std::move(method))
    {}

    void Canonicalize(const ElementNode* element, Writer* writer) const override
    {
        WriterSink sink(*writer);
        OutputBuffer out(sink);
        Security::Canonicalize(_method, *element, nullptr, out);
        out.Flush();
    }

    void Canonicalize(const Document* document, Writer* writer) const override
    {
        WriterSink sink(*writer);
        OutputBuffer out(sink);
        CanonicalizeDocument(_method, document->GetFirstChild(), nullptr, out);
        out.Flush();
    }

private:
    CanonicalizationMethod _method;
};

} // namespace

XmlSecurityException::~XmlSecurityException() = default;

std::vector<std::string> ParsePrefixList(std::string_view list)
{
    constexpr std::string_view Blanks = "\t\n\r ";
    std::vector<std::string> prefixes;
    std::size_t start = list.find_first_not_of(Blanks);
    while (start != std::string_view::npos) {
        const std::size_t end = std::min(list.find_first_of(Blanks, start), list.size());
        const std::string_view written = list.substr(start, end - start);
        const std::string_view prefix = written == "#default" ? std::string_view() : written;
        if (std::find(prefixes.begin(), prefixes.end(), prefix) == prefixes.end()) {
            prefixes.emplace_back(prefix);
        }
        if (prefixes.size() > MaxListedPrefixes) {
            throw XmlSecurityException(
                "More than " + std::to_string(MaxListedPrefixes) + " prefixes in a PrefixList");
        }
        start = list.find_first_not_of(Blanks, end);
    }
    return prefixes;
}

void Canonicalize(
    const CanonicalizationMethod& method,
    const ElementNode& apex,
    const Node* excluded,
    OutputBuffer& out)
{
    CanonicalVisitor visitor(method, apex, out);
    WalkTree(apex, excluded, visitor);
}

void CanonicalizeDocument(
    const CanonicalizationMethod& method,
    const Node* first,
    const Node* excluded,
    OutputBuffer& out)
{
    bool isAfterRoot = false;
    for (const Node* node = first; node != nullptr; node = node->GetNextSibling()) {
        if (const ElementNode* root = AsElement(node)) {
            Canonicalize(method, *root, excluded, out);
            isAfterRoot = true;
        } else if (node->GetNodeType() == NodeType::PROCESSING_INSTRUCTION) {
            // [C14N 2.1]: a line feed between the root and what stands beside it.
            out.Append(isAfterRoot ? "\n" : "");
            AppendProcessingInstruction(out, static_cast<const ProcessingInstructionNode&>(*node));
            out.Append(isAfterRoot ? "" : "\n");
        }
    }
}

Ref<Canonicalizer> CreateCanonicalizer(
    const std::string& identifier, const std::vector<std::string>& inclusivePrefixes)
{
    CanonicalizationMethod method;
    method.isExclusive = identifier == ExclusiveC14n;
    if (!method.isExclusive && identifier != InclusiveC14n
        && identifier != std::string(InclusiveC14n) + "#") {
        throw XmlSecurityException("Canonicalization " + Quote(identifier) + " is not supported");
    }
    for (const std::string& prefix : inclusivePrefixes) {
        method.inclusivePrefixes.push_back(prefix == "#default" ? std::string() : prefix);
    }
    return Ref<Canonicalizer>(new CanonicalizerImpl(std::move(method)));
}

} // namespace Quillon::Xml::Security
