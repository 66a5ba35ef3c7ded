#pragma once

#include "quillon/Exceptions.h"

#include <string>

/** Class and text of what `operation` throws, as "class: text"; "none" if it throws nothing. */
template <class Operation>
std::string GetFailure(const Operation& operation)
{
    try {
        operation();
    } catch (const std::exception& error) {
        return Quillon::GetClassName(error) + ": " + error.what();
    }
    return "none";
}
