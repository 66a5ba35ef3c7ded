#pragma once

#include "CommandDescription.h"

#include <string>

// Scripts that complete commands, options and the names of files for a shell.

std::string WriteBashCompletion(const CommandDescription& program);
std::string WriteZshCompletion(const CommandDescription& program);
std::string WriteFishCompletion(const CommandDescription& program);
