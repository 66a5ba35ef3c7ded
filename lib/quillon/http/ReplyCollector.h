#pragma once

#include "quillon/http/ClientRequest.h"
#include "quillon/http/ClientResponse.h"

#include <optional>
#include <string>
#include <string_view>

namespace Quillon::Http {

/**
 * Gathers a reply as it comes in, decides when it is an answer, and refuses one that grows too
 * large, contradicts itself or comes in an encoding that was not asked for.
 */
class ReplyCollector
{
public:
    /**
     * @param wantsBody    for which status codes the body counts; null: for all.
     * @param isObserved  whether `Location`, `Date` and `Retry-After` are kept.
     */
    ReplyCollector(StatusTest wantsBody, bool isObserved) noexcept
        : _wantsBody(wantsBody)
        , _isObserved(isObserved)
    {}

    /**
     * Takes one line of a header, interim replies and trailers included.
     *
     * @return whether more is to be read. If not, there is a problem, or `IsAnswered`.
     */
    bool AddHeaderLine(std::string_view line);

    /** Takes a piece of the body. @return acceptance. */
    bool AddBody(std::string_view piece);

    /** Counts octets of the body as they came over the wire, with what frames its chunks. */
    void AddWireBytes(std::size_t count);

    /** Why the reply was refused, as the end of a sentence about it; else empty. */
    const std::string& GetProblem() const noexcept { return _problem; }

    /** The latest status line. */
    const HttpStatus& GetStatus() const noexcept { return _status; }

    /** The fields of these names in the latest head; empty if it has none. */
    const std::string& GetLocation() const noexcept { return _location; }
    const std::string& GetDate() const noexcept { return _date; }
    const std::string& GetRetryAfter() const noexcept { return _retryAfter; }

    /** Whether the head of a final reply is complete. */
    bool HasHead() const noexcept { return _next == Next::BODY || _next == Next::NOTHING; }

    /** Whether the latest head says all, so that nothing behind it counts. */
    bool IsAnswered() const noexcept { return _next == Next::NOTHING; }

    /** Whether only the end of the connection tells where the body ends. */
    bool EndsWithConnection() const noexcept;

    /**
     * Whether the latest status is an interim one other than 100 (Continue) [RFC 9110 15.2]. If no
     * other status follows, it was the answer.
     */
    bool HasInterimStatus() const noexcept { return _next == Next::STATUS && _status.code > 100; }

    /** The problem of a reply whose headers exceed their limit. */
    static std::string DescribeTooManyHeaders();

    std::string TakeBody() noexcept { return std::move(_body); }

private:
    enum class Next
    {
        STATUS,
        FIELDS,
        BODY,
        NOTHING
    };

    bool AddStatusLine(std::string_view line);
    bool AddField(std::string_view name, std::string_view value);
    bool EndHead() noexcept;
    void NoteField(const std::string& lowerName, std::string_view value);
    bool IsInterim() const noexcept;
    bool WantsBody() const;
    bool AddEncoding(std::string_view value, bool isWanted);
    bool AddContentLength(std::string_view value);

    const StatusTest _wantsBody;
    const bool _isObserved;
    Next _next = Next::STATUS;
    std::size_t _headerBytes = 0;
    std::size_t _wireBytes = 0;
    bool _hasLength = false;    // Content-Length or chunks tell where the body ends
    bool _announcesEnd = false; // of the connection
    std::optional<std::string> _contentLength;
    HttpStatus _status;
    std::string _location;
    std::string _date;
    std::string _retryAfter;
    std::string _body;
    std::string _problem;
};

} // namespace Quillon::Http
