#include "ssoClient/PrincipalId.h"

#include "quillon/PanicVerify.h"
#include "quillon/StringUtil.h"
#include "ssoClient/wire/assertionPlaces.h"

namespace SsoClient {

namespace {

bool EqualIgnoringCase(const std::string& a, const std::string& b)
{
    return Quillon::StringUtil::ToUpper(a) == Quillon::StringUtil::ToUpper(b);
}

} // namespace

PrincipalId::PrincipalId(const std::string& name, const std::string& domain)
    : _name(name)
    , _domain(domain)
{
    if (_name.empty()) {
        Quillon::PanicVerify(
            "!name.empty()", AssertionPlaces::PrincipalId, AssertionPlaces::PrincipalWithoutName);
    }
    if (_domain.empty()) {
        Quillon::PanicVerify(
            "!domain.empty()",
            AssertionPlaces::PrincipalId,
            AssertionPlaces::PrincipalWithoutDomain);
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
