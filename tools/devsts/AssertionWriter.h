#ifndef DEVSTS_ASSERTION_WRITER_H
#define DEVSTS_ASSERTION_WRITER_H

#include "devsts/Assertion.h"
#include "devsts/Xml.h"

namespace DevSts {

/** A saml:Assertion, not yet signed, as the root of its own document. */
XmlDocument WriteAssertion(const Assertion& assertion);

} // namespace DevSts

#endif
