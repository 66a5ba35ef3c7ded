#pragma once

#include "quillon/MessageFormatter.h"
#include "ssoClient/Export.h"

#include <string>

namespace SsoClient {

/** A user or group, named by its name and the domain (identity source) that owns it. */
class SSOCLIENT_API PrincipalId
{
public:
    /** Stops the process if either is empty; check text from outside first. */
    PrincipalId(const std::string& name, const std::string& domain);

    // There is no move: what a move leaves behind would have the empty name that no principal has.
    PrincipalId(const PrincipalId&) = default;
    PrincipalId& operator=(const PrincipalId&) = default;
    ~PrincipalId() = default;

    const std::string& GetName() const noexcept { return _name; }
    const std::string& GetDomain() const noexcept { return _domain; }

    /** `{Name: name; Domain:domain}`. */
    std::string ToString() const;

    /** Whether names and domains are equal without regard to case. */
    SSOCLIENT_API friend bool operator==(const PrincipalId& a, const PrincipalId& b);
    friend bool operator!=(const PrincipalId& a, const PrincipalId& b) { return !(a == b); }

private:
    std::string _name;
    std::string _domain;
};

} // namespace SsoClient

namespace Quillon {

template <>
struct ToStringFormatter<SsoClient::PrincipalId>
{
    static std::string Format(const SsoClient::PrincipalId* value)
    {
        return value == nullptr ? "(null)" : value->ToString();
    }
};

} // namespace Quillon
