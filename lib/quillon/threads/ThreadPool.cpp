#include "quillon/system/ThreadPool.h"

#include "crypto/initialisation.h"
#include "threads/ElasticPool.h"
#include "threads/ProcessEnd.h"

#include <algorithm>
#include <chrono>
#include <new>
#include <thread>

namespace Quillon::System {

namespace {

using std::chrono::seconds;

class ProcessPool final : public ThreadPool
{
public:
    static ProcessPool& Get() noexcept;

    void Queue(const Functor& work) override { _pool.Queue(work); }
    std::size_t GetThreadCount() const override { return _pool.GetThreadCount(); }
    void SetLimit(std::size_t limit) { _pool.SetLimit(limit); }

private:
    static bool Prepare();

    ElasticPool _pool{
        {std::max(std::thread::hardware_concurrency(), 1U),
         DefaultLimit,
         seconds(IdleTimeSec),
         &Prepare}};
};

/** Never destroyed: work may still run, or be queued, while static objects are destroyed. */
union ImmortalPool {
    ImmortalPool() { new (&pool) ProcessPool(); }
    ~ImmortalPool() {} // NOLINT(modernize-use-equals-default): a union's member is left alone
    ImmortalPool(const ImmortalPool&) = delete;
    ImmortalPool& operator=(const ImmortalPool&) = delete;

    ProcessPool pool;
};

ProcessPool& ProcessPool::Get() noexcept
{
    static ImmortalPool immortal;
    return immortal.pool;
}

bool ProcessPool::Prepare()
{
    // OpenSSL comes first, so that it takes itself down after the work has finished.
    Crypto::InitialiseOpenSsl();
    return RunAtProcessEnd(EndStage::WORK, [] { Get()._pool.End(seconds(PatienceSec)); });
}

} // namespace

ThreadPool* GetThreadPool() noexcept
{
    return &ProcessPool::Get();
}

void SetThreadPoolLimit(std::size_t limit)
{
    ProcessPool::Get().SetLimit(limit);
}

} // namespace Quillon::System
