#pragma once

#include <boost/function.hpp>

namespace Quillon {

/** A piece of work: bound arguments, no result. */
using Functor = boost::function<void()>;

} // namespace Quillon
