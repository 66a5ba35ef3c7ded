#pragma once

#include <string>

/**
 * Stands in for the network: a connection of TCP over IPv4 that the process opens is one end of a
 * local pair of sockets, whose other end holds all that the server will ever say. `socket` and
 * `connect` of the C library stand aside for those of this unit.
 *
 * Thread safety: one connection at a time; the script stays as it is while there is one.
 */
namespace ScriptedConnection {

/** What fits into a socket at once. */
constexpr std::size_t LargestScript = 60'000;

/** Sets what the server says on each further connection; null for the network as it is. */
void Play(const std::string* script) noexcept;

} // namespace ScriptedConnection
