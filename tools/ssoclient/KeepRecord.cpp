#include "KeepRecord.h"

#include "OneLine.h"

#include "quillon/Exceptions.h"
#include "quillon/system/Clock.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstdio>

using Json = nlohmann::ordered_json;
using Quillon::System::DateTime;
using Quillon::System::GetUtcDateTime;

namespace {

Json ToJson(const std::optional<DateTime>& time)
{
    return time ? Json(time->ToString()) : Json();
}

Json ToJson(const std::optional<KeepRecord::Token>& token)
{
    if (!token) {
        return {};
    }
    Json json;
    json["id"] = token->id;
    json["subject"] = {{"name", token->subjectName}, {"domain", token->subjectDomain}};
    json["validUntil"] = token->validUntil.ToString();
    return json;
}

Json ToJson(const std::optional<KeepRecord::Failure>& failure)
{
    if (!failure) {
        return {};
    }
    Json json;
    json["class"] = failure->className;
    json["message"] = failure->message;
    json["since"] = failure->since.ToString();
    return json;
}

std::string ToSeconds(long long micros)
{
    constexpr double MicrosPerSecond = 1e6;
    char text[32];
    std::snprintf(text, sizeof text, "%.3f", static_cast<double>(micros) / MicrosPerSecond);
    return text;
}

/** A metric with its two comment lines and, for each pair of labels and value, a line. */
std::string WriteMetric(
    const std::string& name,
    const std::string& type,
    const std::string& help,
    const std::map<std::string, std::string>& values)
{
    const std::string full = "ssoclient_keep_" + name;
    std::string text = "# HELP " + full + " " + help + "\n# TYPE " + full + " " + type + "\n";
    for (const auto& [labels, value] : values) {
        text.append(full).append(labels).append(" ").append(value).append("\n");
    }
    return text;
}

} // namespace

void KeepRecord::NoteToken(const SsoClient::SamlToken& kept)
{
    const SsoClient::PrincipalId& subject = kept.GetSubject();
    token = {kept.GetId(), subject.GetName(), subject.GetDomain(), kept.GetEndDate()};
    failure.reset();
    lastSuccess = GetUtcDateTime();
    ++refreshes;
}

void KeepRecord::NoteFailure(const std::exception& error, const DateTime& since)
{
    failure = {Quillon::GetClassName(error), Shorten(error.what(), MaxMessageBytes), since};
    ++failuresByClass[failure->className];
}

std::string KeepRecord::ToJson(int indent) const
{
    Json json;
    json["token"] = ::ToJson(token);
    json["lastSuccess"] = ::ToJson(lastSuccess);
    json["error"] = ::ToJson(failure);
    json["nextAttempt"] = ::ToJson(nextAttempt);
    json["updated"] = GetUtcDateTime().ToString();
    return json.dump(indent, ' ', true, Json::error_handler_t::replace);
}

std::string KeepRecord::ToMetrics() const
{
    const long long left =
        token ? token->validUntil.GetUtcTime() - GetUtcDateTime().GetUtcTime() : 0;
    std::map<std::string, std::string> failures;
    for (const auto& [className, count] : failuresByClass) {
        failures["{class=\"" + className + "\"}"] = std::to_string(count);
    }
    return WriteMetric(
               "up", "gauge", "Whether the file has a valid token.", {{"", left > 0 ? "1" : "0"}})
           + WriteMetric(
               "refreshes_total",
               "counter",
               "Tokens that were written to the file.",
               {{"", std::to_string(refreshes)}})
           + WriteMetric("failures_total", "counter", "Failures, by their class.", failures)
           + WriteMetric(
               "token_validity_seconds",
               "gauge",
               "What is left of the token's validity; 0 without one.",
               {{"", ToSeconds(std::max(left, 0LL))}})
           + WriteMetric(
               "last_success_timestamp_seconds",
               "gauge",
               "When the file was last written, since 1970; 0 for never.",
               {{"", ToSeconds(lastSuccess ? lastSuccess->GetUtcTime() : 0)}});
}
