#pragma once

#include "quillon/system/DateTime.h"
#include "ssoClientRuntime/Export.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <chrono>
#include <functional>

namespace SsoClient {

/**
 * Where the objects of this library take time, chance and threads from, so that a test can put
 * virtual ones in their place. Without a word they use those of the process.
 *
 * The clocks and `DrawNumber` are asked while locks are held: they must not come back to the object
 * that asks.
 *
 * There is no virtual destructor: an environment is only owned by the pointer it was made into.
 *
 * Thread safety: called by any number of threads.
 */
class SSOCLIENT_RUNTIME_API RuntimeEnvironment
{
public:
    using Work = std::function<void()>;

    /** By which the validity of tokens is judged. It may be set forward and back. */
    virtual Quillon::System::DateTime GetWallTime() const = 0;

    /** By which waits are measured. It never goes back, and may stand still while the machine is
     *  suspended. */
    virtual std::chrono::steady_clock::time_point GetSteadyTime() const = 0;

    /** A number from 0 up to, but not including, 1. It spreads load and needs not be a secret. */
    virtual double DrawNumber() = 0;

    /**
     * Runs work on another thread. The work may take as long as an exchange with a service.
     *
     * @throws Quillon::Exception  it cannot; the work is then never run.
     */
    virtual void Run(const Work& work) = 0;

    /**
     * Runs work at that time or later, also if it has passed. The work is short, waits for nothing
     * and throws nothing.
     */
    virtual void RunAt(std::chrono::steady_clock::time_point time, const Work& work) = 0;

protected:
    ~RuntimeEnvironment() = default;
};

/**
 * The environment of the process: the clock of `Quillon::System::GetUtcDateTime`,
 * `std::chrono::steady_clock`, the thread pool of the process, and one thread more, which starts
 * with the first `RunAt` and takes no signals. When the process ends, or in a forked child, work
 * that has not begun never runs.
 *
 * @return never null.
 *
 * Thread safety: any thread.
 */
SSOCLIENT_RUNTIME_API boost::shared_ptr<RuntimeEnvironment> GetProcessEnvironment();

} // namespace SsoClient
