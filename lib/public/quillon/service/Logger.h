#pragma once

#include "quillon/Ref.h"

#include <boost/function.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

namespace Quillon::Service {

/** Well-known levels: the higher the number, the chattier the line. */
enum LogLevel : int
{
    LOG_LEVEL_WARNING = 8,
    LOG_LEVEL_TRACE = 64
};

/**
 * Takes the lines of all loggers: logger name, level and text. The text is UTF-8. Control
 * characters other than the tab (C1 included), U+2028, U+2029, those that change the direction of
 * text, and octets that are no UTF-8 arrive written out as `\xNN`, octet by octet, so that a line
 * cannot pretend to be two or another. A backslash arrives as `\x5c` where it would otherwise look
 * like the beginning of that.
 *
 * It is called on the thread that logs, from several threads at once; what it throws is dropped
 * with the line.
 */
using LogSink =
    boost::function<void(const std::string& logger, int level, const std::string& text)>;

/**
 * A named stream of log lines with a level of its own.
 *
 * Thread safety: any number of threads may log and set the level at once.
 */
class QUILLON_API Logger : public RefCounted
{
public:
    virtual const std::string& GetName() const noexcept = 0;

    /** Lines up to this level are written. A new logger has level 8. */
    virtual int GetLevel() const noexcept = 0;
    virtual void SetLevel(int level) noexcept = 0;

    /** Whether a line of `level` would be written; test it before building a costly text. */
    bool IsEnabled(int level) const noexcept { return level <= GetLevel(); }

    /** Hands the line to the sink if its level is enabled. Never throws. */
    virtual void Log(int level, const std::string& text) noexcept = 0;
};

/**
 * The loggers of the process and the sink they share. The default sink writes
 * `name[level]: text` lines to standard error.
 *
 * Thread safety: any thread, also in a forked child.
 */
class QUILLON_API LogFacility
{
public:
    /** The logger of that name, made on first use and kept for the life of the process. */
    virtual Ref<Logger> GetLogger(const std::string& name) = 0;

    /** Sends all lines to `sink` from now on; an empty function brings the default back. */
    virtual void SetSink(const LogSink& sink) = 0;

protected:
    ~LogFacility() = default;
};

/** The services that one process shares. */
class QUILLON_API App
{
public:
    virtual LogFacility& GetLogFacility() noexcept = 0;

protected:
    ~App() = default;
};

/** The one application object, made on first use; never null. */
QUILLON_API App* GetApp() noexcept;

} // namespace Quillon::Service
