#include "http/exchangeReading.h"

#include "http/ConnectionSpecImpl.h"

#include <algorithm>
#include <charconv>

namespace Quillon::Http {

namespace {

constexpr long long MicrosecondsPerSecond = 1'000'000;

/** A time in microseconds, or a number of octets. */
long long ReadNumber(CURL* easy, CURLINFO which)
{
    curl_off_t number = 0;
    curl_easy_getinfo(easy, which, &number);
    return number;
}

/** Whether the exchange had a connection, and made none. */
bool IsConnectionReused(CURL* easy, const ExchangeFacts& facts)
{
    long made = 0;
    curl_easy_getinfo(easy, CURLINFO_NUM_CONNECTS, &made);
    return !facts.address.empty() && made == 0;
}

std::string ReadAddress(CURL* easy)
{
    const char* address = nullptr;
    long port = 0;
    curl_easy_getinfo(easy, CURLINFO_PRIMARY_IP, &address);
    curl_easy_getinfo(easy, CURLINFO_PRIMARY_PORT, &port);
    return address == nullptr || *address == '\0' ? ""
                                                  : ToUrlHost(address) + ":" + std::to_string(port);
}

} // namespace

ExchangeFacts ReadFacts(CURL* easy)
{
    ExchangeFacts facts;
    facts.address = ReadAddress(easy);
    facts.times.nameLookup = ReadNumber(easy, CURLINFO_NAMELOOKUP_TIME_T);
    facts.times.connection = ReadNumber(easy, CURLINFO_CONNECT_TIME_T);
    facts.times.handshake = ReadNumber(easy, CURLINFO_APPCONNECT_TIME_T);
    facts.times.firstByte = ReadNumber(easy, CURLINFO_STARTTRANSFER_TIME_T);
    facts.times.end = ReadNumber(easy, CURLINFO_TOTAL_TIME_T);
    facts.isConnectionReused = IsConnectionReused(easy, facts);
    facts.sentOctets = ReadNumber(easy, CURLINFO_SIZE_UPLOAD_T);
    facts.receivedOctets = ReadNumber(easy, CURLINFO_SIZE_DOWNLOAD_T);
    return facts;
}

boost::optional<long long> ParseRetryAfter(
    const std::string& text, const boost::optional<System::DateTime>& now)
{
    long long seconds = 0;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, seconds);
    if (error == std::errc() && rest == end && seconds >= 0) {
        return seconds;
    }
    const boost::optional<System::DateTime> date = ParseHttpDate(text);
    if (!date || !now) {
        return boost::none;
    }
    const long long difference = date->GetUtcTime() - now->GetUtcTime();
    return std::max(0LL, difference / MicrosecondsPerSecond);
}

boost::optional<System::DateTime> ParseHttpDate(const std::string& text)
{
    const long long seconds = curl_getdate(text.c_str(), nullptr);
    if (text.empty() || seconds < 0) {
        return boost::none;
    }
    try {
        return System::DateTimeFromUtc(seconds * MicrosecondsPerSecond, false);
    } catch (const InvalidArgumentException&) {
        return boost::none;
    }
}

} // namespace Quillon::Http
