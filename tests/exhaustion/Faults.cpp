#include "Faults.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <dirent.h>
#include <dlfcn.h>
#include <execinfo.h>
#include <fcntl.h>
#include <malloc.h>
#include <poll.h>
#include <pthread.h>
#include <sys/eventfd.h>
#include <sys/random.h>
#include <sys/socket.h>
#include <unistd.h>

extern "C" {
// NOLINTBEGIN(bugprone-reserved-identifier): the C library's own names for what it allocates with
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);
void* __libc_memalign(std::size_t alignment, std::size_t size);
void __libc_free(void* block);
// NOLINTEND(bugprone-reserved-identifier)
}

namespace Faults {

namespace {

constexpr int MaxFrames = 24;

struct Stack
{
    std::array<void*, MaxFrames> frames{};
    int depth = 0;
};

/** One block that was allocated while blocks are recorded. */
struct Record
{
    void* block = nullptr;
    Stack stack;
};

constexpr std::size_t MaxRecords = 1U << 16U;

constinit std::atomic<bool> isArmed{false};
constinit std::atomic<unsigned long> calls{0};
constinit std::atomic<long> blocks{0};
constinit std::atomic<FreeHook> freeHook{nullptr};
constinit Plan current;
constinit Stack latest;

constinit std::atomic<bool> isRecording{false};
constinit std::atomic_flag recordsAreTaken;
constinit std::array<Record, MaxRecords> records;
constinit std::size_t recordCount = 0;

constinit thread_local bool isExempt = false;

class RecordsLock
{
public:
    RecordsLock() noexcept
    {
        while (recordsAreTaken.test_and_set(std::memory_order_acquire)) {
        }
    }
    RecordsLock(const RecordsLock&) = delete;
    RecordsLock& operator=(const RecordsLock&) = delete;
    ~RecordsLock() { recordsAreTaken.clear(std::memory_order_release); }
};

Stack GetStack() noexcept
{
    Stack stack;
    stack.depth = backtrace(stack.frames.data(), MaxFrames);
    return stack;
}

/** The functions of the libraries; what has no exported name is told by its place in the file. */
std::string Describe(const Stack& stack)
{
    std::string text;
    for (int i = 2; i < stack.depth; ++i) {
        const char* const address = static_cast<char*>(stack.frames[static_cast<std::size_t>(i)]);
        Dl_info info{};
        if (dladdr(address, &info) == 0 || info.dli_fname == nullptr) {
            continue;
        }
        const std::string file = info.dli_fname;
        std::array<char, 32> place{};
        std::snprintf(
            place.data(), place.size(), "%#tx", address - static_cast<char*>(info.dli_fbase));
        text += "    " + file.substr(file.rfind('/') + 1) + " ";
        text += info.dli_sname != nullptr ? info.dli_sname : place.data();
        text += "\n";
    }
    return text;
}

void Note(void* block) noexcept
{
    const Exemption exemption;
    const RecordsLock lock;
    if (isRecording && recordCount < MaxRecords) {
        records[recordCount++] = {block, GetStack()};
    }
}

void Forget(const void* block) noexcept
{
    const RecordsLock lock;
    for (std::size_t i = recordCount; i > 0; --i) {
        if (records[i - 1].block == block) {
            records[i - 1] = records[--recordCount];
            return;
        }
    }
}

bool Has(const char* name, const char* part) noexcept
{
    return name != nullptr && std::strstr(name, part) != nullptr;
}

/** Whether a library or a function on the stack has `part` in its name. */
bool IsIn(const Stack& stack, const char* part) noexcept
{
    return std::any_of(
        stack.frames.begin(), stack.frames.begin() + stack.depth, [part](void* frame) {
            Dl_info info{};
            return dladdr(frame, &info) != 0
                   && (Has(info.dli_fname, part) || Has(info.dli_sname, part));
        });
}

/** Whether the failure is not spared; if so, it is remembered. */
bool IsInOrder() noexcept
{
    const Exemption exemption;
    const Stack stack = GetStack();
    if ((current.spared != nullptr && IsIn(stack, current.spared))
        || (current.only != nullptr && !IsIn(stack, current.only))) {
        return false;
    }
    latest = stack;
    return true;
}

bool MustFail(Kind kind) noexcept
{
    if (!isArmed.load(std::memory_order_acquire) || kind != current.kind || isExempt) {
        return false;
    }
    const unsigned long number = 1 + calls.fetch_add(1);
    const bool isLater = current.nth != 0 && current.fromThereOn && number > current.nth;
    return isLater || (number == current.nth && IsInOrder());
}

bool MustFailWithError(Kind kind) noexcept
{
    const bool fails = MustFail(kind);
    if (fails) {
        errno = current.error;
    }
    return fails;
}

bool AllocationFails() noexcept
{
    const bool fails = MustFail(Kind::ALLOCATION);
    if (fails) {
        errno = ENOMEM;
    }
    return fails;
}

void* Count(void* block) noexcept
{
    if (block != nullptr) {
        blocks.fetch_add(1, std::memory_order_relaxed);
        if (isRecording && !isExempt) {
            Note(block);
        }
    }
    return block;
}

void Free(void* block, const void* caller) noexcept
{
    if (block == nullptr) {
        return;
    }
    blocks.fetch_sub(1, std::memory_order_relaxed);
    if (isRecording && !isExempt) {
        Forget(block);
    }
    if (const FreeHook hook = freeHook) {
        hook(block, malloc_usable_size(block), caller);
    }
    __libc_free(block);
}

/** The function of that name in the library that has it without this program. */
template <class Function>
Function* Find(const char* name) noexcept
{
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

} // namespace

void Arm(const Plan& plan) noexcept
{
    current = plan;
    latest = {};
    calls = 0;
    isArmed.store(true, std::memory_order_release);
}

unsigned long Disarm() noexcept
{
    isArmed = false;
    return calls;
}

std::string DescribeLatest()
{
    return Describe(latest);
}

std::string DescribeHere()
{
    return Describe(GetStack());
}

long CountBlocks() noexcept
{
    return blocks;
}

void StartRecording() noexcept
{
    const RecordsLock lock;
    recordCount = 0;
    isRecording = true;
}

std::string StopRecording()
{
    const Exemption exemption;
    isRecording = false;
    const RecordsLock lock;
    std::string text;
    for (std::size_t i = 0; i < recordCount; ++i) {
        text += "  a block of\n" + Describe(records[i].stack);
    }
    return text;
}

Exemption::Exemption() noexcept
    : _before(isExempt)
{
    isExempt = true;
}

Exemption::~Exemption()
{
    isExempt = _before;
}

void SetFreeHook(FreeHook hook) noexcept
{
    freeHook = hook;
}

long CountDescriptors()
{
    DIR* const folder = opendir("/proc/self/fd");
    long count = -1; // the folder's own
    while (const dirent* entry = readdir(folder)) {
        count += entry->d_name[0] != '.' ? 1 : 0;
    }
    closedir(folder);
    return count;
}

} // namespace Faults

// ------------------------------------------------------------------------------ what stands before

using Faults::Kind;

extern "C" {

void* malloc(std::size_t size)
{
    return Faults::AllocationFails() ? nullptr : Faults::Count(__libc_malloc(size));
}

void* calloc(std::size_t count, std::size_t size)
{
    return Faults::AllocationFails() ? nullptr : Faults::Count(__libc_calloc(count, size));
}

void* realloc(void* block, std::size_t size)
{
    if (block == nullptr) {
        return malloc(size);
    }
    if (size == 0) {
        Faults::Free(block, __builtin_return_address(0));
        return nullptr;
    }
    if (Faults::AllocationFails()) {
        return nullptr;
    }
    // Always another block, so that what frees the old one is seen.
    void* const larger = Faults::Count(__libc_malloc(size));
    if (larger != nullptr) {
        std::memcpy(larger, block, std::min(size, malloc_usable_size(block)));
        Faults::Free(block, __builtin_return_address(0));
    }
    return larger;
}

void* reallocarray(void* block, std::size_t count, std::size_t size)
{
    return realloc(block, count * size);
}

void* memalign(std::size_t alignment, std::size_t size)
{
    return Faults::AllocationFails() ? nullptr : Faults::Count(__libc_memalign(alignment, size));
}

void* aligned_alloc(std::size_t alignment, std::size_t size)
{
    return memalign(alignment, size);
}

int posix_memalign(void** block, std::size_t alignment, std::size_t size)
{
    *block = memalign(alignment, size);
    return *block != nullptr ? 0 : ENOMEM;
}

void free(void* block)
{
    Faults::Free(block, __builtin_return_address(0));
}

ssize_t read(int descriptor, void* data, std::size_t size)
{
    static auto* const original = Faults::Find<decltype(read)>("read");
    return Faults::MustFailWithError(Kind::READ) ? -1 : original(descriptor, data, size);
}

ssize_t write(int descriptor, const void* data, std::size_t size)
{
    static auto* const original = Faults::Find<decltype(write)>("write");
    return Faults::MustFailWithError(Kind::WRITE) ? -1 : original(descriptor, data, size);
}

ssize_t send(int descriptor, const void* data, std::size_t size, int flags)
{
    static auto* const original = Faults::Find<decltype(send)>("send");
    return Faults::MustFailWithError(Kind::SEND) ? -1 : original(descriptor, data, size, flags);
}

ssize_t sendto(
    int descriptor,
    const void* data,
    std::size_t size,
    int flags,
    const sockaddr* address,
    socklen_t length)
{
    static auto* const original = Faults::Find<decltype(sendto)>("sendto");
    return Faults::MustFailWithError(Kind::SEND)
               ? -1
               : original(descriptor, data, size, flags, address, length);
}

ssize_t sendmsg(int descriptor, const msghdr* message, int flags)
{
    static auto* const original = Faults::Find<decltype(sendmsg)>("sendmsg");
    return Faults::MustFailWithError(Kind::SEND) ? -1 : original(descriptor, message, flags);
}

ssize_t recv(int descriptor, void* data, std::size_t size, int flags)
{
    static auto* const original = Faults::Find<decltype(recv)>("recv");
    return Faults::MustFailWithError(Kind::RECEIVE) ? -1 : original(descriptor, data, size, flags);
}

int socket(int family, int type, int protocol)
{
    static auto* const original = Faults::Find<decltype(socket)>("socket");
    return Faults::MustFailWithError(Kind::SOCKET) ? -1 : original(family, type, protocol);
}

int socketpair(int family, int type, int protocol, int ends[2])
{
    static auto* const original = Faults::Find<decltype(socketpair)>("socketpair");
    return Faults::MustFailWithError(Kind::SOCKET) ? -1 : original(family, type, protocol, ends);
}

int eventfd(unsigned count, int flags)
{
    static auto* const original = Faults::Find<decltype(eventfd)>("eventfd");
    return Faults::MustFailWithError(Kind::SOCKET) ? -1 : original(count, flags);
}

int connect(int descriptor, const sockaddr* address, socklen_t length)
{
    static auto* const original = Faults::Find<decltype(connect)>("connect");
    return Faults::MustFailWithError(Kind::CONNECT) ? -1 : original(descriptor, address, length);
}

int poll(pollfd* descriptors, nfds_t count, int timeout)
{
    static auto* const original = Faults::Find<decltype(poll)>("poll");
    return Faults::MustFailWithError(Kind::POLL) ? -1 : original(descriptors, count, timeout);
}

// NOLINTNEXTLINE(bugprone-reserved-identifier): what `poll` becomes in hardened programs
int __poll_chk(pollfd* descriptors, nfds_t count, int timeout, std::size_t /*size*/)
{
    return poll(descriptors, count, timeout);
}

int pthread_create(
    pthread_t* thread, const pthread_attr_t* attributes, void* (*start)(void*), void* argument)
{
    static auto* const original = Faults::Find<decltype(pthread_create)>("pthread_create");
    return Faults::MustFailWithError(Kind::THREAD) ? EAGAIN
                                                   : original(thread, attributes, start, argument);
}

ssize_t getrandom(void* data, std::size_t size, unsigned flags)
{
    static auto* const original = Faults::Find<decltype(getrandom)>("getrandom");
    return Faults::MustFailWithError(Kind::RANDOM) ? -1 : original(data, size, flags);
}

int getentropy(void* data, std::size_t size)
{
    static auto* const original = Faults::Find<decltype(getentropy)>("getentropy");
    return Faults::MustFailWithError(Kind::RANDOM) ? -1 : original(data, size);
}

int open(const char* path, int flags, ...) // NOLINT(cert-dcl50-cpp): it is declared like this
{
    static auto* const original = Faults::Find<decltype(open)>("open");
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(rest, mode_t) : 0;
    va_end(rest);
    return Faults::MustFailWithError(Kind::OPEN) ? -1 : original(path, flags, mode);
}

int open64(const char* path, int flags, ...) // NOLINT(cert-dcl50-cpp): it is declared like this
{
    static auto* const original = Faults::Find<decltype(open64)>("open64");
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(rest, mode_t) : 0;
    va_end(rest);
    return Faults::MustFailWithError(Kind::OPEN) ? -1 : original(path, flags, mode);
}

FILE* fopen(const char* path, const char* mode)
{
    static auto* const original = Faults::Find<decltype(fopen)>("fopen");
    return Faults::MustFailWithError(Kind::OPEN) ? nullptr : original(path, mode);
}

FILE* fopen64(const char* path, const char* mode)
{
    static auto* const original = Faults::Find<decltype(fopen64)>("fopen64");
    return Faults::MustFailWithError(Kind::OPEN) ? nullptr : original(path, mode);
}

} // extern "C"
