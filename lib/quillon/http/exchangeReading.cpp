#include "http/exchangeReading.h"

#include "http/ConnectionSpecImpl.h"

namespace Quillon::Http {

namespace {

constexpr long long MicrosecondsPerSecond = 1'000'000;

long long ReadTime(CURL* easy, CURLINFO which)
{
    curl_off_t microseconds = 0;
    curl_easy_getinfo(easy, which, &microseconds);
    return microseconds;
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
    facts.times.nameLookup = ReadTime(easy, CURLINFO_NAMELOOKUP_TIME_T);
    facts.times.connection = ReadTime(easy, CURLINFO_CONNECT_TIME_T);
    facts.times.handshake = ReadTime(easy, CURLINFO_APPCONNECT_TIME_T);
    facts.times.firstByte = ReadTime(easy, CURLINFO_STARTTRANSFER_TIME_T);
    facts.times.end = ReadTime(easy, CURLINFO_TOTAL_TIME_T);
    return facts;
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
