#include "Terminal.h"

#include "OneLine.h"

#include <iostream>

#include <unistd.h>

bool IsTerminal()
{
    return ::isatty(STDERR_FILENO) == 1;
}

void Notice(const std::string& text)
{
    std::cerr << ToOneLine("ssoclient: " + text) + "\n" << std::flush;
}
