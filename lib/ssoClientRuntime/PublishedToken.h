#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClientRuntime/Moment.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <array>
#include <atomic>
#include <thread>
#include <utility>

namespace SsoClient {

/**
 * The token that is handed out, for readers that take no lock.
 *
 * There are two slots, of which one is current. A reader says that it is in a slot before it looks
 * whether the slot is still the current one, and leaves it untouched if it is not. The writer
 * changes a slot only while that is not current and nobody is in it. So a reader is in the way of
 * the writer for as long as it takes to copy a pointer, and never of other readers.
 *
 * Thread safety: any number of readers, and one writer at a time.
 */
class PublishedToken
{
public:
    using Token = boost::shared_ptr<const SamlToken>;

    /** Null if there is no token whose lease covers `now`. */
    Token Read(const Moment& now) const noexcept
    {
        while (true) {
            const unsigned index = _current.load();
            const Slot& slot = _slots[index];
            slot.readers.fetch_add(1);
            const bool isCurrent = _current.load() == index;
            Token token = isCurrent && slot.lease.Covers(now) ? slot.token : Token();
            slot.readers.fetch_sub(1, std::memory_order_release);
            if (isCurrent) {
                return token;
            }
        }
    }

    /** The token before it is let go of. Null takes the place of none. */
    void Publish(Token token, const Lease& lease) noexcept
    {
        const unsigned old = _current.load();
        Slot& next = _slots[1 - old];
        AwaitNoReader(next);
        next.token = std::move(token);
        next.lease = lease;
        _current.store(1 - old);
        AwaitNoReader(_slots[old]);
        _slots[old].token.reset();
    }

private:
    struct Slot
    {
        mutable std::atomic<unsigned> readers{0};
        Lease lease;
        Token token;
    };

    static void AwaitNoReader(const Slot& slot) noexcept
    {
        while (slot.readers.load() != 0) {
            std::this_thread::yield();
        }
    }

    std::array<Slot, 2> _slots;
    std::atomic<unsigned> _current{0};
};

} // namespace SsoClient
