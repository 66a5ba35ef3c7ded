#pragma once

#include "ssoClient/OperationObserver.h"

#include <boost/smart_ptr/shared_ptr.hpp>

namespace SsoClient {

/** Tells an observer, which may be null, whether a cache had what it was asked for. */
inline void TellLookUp(
    const boost::shared_ptr<OperationObserver>& observer, const char* cache, bool isHit)
{
    if (observer == nullptr) {
        return;
    }
    if (isHit) {
        observer->OnCacheHit({cache});
    } else {
        observer->OnCacheMiss({cache});
    }
}

} // namespace SsoClient
