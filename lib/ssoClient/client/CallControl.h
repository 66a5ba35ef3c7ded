#pragma once

#include "ssoClient/CallOptions.h"

#include <boost/optional.hpp>

namespace SsoClient {

/** Where calls under control have time and chance from. Thread safety: any thread. */
class CallEnvironment
{
public:
    /** Microseconds of a clock that nobody sets. */
    virtual long long Now() const = 0;

    /** Waits, unless the token's source cancels. @return whether it has. */
    virtual bool Wait(const CancellationToken& token, long long microseconds) const = 0;

    /** From 0 up to, but not including, 1. */
    virtual double Draw() const = 0;

protected:
    ~CallEnvironment() = default;
};

/** That of the process. */
const CallEnvironment& GetCallEnvironment();

/** What all calls of a service with options are under. */
struct CallControl
{
    CallOptions options;
    const CallEnvironment* environment = &GetCallEnvironment();

    /** By the environment's clock; absent if each call makes its own as it begins. */
    boost::optional<long long> deadline;

    /** The same with a deadline that counts from now. */
    CallControl Started() const;
};

/** The same options with times that can be computed with: "for ever" becomes 31 years. */
CallOptions Bound(const CallOptions& options);

/** @throws Quillon::InvalidArgumentException  see `WithOptions`. */
void RequireValid(const CallOptions& options);

} // namespace SsoClient
