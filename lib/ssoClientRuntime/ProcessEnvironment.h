#pragma once

#include "ssoClientRuntime/RuntimeEnvironment.h"

#include <chrono>
#include <condition_variable>
#include <map>
#include <mutex>

namespace SsoClient {

/** The clocks, the pool and the chance of the process, and the one thread that waits for times. */
class ProcessEnvironment final : public RuntimeEnvironment
{
public:
    Quillon::System::DateTime GetWallTime() const override;
    std::chrono::steady_clock::time_point GetSteadyTime() const override;
    double DrawNumber() override;
    void Run(const Work& work) override;
    void RunAt(std::chrono::steady_clock::time_point time, const Work& work) override;

    /** No further work begins. */
    void End() noexcept;

private:
    void StartThread();
    void Ring();

    std::mutex _mutex;
    std::condition_variable _changed;
    std::multimap<std::chrono::steady_clock::time_point, Work> _queue;
    bool _hasThread = false;
    bool _isEnding = false;
};

} // namespace SsoClient
