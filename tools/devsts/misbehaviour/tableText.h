#pragma once

#include <vector>

namespace DevSts {

/** The text of misbehaviours.json when the program was built, cut at the commas between its rows.
 */
const std::vector<const char*>& GetMisbehaviourRows();

} // namespace DevSts
