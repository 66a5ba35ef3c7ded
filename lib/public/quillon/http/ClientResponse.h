#pragma once

#include "quillon/Reader.h"
#include "quillon/Ref.h"

#include <string>

namespace Quillon::Http {

/** The status line of a reply [RFC 9112 4]. */
struct HttpStatus
{
    int code = 0;
    std::string reasonPhrase; ///< may be empty
};

/**
 * A complete reply. The body is read once, by one thread at a time.
 */
class QUILLON_API ClientResponse : public RefCounted
{
public:
    virtual const HttpStatus& GetStatus() const noexcept = 0;

    /** The one reader of the body; never null. */
    virtual const Ref<Reader>& GetBody() const noexcept = 0;
};

} // namespace Quillon::Http
