#pragma once

#include "CommandLine.h"

#include "ssoClient/TokenSpec.h"

/** The options that say what kind of token is wanted; `spec` holds the outcome. */
struct TokenSpecOptions
{
    SsoClient::TokenSpec spec;

    void AddTo(const Command& command);

    /** Adds `--bearer`, for the commands that may ask for either kind of confirmation. */
    void AddBearerTo(const Command& command);
};
