#include "Workload.h"

#include "support/TestData.h"

// A module of a host that knows nothing of the library.

extern "C" void Begin(const char* url, unsigned seed)
{
    // Never destroyed: what was begun goes on when the module is gone.
    static auto& services = *new std::vector<Soak::ServicePtr>{
        Soak::MakeService(url, ReadTestData("keys/sts-cert.pem"), 5'000)};
    static Soak::Ledger& ledger = *new Soak::Ledger;
    Soak::Workload& workload = *new Soak::Workload(services, {}, ledger, seed);
    for (int i = 0; i < 8; ++i) {
        workload.StartAcquisition();
    }
}
