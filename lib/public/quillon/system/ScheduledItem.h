#pragma once

#include "quillon/Ref.h"

namespace Quillon::System {

/**
 * Something that is going to happen: work that is queued or under way. Letting go of the item
 * does not stop it; `Cancel` does.
 *
 * Thread safety: any number of threads.
 */
class QUILLON_API ScheduledItem : public RefCounted
{
public:
    /**
     * Calls it off. Never waits: a completion that already runs goes on.
     *
     * @return whether it was called off in time, so that its completion is never called.
     */
    virtual bool Cancel() noexcept = 0;
};

} // namespace Quillon::System
