#pragma once

namespace DevSts {

/** misbehaviours.json, as it was when the program was built. */
extern const char* const MisbehaviourTableText;

} // namespace DevSts
