#pragma once

#include "devsts/wire/Request.h"

namespace DevSts {

/** The context and the leg of a request that has wst:BinaryExchange. @throws ShapeError */
NegotiationLeg ReadNegotiationLeg(const xmlNode* request, const xmlNode* binaryExchange);

/** The one child of Body in a request that continues a negotiation. @throws ShapeError */
NegotiationLeg ReadContinuedRequest(const xmlNode* response);

} // namespace DevSts
