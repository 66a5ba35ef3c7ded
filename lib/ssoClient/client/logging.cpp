#include "ssoClient/client/logging.h"

#include <atomic>

using Quillon::Service::Logger;

namespace SsoClient {

Logger* getLogger()
{
    static std::atomic<Logger*> published{nullptr};

    Logger* known = published.load(std::memory_order_acquire);
    if (known != nullptr) {
        return known;
    }
    Quillon::Ref<Logger> logger =
        Quillon::Service::GetApp()->GetLogFacility().GetLogger("SsoClient");
    if (!published.compare_exchange_strong(known, logger.get(), std::memory_order_acq_rel)) {
        return known; // another thread was first
    }
    return logger.detach(); // the published pointer keeps the reference
}

} // namespace SsoClient
