#include "RandomDocument.h"

#include <algorithm>
#include <array>
#include <set>

namespace Quillon::Xml {

namespace {

constexpr std::array<const char*, 5> Prefixes{"a", "b", "c", "ns-1", "zz"};
// None needs an escape: the peer writes namespace URIs without one [C14N 2.3 asks for it].
constexpr std::array<const char*, 5> Uris{
    "urn:one", "urn:two", "http://example.org/?a=1;b=2", "http://example.org/x%20y", "urn:a'b"};
constexpr std::array<const char*, 6> LocalNames{"e", "E", "item", "_x", "long.name-1", "\xC3\xA9t"};
constexpr std::array<const char*, 12> Texts{
    "plain",
    " ",
    "\n\t",
    "&amp;&lt;&gt;",
    "a > b",
    "&#13;",
    "<![CDATA[<raw> & ]]>",
    "\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80",
    "&#x41;&#xe9;",
    "\"quoted'",
    "&#9;&#10;",
    "<![CDATA[]]>"};
constexpr std::array<const char*, 8> Values{
    "v",
    "",
    "&amp;&lt;&gt;",
    "&quot;'",
    "&#9;&#10;&#13;",
    "two  blanks",
    "line\nfeed\ttab",
    "\xE2\x82\xAC&#x20ac;"};

} // namespace

std::string RandomDocument::Make()
{
    _text.clear();
    _scope.clear();
    _text += Chance(30) ? "<?xml version='1.0' encoding='UTF-8'?>\n" : "";
    _text += Chance(20) ? "<!-- before --><?pi before?>\n" : "";
    AddElement(0);
    _text += Chance(20) ? "\n<?pi?><!-- after --><?last one ?>" : "";
    return _text;
}

std::string RandomDocument::Lookup(const std::string& prefix) const
{
    const auto found =
        std::find_if(_scope.rbegin(), _scope.rend(), [&prefix](const Binding& binding) {
            return binding.prefix == prefix;
        });
    return found == _scope.rend() ? std::string() : found->uri;
}

void RandomDocument::AddElement(unsigned depth)
{
    const std::size_t outerScope = _scope.size();
    std::vector<std::string> declared;
    const std::string declarations = MakeDeclarations(declared);
    const std::string prefix = PickPrefix(false);
    const std::string name =
        (prefix.empty() ? "" : prefix + ":") + LocalNames[Pick(LocalNames.size())];
    const std::string attributes = MakeAttributes();
    _text += "<" + name + (Chance(50) ? declarations + attributes : attributes + declarations);
    if (Chance(15)) {
        _text += "/>";
    } else {
        _text += Chance(20) ? " >" : ">";
        AddContent(depth);
        _text += "</" + name + ">";
    }
    _scope.resize(outerScope);
}

void RandomDocument::AddRepeatedTags(unsigned depth)
{
    const std::size_t outerScope = _scope.size();
    std::vector<std::string> declared;
    const std::string declarations = Chance(50) ? MakeDeclarations(declared) : "";
    const std::string prefix = PickPrefix(false);
    const std::string name =
        (prefix.empty() ? "" : prefix + ":") + LocalNames[Pick(LocalNames.size())];
    const std::string tag = name + declarations + MakeAttributes();
    for (unsigned i = 2 + Pick(3); i > 0; --i) {
        _text += "<" + tag + ">" + MakeText();
        if (Chance(30)) {
            AddElement(depth + 1);
        }
        _text += "</" + name + ">" + (Chance(30) ? "\n" : "");
    }
    _scope.resize(outerScope);
}

std::string RandomDocument::MakeDeclarations(std::vector<std::string>& declared)
{
    std::string text;
    for (unsigned i = Pick(4); i > 0; --i) {
        const std::string prefix = Chance(35) ? "" : Prefixes[Pick(Prefixes.size())];
        if (std::find(declared.begin(), declared.end(), prefix) != declared.end()) {
            continue;
        }
        declared.push_back(prefix);
        const std::string uri = prefix.empty() && Chance(35) ? "" : Uris[Pick(Uris.size())];
        _scope.push_back(Binding{prefix, uri});
        const char quote = uri.find('\'') != std::string::npos || Chance(50) ? '"' : '\'';
        text += Chance(20) ? "\n  " : " ";
        text += prefix.empty() ? "xmlns" : "xmlns:" + prefix;
        text += "=";
        text += quote + uri + quote;
    }
    return text;
}

std::string RandomDocument::PickPrefix(bool forAttribute)
{
    std::vector<std::string> usable{""};
    for (const char* prefix : Prefixes) {
        if (!Lookup(prefix).empty()) {
            usable.emplace_back(prefix);
        }
    }
    if (forAttribute && Chance(15)) {
        return "xml";
    }
    return usable[Pick(static_cast<unsigned>(usable.size()))];
}

std::string RandomDocument::MakeAttributes()
{
    std::string text;
    std::set<std::pair<std::string, std::string>> used;
    for (unsigned i = Pick(5); i > 0; --i) {
        const std::string prefix = PickPrefix(true);
        const std::string localName =
            prefix == "xml" ? (Chance(50) ? "lang" : "base") : LocalNames[Pick(LocalNames.size())];
        const std::string uri = prefix.empty() ? "" : prefix == "xml" ? "xml" : Lookup(prefix);
        if (used.emplace(uri, localName).second) {
            text += " " + (prefix.empty() ? "" : prefix + ":") + localName + "=\""
                    + (prefix == "xml" ? "en" : MakeAttributeValue()) + "\"";
        }
    }
    return text;
}

std::string RandomDocument::MakeAttributeValue()
{
    std::string value;
    for (unsigned i = Pick(3); i > 0; --i) {
        value += Values[Pick(Values.size())];
    }
    return value;
}

std::string RandomDocument::MakeText()
{
    std::string text;
    for (unsigned i = Pick(3); i > 0; --i) {
        text += Texts[Pick(Texts.size())];
    }
    return text;
}

void RandomDocument::AddContent(unsigned depth)
{
    for (unsigned i = Pick(5); i > 0; --i) {
        _text += MakeText();
        if (Chance(15)) {
            _text += "<!-- no & markup -->";
        } else if (Chance(10)) {
            _text += "<?target some  data?>";
        } else if (depth < 5 && Chance(15)) {
            AddRepeatedTags(depth + 1);
        } else if (depth < 5) {
            AddElement(depth + 1);
        }
    }
    _text += MakeText();
}

} // namespace Quillon::Xml
