#pragma once

#include "quillon/Export.h"

#include <string>
#include <utility>

namespace Quillon::Xml {

/** An expanded name [XML Names 2.1]: namespace URI (empty for none) and local name. */
class QUILLON_API QName
{
public:
    QName() = default;
    QName(std::string namespaceUri, std::string localName)
        : _namespaceUri(std::move(namespaceUri))
        , _localName(std::move(localName))
    {}

    const std::string& GetNamespaceUri() const noexcept { return _namespaceUri; }
    const std::string& GetLocalName() const noexcept { return _localName; }

    /** `{namespace}local`, or `local` alone for a name in no namespace. */
    std::string ToString() const
    {
        return _namespaceUri.empty() ? _localName : "{" + _namespaceUri + "}" + _localName;
    }

    friend bool operator==(const QName& a, const QName& b) noexcept
    {
        return a._localName == b._localName && a._namespaceUri == b._namespaceUri;
    }
    friend bool operator!=(const QName& a, const QName& b) noexcept { return !(a == b); }

private:
    std::string _namespaceUri;
    std::string _localName;
};

} // namespace Quillon::Xml
