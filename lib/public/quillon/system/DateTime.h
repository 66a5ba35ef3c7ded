#pragma once

#include "quillon/Exceptions.h"
#include "quillon/MessageFormatter.h"

#include <cstdint>
#include <string>
#include <string_view>

namespace Quillon::System {

/** Text that should be a date and time is not, or lies outside the years 1 to 9999. */
class QUILLON_API DateTimeFormatException : public ExceptionOf<DateTimeFormatException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~DateTimeFormatException() override;
};

/** A `DateTime` taken apart, in the proleptic Gregorian calendar and in UTC. */
struct DateTimeFields
{
    int century;       ///< the year divided by 100
    int yearOfCentury; ///< 0 to 99
    int month;         ///< 1 to 12
    int day;           ///< 1 to 31
    int hour;          ///< 0 to 23
    int minute;        ///< 0 to 59
    int second;        ///< 0 to 59
    int millisecond;   ///< 0 to 999
    int microsecond;   ///< 0 to 999, what is left of the millisecond
};

/**
 * An instant in UTC with microsecond resolution, from 0001-01-01 to 9999-12-31.
 *
 * Thread safety: a value; immutable but for assignment. No locale, no time-zone data base.
 */
class QUILLON_API DateTime
{
public:
    /** 1970-01-01T00:00:00Z. */
    DateTime() noexcept = default;

    /**
     * Reads an xsd:dateTime [XML Schema Part 2, 3.2.7]: a fraction of any length (cut after the
     * microsecond), an offset up to 14 hours or `Z`, `24:00:00` as the end of the day. A text
     * without an offset is taken as UTC, the only zone SAML times have [SAML-CORE 1.3.3].
     *
     * @throws DateTimeFormatException  anything else, surrounding blanks included.
     */
    explicit DateTime(std::string_view text);

    /** Microseconds since 1970-01-01T00:00:00Z; negative before. */
    long long GetUtcTime() const noexcept { return _utcTime; }

    DateTimeFields GetFields() const noexcept;

    /** For example `2012-01-31T12:00:00.000Z`; six fraction digits where microseconds need them. */
    std::string ToString() const;

    /** The time-zone designator of the text form: always `Z`. */
    std::string ToShortStringBias() const;

    friend bool operator==(const DateTime& a, const DateTime& b) noexcept
    {
        return a._utcTime == b._utcTime;
    }
    friend bool operator!=(const DateTime& a, const DateTime& b) noexcept { return !(a == b); }
    friend bool operator<(const DateTime& a, const DateTime& b) noexcept
    {
        return a._utcTime < b._utcTime;
    }

private:
    friend DateTime DateTimeFromUtc(long long utcTime, bool local);

    std::int64_t _utcTime = 0;
};

/**
 * The instant that lies `utcTime` microseconds after 1970-01-01T00:00:00Z.
 *
 * @param local  must be false: there are no local times here.
 * @throws InvalidArgumentException  `utcTime` lies outside the years 1 to 9999, or `local` is set.
 */
QUILLON_API DateTime DateTimeFromUtc(long long utcTime, bool local);

} // namespace Quillon::System

namespace Quillon {

template <>
struct ToStringFormatter<System::DateTime>
{
    static std::string Format(const System::DateTime* value)
    {
        return value == nullptr ? "(null)" : value->ToString();
    }
};

} // namespace Quillon
