#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>

namespace DevSts {

using TimePoint = std::chrono::time_point<std::chrono::system_clock, std::chrono::microseconds>;

/** Tells the time. Called from several threads at once. */
using Clock = std::function<TimePoint()>;

TimePoint SystemTime();

/** How far the clock of a client may be off. */
constexpr std::chrono::minutes ClockSkew(5);

/** The xs:dateTime form with milliseconds and the UTC designator. */
std::string FormatTime(TimePoint time);

/**
 * Reads an xs:dateTime that ends in "Z", with up to nine fraction digits; nothing else is a time
 * here, because WS-Security asks for UTC. [WSS11 10]
 */
std::optional<TimePoint> ParseTime(const std::string& text);

} // namespace DevSts
