#pragma once

#include "devsts/token/Assertion.h"
#include "devsts/wire/Xml.h"

namespace DevSts {

/** A saml:Assertion, not yet signed, as the root of its own document. */
XmlDocument WriteAssertion(const Assertion& assertion);

} // namespace DevSts
