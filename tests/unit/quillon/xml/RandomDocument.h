#pragma once

#include <random>
#include <string>
#include <vector>

namespace Quillon::Xml {

/**
 * Makes namespace-well-formed documents out of a seed: namespaces redeclared and undeclared, the
 * default namespace on and off, attributes that sort by namespace, siblings with the same tag,
 * special characters, comments, CDATA and processing instructions.
 */
class RandomDocument
{
public:
    explicit RandomDocument(unsigned seed)
        : _random(seed)
    {}

    std::string Make();

private:
    struct Binding
    {
        std::string prefix;
        std::string uri;
    };

    unsigned Pick(unsigned count) { return static_cast<unsigned>(_random() % count); }
    bool Chance(unsigned percent) { return Pick(100) < percent; }
    std::string Lookup(const std::string& prefix) const;
    void AddElement(unsigned depth);
    void AddRepeatedTags(unsigned depth);
    std::string MakeDeclarations(std::vector<std::string>& declared);
    std::string MakeAttributes();
    std::string MakeAttributeValue();
    void AddContent(unsigned depth);
    std::string MakeText();
    std::string PickPrefix(bool forAttribute);

    std::mt19937 _random;
    std::vector<Binding> _scope;
    std::string _text;
};

} // namespace Quillon::Xml
