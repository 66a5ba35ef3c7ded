#include "quillon/service/Logger.h"

#include "service/logText.h"
#include "system/ProcessMutex.h"

#include <atomic>
#include <cstdio>
#include <memory>
#include <new>
#include <utility>

namespace Quillon::Service {

namespace {

/** One write for the whole line, so that lines of several threads do not mix. */
void WriteToStandardError(const std::string& logger, int level, const std::string& text)
{
    const std::string line = logger + "[" + std::to_string(level) + "]: " + text + "\n";
    std::fwrite(line.data(), 1, line.size(), stderr);
}

/** A sink that is in use may be replaced: who delivers a line keeps it. */
struct KeptSink final : public RefCounted
{
    explicit KeptSink(LogSink wanted)
        : sink(std::move(wanted))
    {}

    const LogSink sink;
};

/** The current sink. A line is delivered outside the lock, to the sink it found. */
class SharedSink
{
public:
    void Set(const LogSink& sink)
    {
        Ref<const KeptSink> fresh(sink ? new KeptSink(sink) : nullptr);
        const System::ProcessLock lock(_mutex);
        _sink.swap(fresh);
    }

    /** Null stands for standard error. */
    Ref<const KeptSink> Get() const
    {
        // In a forked child the lock may come from a thread of the parent: what it guards is one
        // word, which is either the old or the new one.
        const System::ProcessLock lock(_mutex);
        return _sink;
    }

private:
    mutable System::ProcessMutex _mutex;
    Ref<const KeptSink> _sink;
};

class LoggerImpl : public Logger
{
public:
    LoggerImpl(std::string name, const SharedSink& sink)
        : _name(std::move(name))
        , _sink(sink)
    {}

    const std::string& GetName() const noexcept override { return _name; }

    int GetLevel() const noexcept override { return _level.load(std::memory_order_relaxed); }

    void SetLevel(int level) noexcept override { _level.store(level, std::memory_order_relaxed); }

    void Log(int level, const std::string& text) noexcept override
    {
        if (!IsEnabled(level)) {
            return;
        }
        try {
            const Ref<const KeptSink> kept = _sink.Get();
            const std::string line = ToLogText(text);
            if (kept != nullptr) {
                kept->sink(_name, level, line);
            } else {
                WriteToStandardError(_name, level, line);
            }
        } catch (...) { // NOLINT(bugprone-empty-catch): a line that is lost harms nobody
        }
    }

private:
    const std::string _name;
    const SharedSink& _sink;
    std::atomic<int> _level{LOG_LEVEL_WARNING};
};

/** Loggers are kept in a list that only grows, without a lock: a forked
 * child may find a lock taken by a thread that it does not have. */
class LogFacilityImpl : public LogFacility
{
public:
    Ref<Logger> GetLogger(const std::string& name) override
    {
        const Node* const first = _first.load(std::memory_order_acquire);
        if (const Node* const known = Find(name, first, nullptr)) {
            return known->logger;
        }
        auto fresh = std::make_unique<Node>(Node{new LoggerImpl(name, _sink), first});
        const Node* head = first;
        while (!_first.compare_exchange_weak(head, fresh.get(), std::memory_order_acq_rel)) {
            if (const Node* const known = Find(name, head, fresh->next)) {
                return known->logger;
            }
            fresh->next = head;
        }
        return fresh.release()->logger;
    }

    void SetSink(const LogSink& sink) override { _sink.Set(sink); }

private:
    struct Node
    {
        Ref<Logger> logger;
        const Node* next;
    };

    /** The logger of that name between `first` and `end`, or null. */
    static const Node* Find(const std::string& name, const Node* first, const Node* end)
    {
        while (first != end && first->logger->GetName() != name) {
            first = first->next;
        }
        return first != end ? first : nullptr;
    }

    SharedSink _sink;
    std::atomic<const Node*> _first{nullptr};
};

class AppImpl : public App
{
public:
    LogFacility& GetLogFacility() noexcept override { return _logFacility; }

private:
    LogFacilityImpl _logFacility;
};

/** Never destroyed: objects may still log while the process runs its static destructors. */
union ImmortalApp {
    ImmortalApp() { new (&app) AppImpl(); }
    ~ImmortalApp() {} // NOLINT(modernize-use-equals-default): a union's member is left alone
    ImmortalApp(const ImmortalApp&) = delete;
    ImmortalApp& operator=(const ImmortalApp&) = delete;

    AppImpl app;
};

} // namespace

App* GetApp() noexcept
{
    static ImmortalApp immortal;
    return &immortal.app;
}

namespace {

/** Made while the program is loaded: a fork must not meet a thread that makes it. */
[[maybe_unused]] const App* const madeEarly = GetApp();

} // namespace

} // namespace Quillon::Service
