#include "Operations.h"

#include "support/TestData.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <dlfcn.h>
#include <fcntl.h>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

#include <openssl/core_names.h>
#include <openssl/pem.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace Exhaustion;

// After an operation the process's own memory is searched for the password and the private key that
// it was done with.

namespace {

/** What is in memory only in disguise, but for the copies that are looked for. */
class Needle
{
public:
    static constexpr unsigned char Mask = 0x5A;

    explicit Needle(std::string bytes)
        : _masked(std::move(bytes))
    {
        for (char& byte : _masked) {
            byte = static_cast<char>(byte ^ Mask);
        }
    }

    std::size_t GetSize() const { return _masked.size(); }

    static Needle FromMasked(const std::string& masked)
    {
        Needle needle("");
        needle._masked = masked;
        return needle;
    }

    bool IsAt(const char* place) const
    {
        for (std::size_t i = 0; i < _masked.size(); ++i) {
            if ((place[i] ^ Mask) != _masked[i]) {
                return false;
            }
        }
        return true;
    }

    /** How many copies there are in a piece of memory. */
    unsigned Count(const char* memory, std::size_t size) const
    {
        unsigned count = 0;
        const char first = static_cast<char>(_masked[0] ^ Mask);
        const char* const end = memory + size;
        for (const char* at = memory; at < end; ++at) {
            at = static_cast<const char*>(
                std::memchr(at, first, static_cast<std::size_t>(end - at)));
            if (at == nullptr || static_cast<std::size_t>(end - at) < _masked.size()) {
                break;
            }
            count += IsAt(at) ? 1 : 0;
        }
        return count;
    }

    /** The secret itself, for the caller's own object. */
    std::string Reveal() const
    {
        std::string bytes = _masked;
        for (char& byte : bytes) {
            byte = static_cast<char>(byte ^ Mask);
        }
        return bytes;
    }

private:
    std::string _masked;
};

/** Wipes a string of the test's own. */
void Wipe(std::string& text)
{
    explicit_bzero(text.data(), text.size());
    text.clear();
}

/** A piece of memory that is not searched itself, because it is shared. */
class Window
{
public:
    static constexpr std::size_t Size = 4U << 20U;

    Window()
        : _memory(static_cast<char*>(
            mmap(nullptr, Size, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0)))
    {}
    Window(const Window&) = delete;
    Window& operator=(const Window&) = delete;
    ~Window()
    {
        explicit_bzero(_memory, Size);
        munmap(_memory, Size);
    }

    char* Get() const { return _memory; }

private:
    char* _memory;
};

/** Reads on by less than the window holds, so that nothing is missed between two looks. */
unsigned CountBetween(
    const Needle& needle,
    int memory,
    const Window& window,
    std::uintptr_t begin,
    std::uintptr_t end)
{
    unsigned count = 0;
    for (std::uintptr_t at = begin; at < end; at += Window::Size - needle.GetSize() + 1) {
        const ssize_t size =
            pread(memory, window.Get(), std::min(Window::Size, end - at), static_cast<off_t>(at));
        count += size > 0 ? needle.Count(window.Get(), static_cast<std::size_t>(size)) : 0;
    }
    return count;
}

/** In all private memory that can be written to, read through the system. */
unsigned CountInProcess(const Needle& needle)
{
    unsigned count = 0;
    const Window window;
    std::ifstream maps("/proc/self/maps");
    const int memory = open("/proc/self/mem", O_RDONLY | O_CLOEXEC);
    for (std::string line; std::getline(maps, line);) {
        std::uintptr_t begin = 0;
        std::uintptr_t end = 0;
        std::array<char, 5> rights{};
        std::sscanf(line.c_str(), "%lx-%lx %4s", &begin, &end, rights.data());
        if (std::strcmp(rights.data(), "rw-p") == 0) {
            count += CountBetween(needle, memory, window, begin, end);
        }
    }
    close(memory);
    return count;
}

/** What is freed unwiped, and by whom. */
struct Freed
{
    const Needle* needle = nullptr;
    std::atomic<unsigned> byCurl{0};
    std::atomic<unsigned> byOthers{0};
};
Freed freed;

/** Counts what holds the secret, and wipes that, so that what is found later was not freed. */
void OnFree(void* block, std::size_t size, const void* caller)
{
    char* const memory = static_cast<char*>(block);
    if (freed.needle == nullptr || freed.needle->Count(memory, size) == 0) {
        return;
    }
    Dl_info info{};
    const bool isCurl = dladdr(caller, &info) != 0 && info.dli_fname != nullptr
                        && std::strstr(info.dli_fname, "libcurl") != nullptr;
    ++(isCurl ? freed.byCurl : freed.byOthers);
    explicit_bzero(memory, size);
}

/** Looks at what is freed, as long as it lives. */
class FreeWatch
{
public:
    explicit FreeWatch(const Needle& needle)
    {
        freed.needle = &needle;
        freed.byCurl = 0;
        freed.byOthers = 0;
        Faults::SetFreeHook(&OnFree);
    }
    FreeWatch(const FreeWatch&) = delete;
    FreeWatch& operator=(const FreeWatch&) = delete;
    ~FreeWatch()
    {
        Faults::SetFreeHook(nullptr);
        freed.needle = nullptr;
    }
};

/**
 * The lowest octets of a number of the client's key, in the order in which OpenSSL has them in
 * memory. They are found out in another process, so that this one has no copy.
 */
Needle GetKeyNumber(const char* parameter)
{
    constexpr std::size_t Size = 32;
    std::array<int, 2> ends{};
    EXPECT_EQ(pipe(ends.data()), 0);
    const pid_t child = fork();
    if (child == 0) {
        const std::string pem = ReadTestData("keys/client-key.pem");
        BIO* const text = BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size()));
        EVP_PKEY* const key = PEM_read_bio_PrivateKey(text, nullptr, nullptr, nullptr);
        BIGNUM* number = nullptr;
        EVP_PKEY_get_bn_param(key, parameter, &number);
        std::vector<unsigned char> bytes(static_cast<std::size_t>(BN_num_bytes(number)));
        BN_bn2lebinpad(number, bytes.data(), static_cast<int>(bytes.size()));
        for (unsigned char& byte : bytes) {
            byte ^= Needle::Mask;
        }
        _exit(write(ends[1], bytes.data(), Size) == Size ? 0 : 1);
    }
    std::string masked(Size, '\0');
    EXPECT_EQ(read(ends[0], masked.data(), Size), static_cast<ssize_t>(Size));
    waitpid(child, nullptr, 0);
    close(ends[0]);
    close(ends[1]);
    return Needle::FromMasked(masked);
}

/** Ends with the operation, well or not. */
template <class Action>
void RunWith(const Action& action, const Faults::Plan& plan, unsigned long& calls)
{
    Faults::Arm(plan);
    try {
        action();
        calls = Faults::Disarm();
    } catch (const std::exception&) {
        calls = Faults::Disarm();
    }
}

} // namespace

TEST(PasswordInMemory, IsWhereItsOwnerHasItAndInWhatLibcurlFrees)
{
    const Client client;
    const auto service = client.MakeService();
    const Needle needle(std::string("alice-") + "secret");
    std::string password = needle.Reveal();
    const FreeWatch watch(needle);
    const auto acquire = [&] { service->AcquireToken("alice@example.test", password, MakeSpec()); };
    unsigned long calls = 0;
    RunWith(acquire, Faults::Plan(), calls);
    EXPECT_EQ(CountInProcess(needle), 1U) << "the caller's own";
    EXPECT_EQ(freed.byOthers, 0U);
    std::cout << freed.byCurl << " blocks of libcurl" << std::endl;
    EXPECT_GT(freed.byCurl, 0U) << "docs/threat-model.md says otherwise";
    Wipe(password);
    EXPECT_EQ(CountInProcess(needle), 0U);
}

TEST(PasswordInMemory, StaysNowhereElseAfterAFailure)
{
    constexpr unsigned long Stride = 97;
    const Client client;
    const auto service = client.MakeService();
    const Needle needle(std::string("alice-") + "secret");
    std::string password = needle.Reveal();
    const FreeWatch watch(needle);
    const auto acquire = [&] { service->AcquireToken("alice@example.test", password, MakeSpec()); };
    Faults::Plan plan{Faults::Kind::ALLOCATION, 1};
    unsigned failures = 0;
    for (bool isReached = true; isReached; plan.nth += Stride) {
        unsigned long calls = 0;
        RunWith(acquire, plan, calls);
        isReached = calls >= plan.nth;
        ++failures;
        EXPECT_EQ(CountInProcess(needle), 1U) << "allocation " << plan.nth;
    }
    EXPECT_EQ(freed.byOthers, 0U);
    EXPECT_GT(failures, 10U);
    std::cout << failures << " failures" << std::endl;
}

class PrivateKeyInMemory : public testing::TestWithParam<const char*>
{};

INSTANTIATE_TEST_SUITE_P(
    Each,
    PrivateKeyInMemory,
    testing::Values(
        OSSL_PKEY_PARAM_RSA_D,
        OSSL_PKEY_PARAM_RSA_FACTOR1,
        OSSL_PKEY_PARAM_RSA_FACTOR2,
        OSSL_PKEY_PARAM_RSA_EXPONENT1,
        OSSL_PKEY_PARAM_RSA_COEFFICIENT1));

TEST_P(PrivateKeyInMemory, IsCopiedByNoOperation)
{
    const Needle needle = GetKeyNumber(GetParam());
    const FreeWatch watch(needle);
    const Client client;
    const auto service = client.MakeService();
    unsigned long calls = 0;
    RunWith([&] { service->AcquireTokenByCertificate(MakeSpec()); }, {}, calls);
    const unsigned owned = CountInProcess(needle);
    EXPECT_GT(owned, 0U) << "the key's own";
    for (const unsigned long nth : {0UL, 300UL, 600UL, 900UL, 0UL}) {
        RunWith(
            [&] { service->AcquireTokenByCertificate(MakeSpec()); },
            {Faults::Kind::ALLOCATION, nth},
            calls);
        EXPECT_EQ(CountInProcess(needle), owned);
    }
    EXPECT_EQ(freed.byCurl + freed.byOthers, 0U);
}
