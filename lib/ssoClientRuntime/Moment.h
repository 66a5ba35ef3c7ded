#pragma once

#include <chrono>

namespace SsoClient {

using Span = std::chrono::microseconds;

/** An instant by both clocks: the wall clock since 1970, the steady one since some beginning. */
struct Moment
{
    Span wall{};
    Span steady{};
};

/** Until when a token may be handed out; what either clock says ends it. */
struct Lease
{
    Span wallUntil{};
    Span steadyUntil{};

    bool Covers(const Moment& now) const noexcept
    {
        return now.wall <= wallUntil && now.steady <= steadyUntil;
    }

    /** Negative if it is over. */
    Span GetLeft(const Moment& now) const noexcept
    {
        const Span byWall = wallUntil - now.wall;
        const Span bySteady = steadyUntil - now.steady;
        return byWall < bySteady ? byWall : bySteady;
    }
};

/**
 * When a token was issued and when it ends, by the service's clock. From one to the other is how
 * long the service meant it to live, whatever its clock says.
 */
struct Validity
{
    Span issued{};
    Span end{};
};

/**
 * The lease of a token that was asked for at `asked`, without its last `minRemaining`. It ends at
 * the token's end by the wall clock. If that is set back, or the service's clock is ahead, the
 * token's lifetime since it was asked for ends it.
 */
inline Lease MakeLease(const Moment& asked, const Validity& validity, Span minRemaining)
{
    const Span lifetime = validity.end - validity.issued;
    return {validity.end - minRemaining, asked.steady + lifetime - minRemaining};
}

} // namespace SsoClient
