#include "Workload.h"

#include "support/TestData.h"

// A module of a host that knows nothing of the library.

extern "C" void Begin(const char* url, unsigned seed)
{
    const std::vector<Soak::ServicePtr> services{
        Soak::MakeService(url, ReadTestData("keys/sts-cert.pem"), 5'000)};
    Soak::Ledger ledger;
    Soak::Workload workload(services, {}, ledger, seed);
    for (int i = 0; i < 8; ++i) {
        workload.StartAcquisition();
    }
    workload.AwaitAsync(); // whose completions are code of this module
}
