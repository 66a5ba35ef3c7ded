#include "xml/security/Canonicalization.h"

#include "quillon/xml/security/Canonicalizer.h"
#include "quillon/xml/security/Identifiers.h"
#include "xml/TreeWalk.h"

#include <algorithm>
#include <tuple>

namespace Quillon::Xml::Security {

namespace {

constexpr std::string_view XmlNamespace = "http://www.w3.org/XML/1998/namespace";

/** A namespace declaration; the empty prefix is the default namespace. */
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

/** The namespaces in force at some point of a walk, innermost last. */
class BindingStack
{
public:
    void Push(const Binding& binding) { _bindings.push_back(binding); }
    std::size_t GetSize() const noexcept { return _bindings.size(); }
    void Shrink(std::size_t size) { _bindings.resize(size); }

    const Binding* Find(std::string_view prefix) const noexcept
    {
        const auto found =
            std::find_if(_bindings.rbegin(), _bindings.rend(), [prefix](const Binding& binding) {
                return binding.prefix == prefix;
            });
        return found == _bindings.rend() ? nullptr : &*found;
    }

    /** The URI that `prefix` is bound to; empty if to none. */
    std::string_view GetUri(std::string_view prefix) const noexcept
    {
        const Binding* binding = Find(prefix);
        return binding == nullptr ? std::string_view() : binding->uri;
    }

    const std::vector<Binding>& GetAll() const noexcept { return _bindings; }

private:
    std::vector<Binding> _bindings;
};

/** Writes the nodes of one walk in canonical form. */
class CanonicalVisitor
{
public:
    CanonicalVisitor(
        const CanonicalizationMethod& method, const ElementNode& apex, OutputBuffer& out)
        : _method(method)
        , _apex(apex)
        , _out(out)
    {
        EnterAncestors(apex.GetParent());
    }

    void Enter(const ElementNode& element)
    {
        _frames.push_back(Frame{_inScope.GetSize(), _rendered.GetSize()});
        DeclareNamespaces(element);
        _out.Append('<');
        _out.Append(element.GetName());
        CollectAttributes(element);
        CollectNamespaces(element);
        WriteNamespaces();
        WriteAttributes();
        _out.Append('>');
    }

    void Leave(const ElementNode& element)
    {
        _out.Append("</");
        _out.Append(element.GetName());
        _out.Append('>');
        _inScope.Shrink(_frames.back().inScope);
        _rendered.Shrink(_frames.back().rendered);
        _frames.pop_back();
    }

    void Visit(const TextNode& text) { AppendText(_out, text.GetText()); }
    void Visit(const CommentNode& /*comment*/) {}
    void Visit(const ProcessingInstructionNode& instruction)
    {
        AppendProcessingInstruction(_out, instruction);
    }

private:
    struct Frame
    {
        std::size_t inScope;
        std::size_t rendered;
    };

    /** Brings the declarations of the apex's ancestors into scope, outermost first. */
    void EnterAncestors(const ElementNode* nearest)
    {
        std::vector<const ElementNode*> ancestors;
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
        for (const Attribute& attribute : element.GetAttributes()) {
            if (!attribute.IsNamespaceDeclaration() || attribute.name == "xmlns:xml") {
                continue;
            }
            // [C14N 1.3]: what a relative URI names depends on where the document lies.
            if (!attribute.value.empty() && !IsAbsolute(attribute.value)) {
                throw XmlSecurityException(
                    "The namespace URI '" + std::string(attribute.value) + "' is relative");
            }
            _inScope.Push(Binding{GetDeclaredPrefix(attribute), attribute.value});
        }
    }

    std::string_view RequireUri(std::string_view prefix, const ElementNode& element) const
    {
        if (prefix == "xml") {
            return XmlNamespace;
        }
        const Binding* binding = _inScope.Find(prefix);
        if (binding == nullptr || binding->uri.empty()) {
            throw XmlSecurityException(
                "Element '" + std::string(element.GetName()) + "' uses the undeclared prefix '"
                + std::string(prefix) + "'");
        }
        return binding->uri;
    }

    void CollectAttributes(const ElementNode& element)
    {
        _attributes.clear();
        for (const Attribute& attribute : element.GetAttributes()) {
            if (!attribute.IsNamespaceDeclaration()) {
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
        _attributes.push_back(
            prefix.empty() ? SortedAttribute{{}, attribute.name, &attribute}
                           : SortedAttribute{
                               RequireUri(prefix, element),
                               attribute.name.substr(prefix.size() + 1),
                               &attribute});
    }

    /** [C14N 2.4]: the apex of a subset takes on the `xml:` attributes of its ancestors. */
    void InheritXmlAttributes()
    {
        for (const ElementNode* ancestor = _apex.GetParent(); ancestor != nullptr;
             ancestor = ancestor->GetParent()) {
            for (const Attribute& attribute : ancestor->GetAttributes()) {
                if (attribute.GetPrefix() == "xml" && !HasAttribute(attribute.name)) {
                    AddAttribute(attribute, *ancestor);
                }
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

    /** Gathers the declarations that this element's canonical form carries. */
    void CollectNamespaces(const ElementNode& element)
    {
        _namespaces.clear();
        // Looked up in both forms: an undeclared prefix must fail in both.
        const std::string_view prefix = element.GetPrefix();
        if (!prefix.empty()) {
            RequireUri(prefix, element);
        }
        if (!_method.isExclusive) {
            CollectInclusive();
        } else {
            CollectExclusive(prefix);
        }
        if (_namespaces.size() > 1) {
            std::sort(
                _namespaces.begin(), _namespaces.end(), [](const Binding& a, const Binding& b) {
                    return a.prefix < b.prefix;
                });
        }
    }

    /** [C14N 2.3]: every namespace in scope that the output ancestor does not render the same. */
    void CollectInclusive()
    {
        const std::vector<Binding>& all = _inScope.GetAll();
        // Below the apex, what was in scope before this element has been rendered already.
        const std::size_t first = _frames.size() == 1 ? 0 : _frames.back().inScope;
        for (std::size_t i = all.size(); i > first; --i) {
            Render(all[i - 1].prefix);
        }
    }

    /** [EXC-C14N 3]: the prefixes that this element visibly utilizes, and those on the list. */
    void CollectExclusive(std::string_view elementPrefix)
    {
        Render(elementPrefix);
        for (const SortedAttribute& sorted : _attributes) {
            if (!sorted.uri.empty()) {
                Render(sorted.attribute->GetPrefix());
            }
        }
        for (const std::string& prefix : _method.inclusivePrefixes) {
            Render(prefix);
        }
    }

    /** Renders the binding of `prefix` in scope, unless an output ancestor rendered the same. */
    void Render(std::string_view prefix)
    {
        const std::string_view uri = _inScope.GetUri(prefix);
        if (prefix == "xml" || uri == _rendered.GetUri(prefix)) {
            return;
        }
        // Only the default namespace can be undeclared [XML Names 6.2].
        if (uri.empty() && !prefix.empty()) {
            return;
        }
        _namespaces.push_back(Binding{prefix, uri});
        _rendered.Push(_namespaces.back());
    }

    void WriteNamespaces()
    {
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
    BindingStack _inScope;
    BindingStack _rendered;
    std::vector<Frame> _frames;
    // Of the element being written; kept to be used again.
    std::vector<SortedAttribute> _attributes;
    std::vector<Binding> _namespaces;
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
        const std::string_view prefix = list.substr(start, end - start);
        prefixes.emplace_back(prefix == "#default" ? std::string_view() : prefix);
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
        throw XmlSecurityException("Canonicalization '" + identifier + "' is not supported");
    }
    for (const std::string& prefix : inclusivePrefixes) {
        method.inclusivePrefixes.push_back(prefix == "#default" ? std::string() : prefix);
    }
    return Ref<Canonicalizer>(new CanonicalizerImpl(std::move(method)));
}

} // namespace Quillon::Xml::Security
