#include "quillon/http/HttpException.h"

namespace Quillon::Http {

// The destructors stand here so that the type information has one home.
HttpException::~HttpException() = default;
TimeoutException::~TimeoutException() = default;

} // namespace Quillon::Http
