#pragma once

#include "ssoClient/TokenSpec.h"

#include <CLI/App.hpp>

/** The options that say what kind of token is wanted; `spec` holds the outcome. */
struct TokenSpecOptions
{
    SsoClient::TokenSpec spec;

    void AddTo(CLI::App& command);

    /** Adds `--bearer`, for the commands that may ask for either kind of confirmation. */
    void AddBearerTo(CLI::App& command);
};
