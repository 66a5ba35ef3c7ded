#include "quillon/system/DateTime.h"

#include <array>
#include <cstdio>

namespace Quillon::System {

namespace {

constexpr std::int64_t SecondUs = 1'000'000;
constexpr std::int64_t MinuteUs = 60 * SecondUs;
constexpr std::int64_t HourUs = 60 * MinuteUs;
constexpr std::int64_t DayUs = 24 * HourUs;

/** Days from 0000-03-01 to 1970-01-01. */
constexpr std::int64_t EpochDays = 719'468;
constexpr std::int64_t DaysOf400Years = 146'097;

struct CivilDate
{
    int year;
    int month;
    int day;
};

// Years are counted from March: the leap day then comes last, and the lengths of the months
// before it repeat every five months with 153 days.
constexpr std::int64_t DaysFromCivil(const CivilDate& date) noexcept
{
    const std::int64_t year = date.month > 2 ? date.year : date.year - 1;
    const std::int64_t month = (date.month + 9) % 12;
    const std::int64_t dayOfYear = (153 * month + 2) / 5 + date.day - 1;
    return 365 * year + year / 4 - year / 100 + year / 400 + dayOfYear - EpochDays;
}

constexpr CivilDate CivilFromDays(std::int64_t days) noexcept
{
    const std::int64_t shifted = days + EpochDays;
    const std::int64_t era = shifted / DaysOf400Years;
    const std::int64_t dayOfEra = shifted % DaysOf400Years;
    const std::int64_t yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    const std::int64_t dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const std::int64_t month = (5 * dayOfYear + 2) / 153;
    return {
        static_cast<int>(yearOfEra + era * 400 + (month >= 10 ? 1 : 0)),
        static_cast<int>((month + 2) % 12 + 1),
        static_cast<int>(dayOfYear - (153 * month + 2) / 5 + 1)};
}

constexpr std::int64_t MinTime = DaysFromCivil({1, 1, 1}) * DayUs;
constexpr std::int64_t MaxTime = (DaysFromCivil({9999, 12, 31}) + 1) * DayUs - 1;

constexpr int DaysOfMonth(int year, int month) noexcept
{
    constexpr std::array<int, 12> Days = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    const bool leapYear = year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
    return month == 2 && leapYear ? 29 : Days[static_cast<std::size_t>(month - 1)];
}

/** Reads an xsd:dateTime from front to back. */
class DateTimeReader
{
public:
    explicit DateTimeReader(std::string_view text) noexcept
        : _text(text)
        , _rest(text)
    {}

    std::int64_t Read()
    {
        const std::int64_t date = ReadDate();
        Require('T');
        const std::int64_t time = ReadTimeOfDay();
        const std::int64_t offset = ReadOffset();
        if (!_rest.empty()) {
            Fail();
        }
        const std::int64_t utcTime = date + time - offset;
        if (utcTime < MinTime || utcTime > MaxTime) {
            Fail();
        }
        return utcTime;
    }

private:
    /** A year has exactly four digits: years beyond 9999 and before 1 are out of range. */
    std::int64_t ReadDate()
    {
        const int year = ReadNumber(4, 1, 9999);
        Require('-');
        const int month = ReadNumber(2, 1, 12);
        Require('-');
        const int day = ReadNumber(2, 1, DaysOfMonth(year, month));
        return DaysFromCivil({year, month, day}) * DayUs;
    }

    std::int64_t ReadTimeOfDay()
    {
        const int hour = ReadNumber(2, 0, 24);
        Require(':');
        const int minute = ReadNumber(2, 0, 59);
        Require(':');
        const int second = ReadNumber(2, 0, 59);
        const std::int64_t rest = minute * MinuteUs + second * SecondUs + ReadFraction();
        if (hour == 24 && (rest != 0 || _fractionCut)) {
            Fail();
        }
        return hour * HourUs + rest;
    }

    std::int64_t ReadFraction()
    {
        if (!Accept('.')) {
            return 0;
        }
        std::int64_t fraction = ReadDigit() * (SecondUs / 10);
        for (std::int64_t unit = SecondUs / 100; AtDigit(); unit /= 10) {
            const int digit = ReadDigit();
            fraction += digit * unit;
            _fractionCut = _fractionCut || (unit == 0 && digit != 0);
        }
        return fraction;
    }

    std::int64_t ReadOffset()
    {
        if (_rest.empty() || Accept('Z')) {
            return 0;
        }
        const bool negative = Accept('-');
        if (!negative) {
            Require('+');
        }
        const int hours = ReadNumber(2, 0, 14);
        Require(':');
        const int minutes = ReadNumber(2, 0, hours == 14 ? 0 : 59);
        const std::int64_t offset = hours * HourUs + minutes * MinuteUs;
        return negative ? -offset : offset;
    }

    int ReadNumber(int digits, int min, int max)
    {
        int number = 0;
        for (int i = 0; i < digits; ++i) {
            number = number * 10 + ReadDigit();
        }
        if (number < min || number > max) {
            Fail();
        }
        return number;
    }

    bool AtDigit() const noexcept
    {
        return !_rest.empty() && _rest.front() >= '0' && _rest.front() <= '9';
    }

    int ReadDigit()
    {
        if (!AtDigit()) {
            Fail();
        }
        const int digit = _rest.front() - '0';
        _rest.remove_prefix(1);
        return digit;
    }

    bool Accept(char character) noexcept
    {
        if (_rest.empty() || _rest.front() != character) {
            return false;
        }
        _rest.remove_prefix(1);
        return true;
    }

    void Require(char character)
    {
        if (!Accept(character)) {
            Fail();
        }
    }

    [[noreturn]] void Fail() const
    {
        constexpr std::size_t MaxShown = 64;
        throw DateTimeFormatException(
            "Not a date and time of the years 1 to 9999: '" + std::string(_text.substr(0, MaxShown))
            + (_text.size() > MaxShown ? "...'" : "'"));
    }

    std::string_view _text;
    std::string_view _rest;
    bool _fractionCut = false; // a digit other than 0 lies beyond the microsecond
};

} // namespace

DateTimeFormatException::~DateTimeFormatException() = default;

DateTime::DateTime(std::string_view text)
    : _utcTime(DateTimeReader(text).Read())
{}

DateTimeFields DateTime::GetFields() const noexcept
{
    const std::int64_t sinceMin = _utcTime - MinTime;
    const CivilDate date = CivilFromDays(sinceMin / DayUs + MinTime / DayUs);
    const std::int64_t ofDay = sinceMin % DayUs;
    return {
        date.year / 100,
        date.year % 100,
        date.month,
        date.day,
        static_cast<int>(ofDay / HourUs),
        static_cast<int>(ofDay % HourUs / MinuteUs),
        static_cast<int>(ofDay % MinuteUs / SecondUs),
        static_cast<int>(ofDay % SecondUs / 1000),
        static_cast<int>(ofDay % 1000)};
}

std::string DateTime::ToString() const
{
    const DateTimeFields fields = GetFields();
    std::array<char, 64> text{};
    std::snprintf(
        text.data(),
        text.size(),
        "%02d%02d-%02d-%02dT%02d:%02d:%02d.%03d",
        fields.century,
        fields.yearOfCentury,
        fields.month,
        fields.day,
        fields.hour,
        fields.minute,
        fields.second,
        fields.millisecond);
    std::string result = text.data();
    if (fields.microsecond != 0) {
        std::snprintf(text.data(), text.size(), "%03d", fields.microsecond);
        result += text.data();
    }
    return result + ToShortStringBias();
}

std::string DateTime::ToShortStringBias() const
{
    return "Z";
}

DateTime DateTimeFromUtc(long long utcTime, bool local)
{
    if (local) {
        throw InvalidArgumentException("local times are not supported");
    }
    if (utcTime < MinTime || utcTime > MaxTime) {
        throw InvalidArgumentException(
            "time " + std::to_string(utcTime) + " us lies outside the years 1 to 9999");
    }
    DateTime result;
    result._utcTime = utcTime;
    return result;
}

} // namespace Quillon::System
