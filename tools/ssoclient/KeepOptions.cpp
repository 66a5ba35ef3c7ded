#include "KeepOptions.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "MetricsServer.h"

namespace {

std::string CheckPercent(const std::string& text)
{
    constexpr long long Least = 1;
    constexpr long long Most = 90; // a tenth later is still before the end
    long long percent = 0;
    return ToNumber(text, percent) && percent >= Least && percent <= Most
               ? ""
               : "`" + text + "' is not a number from 1 to 90";
}

std::string CheckListenAddress(const std::string& text)
{
    return ParseListenAddress(text)
               ? ""
               : "`" + text + "' is not HOST:PORT with the address of a host, or localhost";
}

} // namespace

void KeepOptions::AddTo(const Command& command, ExchangeRecord& record)
{
    command.AddOption("FILE", file, "File to keep the token in (mode 0600)")
        .Required()
        .Check(CheckNotEmpty)
        .ValueName("");
    source.AddTo(command, record);
    const Command keeping = command.InGroup("How it is kept");
    keeping
        .AddOption(
            "--refresh-at",
            refreshPercent,
            "After how much of its lifetime a token is refreshed, in percent; a tenth of that "
            "earlier or later")
        .Check(CheckPercent)
        .ValueName("PERCENT")
        .ShowDefault();
    keeping
        .AddOption(
            "--exec",
            shellCommand,
            "Shell command to run after each new token; SSOCLIENT_TOKEN_FILE names the file")
        .Check(CheckNotEmpty)
        .ValueName("COMMAND");
    keeping
        .AddOption(
            "--status",
            statusFile,
            "Write how it stands to this file, as JSON without anything secret (mode 0644)")
        .Check(CheckNotEmpty)
        .ValueName("FILE");
    keeping
        .AddOption(
            "--metrics",
            metricsAddress,
            "Answer GET /metrics there, for Prometheus; HOST is an address of this machine's "
            "loopback, PORT may be 0 for any")
        .Check(CheckListenAddress)
        .ValueName("HOST:PORT");
    keeping.AddFlag(
        "--metrics-anywhere", metricsAnywhere, "Let other machines ask for the metrics");
}

void KeepOptions::RequireDistinctFiles() const
{
    if (file == "-" || statusFile == "-") {
        throw UsageError("a token is kept in a file, not on standard output");
    }
    if (file == statusFile) {
        throw UsageError("--status: that is the file of the token");
    }
}
