#include "NameLookup.h"

#include <condition_variable>
#include <csignal>
#include <cstring>
#include <dlfcn.h>
#include <mutex>
#include <netdb.h>

namespace {

std::mutex lookupMutex;
std::condition_variable lookupChanged;
bool isBlocked = false;
int waiting = 0;
Testing::NameLookup::Lookup latest;

/** The end of a list of addresses, where more can be added. */
addrinfo*& GetEnd(addrinfo& list)
{
    addrinfo** end = &list.ai_next;
    while (*end != nullptr) {
        end = &(*end)->ai_next;
    }
    return *end;
}

} // namespace

namespace Testing::NameLookup {

Block::Block()
{
    const std::lock_guard<std::mutex> lock(lookupMutex);
    isBlocked = true;
}

Block::~Block()
{
    std::unique_lock<std::mutex> lock(lookupMutex);
    isBlocked = false;
    lookupChanged.notify_all();
    lookupChanged.wait(lock, [] { return waiting == 0; });
}

Lookup Block::WaitUntilAsked()
{
    std::unique_lock<std::mutex> lock(lookupMutex);
    lookupChanged.wait(lock, [] { return waiting > 0; });
    return latest;
}

bool AreSignalsBlocked()
{
    sigset_t mask;
    pthread_sigmask(SIG_SETMASK, nullptr, &mask);
    return sigismember(&mask, SIGPIPE) == 1 && sigismember(&mask, SIGINT) == 1
           && sigismember(&mask, SIGTERM) == 1 && sigismember(&mask, SIGCHLD) == 1;
}

} // namespace Testing::NameLookup

// Stands in for the C library's: the tests depend on no name server.
extern "C" __attribute__((visibility("default"))) int getaddrinfo(
    const char* node, const char* service, const addrinfo* hints, addrinfo** result)
{
    if (node != nullptr && std::strcmp(node, Testing::NameLookup::UnknownHost) == 0) {
        return EAI_NONAME;
    }
    if (node != nullptr && std::strcmp(node, Testing::NameLookup::BlockedHost) == 0) {
        std::unique_lock<std::mutex> lock(lookupMutex);
        ++waiting;
        latest.withoutSignals = Testing::NameLookup::AreSignalsBlocked();
        lookupChanged.notify_all();
        lookupChanged.wait(lock, [] { return !isBlocked; });
        --waiting;
        lookupChanged.notify_all();
        return EAI_NONAME;
    }
    static const auto original =
        reinterpret_cast<decltype(&getaddrinfo)>(dlsym(RTLD_NEXT, "getaddrinfo"));
    if (node != nullptr && std::strcmp(node, Testing::NameLookup::TwoAddressHost) == 0) {
        const int error = original("127.0.0.2", service, hints, result);
        return error != 0 ? error : original("127.0.0.1", service, hints, &GetEnd(**result));
    }
    return original(node, service, hints, result);
}
