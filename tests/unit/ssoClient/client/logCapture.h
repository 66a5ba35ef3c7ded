#pragma once

#include "ssoClient/client/logging.h"

#include <string>
#include <vector>

/** Takes the lines of the library's logger, at `level`, as long as it lives. */
class LogCapture
{
public:
    explicit LogCapture(int level)
        : _levelBefore(SsoClient::getLogger()->GetLevel())
    {
        SsoClient::getLogger()->SetLevel(level);
        Quillon::Service::GetApp()->GetLogFacility().SetSink(
            [this](const std::string& logger, int lineLevel, const std::string& text) {
                lines.push_back(logger + "[" + std::to_string(lineLevel) + "]: " + text);
            });
    }
    LogCapture(const LogCapture&) = delete;
    LogCapture& operator=(const LogCapture&) = delete;
    ~LogCapture()
    {
        Quillon::Service::GetApp()->GetLogFacility().SetSink(Quillon::Service::LogSink());
        SsoClient::getLogger()->SetLevel(_levelBefore);
    }

    std::vector<std::string> lines;

private:
    int _levelBefore;
};
