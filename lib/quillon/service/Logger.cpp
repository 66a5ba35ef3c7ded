#include "quillon/service/Logger.h"

#include <atomic>
#include <cstdio>
#include <map>
#include <memory>
#include <mutex>
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

bool IsControl(char character) noexcept
{
    const auto byte = static_cast<unsigned char>(character);
    return (byte < 0x20 && byte != '\t') || byte == 0x7F;
}

/** Writes control characters out: a text from outside must not pass for a line of its own. */
std::string EscapeControls(const std::string& text)
{
    constexpr char HexDigits[] = "0123456789abcdef";
    std::string result;
    for (const char character : text) {
        if (IsControl(character)) {
            const auto byte = static_cast<unsigned char>(character);
            result += "\\x";
            result += HexDigits[byte >> 4];
            result += HexDigits[byte & 0x0FU];
        } else {
            result += character;
        }
    }
    return result;
}

/** The current sink. A line is delivered outside the lock, to the sink it found. */
class SharedSink
{
public:
    SharedSink() { Set(LogSink()); }

    void Set(const LogSink& sink)
    {
        auto fresh = std::make_shared<const LogSink>(sink ? sink : LogSink(&WriteToStandardError));
        const std::lock_guard<std::mutex> lock(_mutex);
        _sink.swap(fresh);
    }

    std::shared_ptr<const LogSink> Get() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _sink;
    }

private:
    mutable std::mutex _mutex;
    std::shared_ptr<const LogSink> _sink;
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
            (*_sink.Get())(_name, level, EscapeControls(text));
        } catch (...) { // NOLINT(bugprone-empty-catch): a line that is lost harms nobody
        }
    }

private:
    const std::string _name;
    const SharedSink& _sink;
    std::atomic<int> _level{LOG_LEVEL_WARNING};
};

class LogFacilityImpl : public LogFacility
{
public:
    Ref<Logger> GetLogger(const std::string& name) override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        Ref<Logger>& logger = _loggers[name];
        if (logger == nullptr) {
            logger = new LoggerImpl(name, _sink);
        }
        return logger;
    }

    void SetSink(const LogSink& sink) override { _sink.Set(sink); }

private:
    SharedSink _sink;
    std::mutex _mutex;
    std::map<std::string, Ref<Logger>> _loggers;
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

} // namespace Quillon::Service
