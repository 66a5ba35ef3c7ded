#pragma once

#include <cstddef>
#include <string>

/**
 * Failures on order. This program's own malloc, socket, open and their like stand before those of
 * the C library, for all libraries that are loaded, and fail when they are told to. What the C
 * library calls inside itself does not come by here.
 */
namespace Faults {

enum class Kind
{
    ALLOCATION,
    READ,
    WRITE,
    SEND,
    RECEIVE,
    SOCKET, ///< and whatever else makes a descriptor that is no file
    CONNECT,
    POLL,
    THREAD,
    RANDOM,
    OPEN,
};

/** Which call fails, counted from one over all threads from `Arm` on. */
struct Plan
{
    Kind kind = Kind::ALLOCATION;
    unsigned long nth = 0; ///< 0: none, they are only counted
    bool fromThereOn = false;
    int error = 0;                ///< what errno is; without a meaning for allocations
    const char* spared = nullptr; ///< a library or function in which nothing fails; null for none
    const char* only = nullptr;   ///< the one in which alone something fails
};

void Arm(const Plan& plan) noexcept;

/** @return how many calls of the kind there were. */
unsigned long Disarm() noexcept;

/** Where the latest failure was made to happen, one function a line; empty if it was spared. */
std::string DescribeLatest();

/** Where the calling thread is. */
std::string DescribeHere();

/** How many blocks of memory are in use. */
long CountBlocks() noexcept;

/** Remembers where blocks come from, until `StopRecording`. */
void StartRecording() noexcept;

/** @return the blocks of the time since that are still in use, one function a line. */
std::string StopRecording();

/** What this thread calls during its life does not fail and is not counted. */
class Exemption
{
public:
    Exemption() noexcept;
    Exemption(const Exemption&) = delete;
    Exemption& operator=(const Exemption&) = delete;
    ~Exemption();

private:
    const bool _before;
};

/** Is shown each block before it is freed, and may change it; null for none. Allocates nothing. */
using FreeHook = void (*)(void* block, std::size_t size, const void* caller);
void SetFreeHook(FreeHook hook) noexcept;

/** How many descriptors are open. */
long CountDescriptors();

} // namespace Faults
