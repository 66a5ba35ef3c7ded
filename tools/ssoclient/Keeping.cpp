#include "Keeping.h"

#include "ExitCode.h"
#include "FollowUp.h"
#include "KeepRecord.h"
#include "KeepSpeech.h"
#include "MetricsServer.h"
#include "ReplacedFile.h"
#include "ServiceManager.h"
#include "SignalReader.h"
#include "StatusMailbox.h"

#include "quillon/MessageFormatter.h"
#include "quillon/service/Logger.h"
#include "quillon/system/Clock.h"

#include <algorithm>
#include <csignal>
#include <memory>
#include <utility>
#include <vector>

#include <poll.h>

using Quillon::MessageFormatter;
using Quillon::System::DateTime;
using Quillon::System::GetUtcDateTime;
using SsoClient::TokenSourceStatus;

namespace {

using Clock = std::chrono::steady_clock;

constexpr mode_t SecretMode = 0600;
constexpr mode_t StatusMode = 0644;

/** When it is tried again to write a token, for example to a disk that was full. */
constexpr std::chrono::seconds RewriteWait(10);

constexpr long long MicrosPerSecond = 1'000'000;

/** The time, or that there is none. */
std::string Describe(const std::optional<DateTime>& time, const char* before)
{
    return time ? before + time->ToString() : std::string();
}

/** Each failure is told by this program; with `--verbose` the library's line may stand beside it.
 */
void KeepLibrarySilent()
{
    Quillon::Service::GetApp()
        ->GetLogFacility()
        .GetLogger("SsoClient")
        ->SetLevel(Quillon::Service::LOG_LEVEL_WARNING - 1);
}

class Keeping
{
public:
    Keeping(
        const KeepOptions& options,
        const Presentation& presentation,
        const ExchangeRecord& exchanges);
    Keeping(const Keeping&) = delete;
    Keeping& operator=(const Keeping&) = delete;

    void Run();

private:
    void MakeMetricsServer(const KeepOptions& options);
    SsoClient::TokenSourceOptions MakeSourceOptions(const KeepOptions& options) const;

    void Wait() const;
    int GetWaitMs(std::optional<Clock::time_point> end) const;
    void TakeSignals();
    void TakeStatuses();
    void Take(const TokenSourceStatus& status);
    void Refresh();
    void KeepAlive();
    void WriteDueToken();
    void NoteFailure(const std::exception& failure, const DateTime& since);
    void TellWritten();
    void WriteStatus() const;
    void TellProblem(const std::optional<std::string>& problem) const;

    const KeepSpeech _speech;
    const ReplacedFile _file;
    std::optional<ReplacedFile> _statusFile;
    KeepRecord _record;
    ServiceManager _manager;
    std::optional<MetricsServer> _metrics;

    const std::shared_ptr<StatusMailbox> _mailbox = std::make_shared<StatusMailbox>();
    boost::shared_ptr<SsoClient::TokenSource> _source;
    const SignalReader _signals; // from here on they are blocked: no more questions to the user
    FollowUp _followUp;

    boost::shared_ptr<const SsoClient::SamlToken> _token; // the newest
    std::optional<Clock::time_point> _writeDue;           // of it
    std::optional<DateTime> _unwrittenSince;              // since when it cannot be
    Clock::time_point _aliveDue = Clock::now();
    bool _isReloading = false;
    bool _isOver = false;
};

Keeping::Keeping(
    const KeepOptions& options, const Presentation& presentation, const ExchangeRecord& exchanges)
    : _speech(presentation, exchanges)
    , _file(options.file, SecretMode)
    , _manager([speech = _speech](const std::string& text) { speech.TellProblem(text); })
    , _source(options.source.Make(MakeSourceOptions(options)))
    , _followUp(options.shellCommand, options.file, _signals.GetBefore())
{
    if (!options.source.service.verbose) {
        KeepLibrarySilent();
    }
    if (!options.statusFile.empty()) {
        _statusFile.emplace(options.statusFile, StatusMode);
        _statusFile->Write(_record.ToJson(2) + "\n");
    }
    if (!options.metricsAddress.empty()) {
        MakeMetricsServer(options);
    }
}

SsoClient::TokenSourceOptions Keeping::MakeSourceOptions(const KeepOptions& options) const
{
    constexpr double Percent = 100;
    long long percent = 0;
    ToNumber(options.refreshPercent, percent);
    SsoClient::TokenSourceOptions made;
    made.refreshAt = static_cast<double>(percent) / Percent;
    // Those who read the file judge how much validity they need.
    made.minRemainingValidity = std::chrono::milliseconds(0);
    made.observer = [mailbox = _mailbox](const TokenSourceStatus& status) { mailbox->Put(status); };
    return made;
}

void Keeping::MakeMetricsServer(const KeepOptions& options)
{
    const ListenAddress address = *ParseListenAddress(options.metricsAddress);
    if (!address.isLoopback && !options.metricsAnywhere) {
        throw UsageError("--metrics: other machines could ask at this address; use one of "
                         "127.0.0.0/8 or [::1], or say --metrics-anywhere");
    }
    _metrics.emplace(address, [this] { return _record.ToMetrics(); });
    _speech.TellNews("metrics are at " + _metrics->GetUrl());
}

void Keeping::Run()
{
    _source->Refresh();
    while (!_isOver) {
        Wait();
        TakeSignals();
        TakeStatuses();
        WriteDueToken();
        KeepAlive();
        if (_metrics) {
            _metrics->Serve();
        }
    }
    _manager.TellStopping();
    _source.reset(); // an exchange that is under way is called off when the process ends
}

void Keeping::Wait() const
{
    std::vector<pollfd> waits = {
        {_signals.GetDescriptor(), POLLIN, 0}, {_mailbox->GetDescriptor(), POLLIN, 0}};
    std::optional<Clock::time_point> end = _writeDue;
    if (_metrics) {
        const auto earlier = _metrics->AddTo(waits);
        end = earlier ? std::min(end.value_or(*earlier), *earlier) : end;
    }
    if (_manager.GetAlivePeriod()) {
        end = std::min(end.value_or(_aliveDue), _aliveDue);
    }
    ::poll(waits.data(), waits.size(), GetWaitMs(end));
}

/** Never too short, so that nothing is looked at in vain. */
int Keeping::GetWaitMs(std::optional<Clock::time_point> end) const
{
    constexpr std::chrono::milliseconds Longest(60'000);
    if (!end) {
        return -1;
    }
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(*end - Clock::now());
    return static_cast<int>(std::clamp(left, std::chrono::milliseconds(0), Longest).count());
}

void Keeping::TakeSignals()
{
    while (const int signal = _signals.Read()) {
        if (signal == SIGHUP) {
            Refresh();
        } else if (signal == SIGCHLD) {
            TellProblem(_followUp.OnChildEnded());
        } else {
            _isOver = true;
        }
    }
}

/** A manager that has asked for it waits until what came of it is known. */
void Keeping::Refresh()
{
    if (_record.refreshes > 0) {
        _isReloading = true;
        _manager.TellReloading();
    }
    _source->Refresh();
}

void Keeping::TakeStatuses()
{
    for (const TokenSourceStatus& status : _mailbox->Take()) {
        Take(status);
    }
}

/** Without a failure and without another token, it was a renewal that an acquisition follows. */
void Keeping::Take(const TokenSourceStatus& status)
{
    _record.nextAttempt = status.nextAttempt;
    if (status.outage.reason) {
        NoteFailure(*status.outage.reason, status.outage.since.value_or(GetUtcDateTime()));
    } else if (status.token && status.token != _token) {
        _token = status.token;
        _writeDue = Clock::now();
        WriteDueToken();
    }
}

void Keeping::WriteDueToken()
{
    if (!_writeDue || Clock::now() < *_writeDue) {
        return;
    }
    try {
        _file.Write(_token->ToXml());
    } catch (const UsageError& failure) {
        _writeDue = Clock::now() + RewriteWait;
        _unwrittenSince = _unwrittenSince.value_or(GetUtcDateTime());
        _record.nextAttempt = Quillon::System::DateTimeFromUtc(
            GetUtcDateTime().GetUtcTime() + RewriteWait.count() * MicrosPerSecond, false);
        NoteFailure(failure, *_unwrittenSince);
        return;
    }
    _writeDue.reset();
    _unwrittenSince.reset();
    _record.NoteToken(*_token);
    TellWritten();
    TellProblem(_followUp.Run());
}

void Keeping::TellWritten()
{
    const std::string text = MessageFormatter::ASPrint(
        "a new token of %1@%2 is in `%3', valid until %4%5",
        _record.token->subjectName,
        _record.token->subjectDomain,
        _file.GetPath(),
        _record.token->validUntil.ToString(),
        Describe(_record.nextAttempt, "; another is asked for at "));
    WriteStatus();
    _speech.TellToken(_record, text);
    _manager.TellReady(text);
    _isReloading = false;
}

void Keeping::NoteFailure(const std::exception& failure, const DateTime& since)
{
    _record.NoteFailure(failure, since);
    const std::string text = MessageFormatter::ASPrint(
        "%1: %2%3",
        _record.failure->className,
        _record.failure->message,
        Describe(_record.nextAttempt, "; the next attempt is at "));
    WriteStatus();
    _speech.TellFailure(_record, text, failure);
    if (std::exchange(_isReloading, false)) {
        _manager.TellReady(text);
    } else {
        _manager.TellStatus(text);
    }
}

void Keeping::WriteStatus() const
{
    if (!_statusFile) {
        return;
    }
    try {
        _statusFile->Write(_record.ToJson(2) + "\n");
    } catch (const UsageError& failure) {
        _speech.TellProblem(failure.what());
    }
}

void Keeping::TellProblem(const std::optional<std::string>& problem) const
{
    if (problem) {
        _speech.TellProblem(*problem);
    }
}

void Keeping::KeepAlive()
{
    const auto& period = _manager.GetAlivePeriod();
    if (period && Clock::now() >= _aliveDue) {
        _manager.TellAlive();
        _aliveDue = Clock::now() + *period;
    }
}

} // namespace

void Keep(
    const KeepOptions& options, const Presentation& presentation, const ExchangeRecord& exchanges)
{
    options.RequireDistinctFiles();
    Keeping(options, presentation, exchanges).Run();
}
