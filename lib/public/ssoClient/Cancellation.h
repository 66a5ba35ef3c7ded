#pragma once

#include "ssoClient/Export.h"

#include <boost/smart_ptr/shared_ptr.hpp>

namespace SsoClient {

class CancellationState;

/**
 * Tells whether calls are to end early. Copies tell of the same source.
 *
 * Thread safety: any number of threads.
 */
class SSOCLIENT_API CancellationToken
{
public:
    /** One that never is cancelled. */
    CancellationToken() noexcept = default;

    bool IsCancelled() const noexcept;

private:
    friend class CancellationSource;
    friend class CancellationWatch;

    boost::shared_ptr<CancellationState> _state; // null: there is no source
};

/**
 * Ends calls early: those whose `CallOptions` have its token, and those of them that come later,
 * throw a `CancelledException`. Copies are one source. Letting go of it cancels nothing.
 *
 * Thread safety: any number of threads.
 */
class SSOCLIENT_API CancellationSource
{
public:
    CancellationSource();

    CancellationToken GetToken() const;

    /**
     * Ends the calls; once and for all, and without waiting for them. The completion of an
     * asynchronous call that has no thread yet is called here, on the thread that cancels.
     */
    void Cancel() const;

private:
    boost::shared_ptr<CancellationState> _state;
};

} // namespace SsoClient
