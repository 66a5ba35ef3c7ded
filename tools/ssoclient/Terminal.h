#pragma once

#include <string>

/** Whether somebody reads standard error at a terminal. */
bool IsTerminal();

/** Writes the line `ssoclient: TEXT` to standard error. */
void Notice(const std::string& text);
