#include "ssoClient/PrincipalId.h"

#include "quillon/PanicVerify.h"
#include "quillon/StringUtil.h"

#include <utility>

namespace SsoClient {

namespace {

// Unit and lines are part of the text that operators search for; they do not follow this file.
constexpr char Unit[] = "lib/public/ssoClient/PrincipalId";
constexpr int NameLine = 43;
constexpr int DomainLine = 44;

bool EqualIgnoringCase(const std::string& a, const std::string& b)
{
    return Quillon::StringUtil::ToUpper(a) == Quillon::StringUtil::ToUpper(b);
}

} // namespace

PrincipalId::PrincipalId(std::string name, std::string domain)
    : _name(std::move(name))
    , _domain(std::move(domain))
{
    if (_name.empty()) {
        Quillon::PanicVerify("!name.empty()", Unit, NameLine);
    }
    if (_domain.empty()) {
        Quillon::PanicVerify("!domain.empty()", Unit, DomainLine);
    }
}

std::string PrincipalId::ToString() const
{
    return "{Name: " + _name + "; Domain:" + _domain + "}";
}

bool operator==(const PrincipalId& a, const PrincipalId& b)
{
    return &a == &b
           || (EqualIgnoringCase(a._name, b._name) && EqualIgnoringCase(a._domain, b._domain));
}

} // namespace SsoClient
