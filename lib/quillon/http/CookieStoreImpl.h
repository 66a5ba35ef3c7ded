#pragma once

#include "quillon/http/CookieStore.h"

#include <mutex>
#include <set>
#include <string>

namespace Quillon::Http {

/** Cookies as lines of the Netscape format, which libcurl's cookie engine reads and writes. */
using CookieLines = std::set<std::string>;

class CookieStoreImpl final : public CookieStore
{
public:
    explicit CookieStoreImpl(std::string name);

    const std::string& GetName() const noexcept override { return _name; }

    CookieLines GetLines() const;

    /**
     * Takes over what an exchange did to the cookies: what it was given and no longer has goes,
     * what it has anew comes; what other exchanges did meanwhile stays.
     */
    void Merge(const CookieLines& given, const CookieLines& now);

private:
    const std::string _name;
    mutable std::mutex _mutex;
    CookieLines _lines;
};

} // namespace Quillon::Http
