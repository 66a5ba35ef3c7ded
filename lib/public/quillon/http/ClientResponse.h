#pragma once

#include "quillon/Reader.h"
#include "quillon/Ref.h"

#include <cstddef>
#include <string>

namespace Quillon::Http {

/** The status line of a reply [RFC 9112 4]. */
struct HttpStatus
{
    int code = 0;
    std::string reasonPhrase; ///< may be empty
};

/** A reply that exceeds one of these is an error of the exchange. */
struct ReplyLimits
{
    static constexpr std::size_t MaxBodyBytes = std::size_t{8} * 1024 * 1024;
    static constexpr std::size_t MaxHeaderBytes = std::size_t{64} * 1024; ///< trailers included
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
