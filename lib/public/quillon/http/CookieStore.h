#pragma once

#include "quillon/Ref.h"

#include <string>

namespace Quillon::Http {

/**
 * The cookies [RFC 6265] that the exchanges of a user agent received, kept in memory and sent
 * back where they belong.
 *
 * Thread safety: any number of exchanges. Each one sends the cookies that the store has when it
 * starts, and adds what it received when it ends.
 */
class QUILLON_API CookieStore : public RefCounted
{
public:
    virtual const std::string& GetName() const noexcept = 0;
};

/** Creates an empty store. The name is only for messages; stores of one name share nothing. */
QUILLON_API void CreateCookieStore(const std::string& name, Ref<CookieStore>& out);

} // namespace Quillon::Http
