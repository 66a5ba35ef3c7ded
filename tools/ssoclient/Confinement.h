#pragma once

#include <string>

/**
 * From here on the process can read and write what is open, take memory and end, and nothing else:
 * whoever makes it run code of his own, by a document, opens no file, no connection and no other
 * program with it. What is denied fails with EPERM. There is no way back.
 *
 * To be called while there is one thread.
 *
 * @return why that cannot be had; empty if it can. The process goes on as before then.
 */
std::string Confine() noexcept;
