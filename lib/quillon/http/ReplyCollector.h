#pragma once

#include "quillon/http/ClientResponse.h"

#include <string>
#include <string_view>

namespace Quillon::Http {

/**
 * Gathers a reply as it comes in, and refuses one that grows too large or comes in an encoding
 * that was not asked for.
 */
class ReplyCollector
{
public:
    /** Takes one line of a header, interim replies and trailers included. @return acceptance. */
    bool AddHeaderLine(std::string_view line);

    /** Takes a piece of the body. @return acceptance. */
    bool AddBody(std::string_view piece);

    /** Why a line or piece was refused, as the end of a sentence about the reply; else empty. */
    const std::string& GetProblem() const noexcept { return _problem; }

    /** The latest status line. */
    const HttpStatus& GetStatus() const noexcept { return _status; }

    /**
     * Whether the latest status is an interim one other than 100 (Continue) [RFC 9110 15.2]. If
     * the server ends the exchange with it, it was the answer.
     */
    bool HasInterimStatus() const noexcept { return _status.code > 100 && _status.code < 200; }

    std::string TakeBody() noexcept { return std::move(_body); }

private:
    bool AddStatusLine(std::string_view line);
    bool AddField(std::string_view name, std::string_view value);

    std::size_t _headerBytes = 0;
    bool _expectsStatus = true;
    HttpStatus _status;
    std::string _body;
    std::string _problem;
};

} // namespace Quillon::Http
