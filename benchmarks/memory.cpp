// What verifying a token takes of the heap: the peak, and how many pieces. Every allocation counts,
// also those of libxml2 and OpenSSL. Prints JSON.

#include "TestData.h"
#include "Tokens.h"
#include "XmlsecPeer.h"

#include "quillon/system/Clock.h"
#include "ssoClient/CreateSamlToken.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <malloc.h>

// The allocator of glibc under the names that it has beside the usual ones.
extern "C" {
void* __libc_malloc(std::size_t size);                    // NOLINT(bugprone-reserved-identifier)
void* __libc_calloc(std::size_t count, std::size_t size); // NOLINT(bugprone-reserved-identifier)
void* __libc_realloc(void* memory, std::size_t size);     // NOLINT(bugprone-reserved-identifier)
void __libc_free(void* memory);                           // NOLINT(bugprone-reserved-identifier)
}

namespace {

std::size_t allocations = 0;
std::size_t live = 0;
std::size_t peak = 0;

void* Note(void* memory)
{
    ++allocations;
    live += malloc_usable_size(memory);
    peak = live > peak ? live : peak;
    return memory;
}

void Forget(void* memory)
{
    live -= malloc_usable_size(memory);
}

} // namespace

extern "C" {
void* malloc(std::size_t size)
{
    return Note(__libc_malloc(size));
}
void* calloc(std::size_t count, std::size_t size)
{
    return Note(__libc_calloc(count, size));
}
void* realloc(void* memory, std::size_t size)
{
    Forget(memory);
    return Note(__libc_realloc(memory, size));
}
void free(void* memory)
{
    Forget(memory);
    __libc_free(memory);
}
}

namespace {

class TokenClock final : public Quillon::System::Clock
{
public:
    Quillon::System::DateTime Now() const override
    {
        return Quillon::System::DateTime("2026-06-15T12:00:00Z");
    }
};

const char* separator = "";

/** Runs it a second time, when what is made once has been made. */
template <class Operation>
void Measure(
    const char* who, const std::string& name, const std::string& token, const Operation& run)
{
    run(token);
    const std::size_t before = live;
    peak = live;
    allocations = 0;
    run(token);
    const std::size_t made = allocations;
    const std::size_t most = peak - before;
    std::printf(
        "%s\n  {\"name\": \"%s/%s\", \"octets\": %zu, \"allocations\": %zu, \"peak\": %zu}",
        separator,
        who,
        name.c_str(),
        token.size(),
        made,
        most);
    separator = ",";
}

void MeasureBoth(const std::string& name, const std::string& token)
{
    static const auto trusted =
        Quillon::Crypto::ParsePemCertificates(Benchmarks::ReadFile("keys/sts-cert.pem"));
    static const Benchmarks::XmlsecPeer peer(Benchmarks::ReadFile("keys/sts-cert.pem"));
    Measure("Own", name, token, [](const std::string& text) {
        SsoClient::CreateSamlToken(text, trusted);
    });
    Measure("xmlsec1", name, token, [](const std::string& text) { peer.Run(text); });
}

} // namespace

int main()
{
    static const TokenClock clock;
    Quillon::System::ReplaceClock(&clock);
    std::printf("[");
    for (const char* size : {"4k", "8k", "100k"}) {
        MeasureBoth(
            std::string("Verify/") + size,
            Benchmarks::ReadFile(std::string("tokens/accepted/bearer-") + size + ".xml"));
    }
    for (const std::size_t size : {4'096, 16'384, 65'536, 262'144, 1'048'576, 4'194'304}) {
        MeasureBoth(
            "Growth/groups/" + std::to_string(size),
            Benchmarks::MakeToken(Benchmarks::Bulk::GROUPS, size));
    }
    std::printf("\n]\n");
    return 0;
}
