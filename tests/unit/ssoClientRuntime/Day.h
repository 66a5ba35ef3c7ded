#pragma once

#include "ScriptedService.h"
#include "VirtualEnvironment.h"

#include "quillon/Wiped.h"
#include "ssoClientRuntime/TokenSource.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <map>
#include <random>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;

inline constexpr std::string_view Secret = "a password that is like nothing else in this process";

/**
 * A day of a source whose service fails, whose clock is set, whose machine sleeps, and whose tokens
 * are refused, all at random. What must hold whatever happens is looked at all the time.
 */
class Day
{
public:
    explicit Day(unsigned seed)
        : _engine(seed)
    {
        _environment->Seed(seed);
        _service->before = [this] { MeetTheService(); };
        _service->seePassword = [this](const std::string& password) {
            EXPECT_TRUE(password == _password);
        };
        TokenSourceOptions options;
        options.environment = _environment;
        options.observer = [this](const TokenSourceStatus& status) { CheckWait(status); };
        _source = CreatePasswordTokenSource(
            _service,
            [this] { return PasswordCredentials("alice", _password); },
            TokenSpec(),
            options);
    }

    Day(const Day&) = delete;
    Day& operator=(const Day&) = delete;
    ~Day() { Quillon::Wipe(_password); }

    void Live()
    {
        const auto end = _environment->In(24h);
        while (_environment->GetSteadyTime() < end) {
            HaveSomethingHappen();
            _environment->Pass(std::chrono::milliseconds(Draw(1, 120'000)));
            CheckToken();
        }
        _source.reset();
        _environment->Pass(1h);
        EXPECT_EQ(_asked, _told) << "completions";
    }

    int given = 0;
    int refused = 0;
    std::size_t CountCalls() const { return _service->calls.size(); }

private:
    enum class Weather
    {
        FINE,
        NO_CONNECTION,
        WRONG_PASSWORD
    };

    long long Draw(long long low, long long high)
    {
        return std::uniform_int_distribution<long long>(low, high)(_engine);
    }

    void MeetTheService()
    {
        _environment->Move(std::chrono::milliseconds(Draw(1, 5'000)));
        EXPECT_EQ(1, _service->underWay);
        _attemptsAt.push_back(_environment->GetSteadyTime());
        if (_weather == Weather::NO_CONNECTION) {
            throw Quillon::Http::TimeoutException("no answer");
        }
        if (_weather == Weather::WRONG_PASSWORD) {
            throw InvalidCredentialsException("wrong password");
        }
        _service->clockAhead = std::chrono::seconds(Draw(-100, 100));
        _issuedAt["_" + std::to_string(CountCalls())] = _environment->GetSteadyTime();
    }

    void HaveSomethingHappen()
    {
        switch (Draw(0, 60)) {
        case 0:
            _environment->StepWall(std::chrono::seconds(Draw(-7'200, 7'200)));
            break;
        case 1:
            _environment->StepWall(std::chrono::seconds(Draw(60, 3'600))); // sleeps
            break;
        case 2:
            if (const Token token = _source->GetStatus().token) {
                _source->Invalidate(token->GetId());
                _invalid.push_back(token->GetId());
            }
            break;
        case 3:
            _source->Refresh();
            _hasChanged = true;
            break;
        case 4:
        case 5:
            _weather = Weather::NO_CONNECTION;
            break;
        case 6:
            _weather = Weather::WRONG_PASSWORD;
            break;
        case 7:
        case 8:
        case 9:
        case 10:
            _weather = Weather::FINE;
            break;
        default:
            Ask();
        }
    }

    void Ask()
    {
        ++_asked;
        _source->GetTokenAsync([this](const Token& token, const Quillon::Exception* error) {
            ++_told;
            EXPECT_NE(token == nullptr, error == nullptr);
        });
    }

    /** By our clock, and by the time that has gone by since it was issued. */
    void CheckToken()
    {
        try {
            const Token token = _source->GetToken(_environment->GetSteadyTime());
            ++given;
            const auto left =
                token->GetEndDate().GetUtcTime() - _environment->GetWallTime().GetUtcTime();
            ASSERT_GE(left, 60'000'000);
            ASSERT_LE(_environment->GetSteadyTime() - _issuedAt.at(token->GetId()), 59min);
            ASSERT_EQ(0, std::count(_invalid.begin(), _invalid.end(), token->GetId()));
        } catch (const NoTokenException& error) {
            ++refused;
            ASSERT_TRUE(error.GetOutage().reason || _source->GetStatus().isBusy) << error.what();
        }
    }

    void CheckWait(const TokenSourceStatus& status)
    {
        const auto& next = status.outage.nextAttempt;
        if (next && !_hasChanged) {
            const auto wait = Span(next->GetUtcTime() - _environment->GetWallTime().GetUtcTime());
            EXPECT_GE(wait, Span(1s));
            EXPECT_LE(wait, Span(15min));
            if (_weather == Weather::WRONG_PASSWORD) {
                EXPECT_GE(wait, Span(1min));
            }
        }
        _hasChanged = false;
    }

    std::mt19937 _engine;
    std::string _password{Secret};
    boost::shared_ptr<VirtualEnvironment> _environment = boost::make_shared<VirtualEnvironment>();
    boost::shared_ptr<ScriptedService> _service = boost::make_shared<ScriptedService>(_environment);
    boost::shared_ptr<TokenSource> _source;
    Weather _weather = Weather::FINE;
    bool _hasChanged = false;
    std::map<std::string, VirtualEnvironment::TimePoint> _issuedAt;
    std::vector<VirtualEnvironment::TimePoint> _attemptsAt;
    std::vector<std::string> _invalid;
    int _asked = 0;
    int _told = 0;
};

} // namespace Testing
