#include "http/CookieStoreImpl.h"

#include <utility>

namespace Quillon::Http {

CookieStoreImpl::CookieStoreImpl(std::string name)
    : _name(std::move(name))
{}

CookieLines CookieStoreImpl::GetLines() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lines;
}

void CookieStoreImpl::Merge(const CookieLines& given, const CookieLines& now)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    for (const std::string& line : given) {
        if (now.count(line) == 0) {
            _lines.erase(line);
        }
    }
    for (const std::string& line : now) {
        if (given.count(line) == 0) {
            _lines.insert(line);
        }
    }
}

void CreateCookieStore(const std::string& name, Ref<CookieStore>& out)
{
    out = Ref<CookieStore>(new CookieStoreImpl(name));
}

} // namespace Quillon::Http
