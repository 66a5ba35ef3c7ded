#pragma once

#include "CommandLine.h"
#include "ExchangeRecord.h"
#include "KeepSource.h"

#include <string>

/** What `ssoclient keep` is told. */
struct KeepOptions
{
    KeepSourceOptions source;
    std::string file; ///< of the token
    std::string statusFile;
    std::string shellCommand; ///< to be run after each new token
    std::string metricsAddress;
    bool metricsAnywhere = false;
    std::string refreshPercent = "70";

    void AddTo(const Command& command, ExchangeRecord& record);

    /** @throws UsageError  one file would have to be two, or none. */
    void RequireDistinctFiles() const;
};
