#include "devsts/wire/Clock.h"

#include <array>
#include <cstdio>
#include <regex>

namespace DevSts {

namespace {

std::chrono::microseconds ParseFraction(std::string digits)
{
    digits.resize(6, '0');
    return std::chrono::microseconds(std::stol(digits));
}

} // namespace

TimePoint SystemTime()
{
    return std::chrono::time_point_cast<std::chrono::microseconds>(
        std::chrono::system_clock::now());
}

std::string FormatTime(TimePoint time)
{
    namespace chr = std::chrono;
    const auto day = chr::floor<chr::days>(time);
    const chr::year_month_day date(day);
    const chr::hh_mm_ss clock(chr::floor<chr::milliseconds>(time - day));
    std::array<char, 64> text{};
    std::snprintf(
        text.data(),
        text.size(),
        "%04d-%02u-%02uT%02ld:%02ld:%02ld.%03ldZ",
        static_cast<int>(date.year()),
        static_cast<unsigned>(date.month()),
        static_cast<unsigned>(date.day()),
        static_cast<long>(clock.hours().count()),
        static_cast<long>(clock.minutes().count()),
        static_cast<long>(clock.seconds().count()),
        static_cast<long>(clock.subseconds().count()));
    return text.data();
}

std::optional<TimePoint> ParseTime(const std::string& text)
{
    namespace chr = std::chrono;
    static const std::regex pattern(
        R"((\d{4})-(\d{2})-(\d{2})T(\d{2}):(\d{2}):(\d{2})(?:\.(\d{1,9}))?Z)");
    std::smatch parts;
    // The length is bounded because the matcher recurses over its input.
    if (text.size() > 40 || !std::regex_match(text, parts, pattern)) {
        return std::nullopt;
    }
    const auto number = [&parts](std::size_t index) { return std::stoi(parts[index].str()); };
    const chr::year_month_day date(
        chr::year(number(1)),
        chr::month(static_cast<unsigned>(number(2))),
        chr::day(static_cast<unsigned>(number(3))));
    if (!date.ok() || number(4) > 23 || number(5) > 59 || number(6) > 59) {
        return std::nullopt;
    }
    return TimePoint(chr::sys_days(date)) + chr::hours(number(4)) + chr::minutes(number(5))
           + chr::seconds(number(6)) + ParseFraction(parts[7].str());
}

} // namespace DevSts
