#pragma once

#include "quillon/Export.h"

#include <boost/smart_ptr/intrusive_ptr.hpp>

#include <atomic>

namespace Quillon {

/**
 * Base of the objects that are held through `Ref`. A new object has a count of zero; the first
 * `Ref` made of it owns it.
 *
 * Thread safety: the count is atomic; what the object itself allows is for its class to say.
 */
class QUILLON_API RefCounted
{
public:
    RefCounted(const RefCounted&) = delete;
    RefCounted& operator=(const RefCounted&) = delete;

    friend void intrusive_ptr_add_ref(const RefCounted* object) noexcept
    {
        object->_count.fetch_add(1, std::memory_order_relaxed);
    }

    friend void intrusive_ptr_release(const RefCounted* object) noexcept
    {
        if (object->_count.fetch_sub(1, std::memory_order_acq_rel) == 1) {
            delete object;
        }
    }

protected:
    RefCounted() noexcept = default;
    virtual ~RefCounted() = default;

private:
    mutable std::atomic<unsigned> _count{0};
};

/** An intrusive, shared handle: copying takes a reference, destruction gives it back. */
template <class T>
using Ref = boost::intrusive_ptr<T>;

} // namespace Quillon
