#pragma once

/**
 * Marks what the shared library `libquillon` exports; everything else stays hidden. In a static
 * library nothing is exported: whoever links it decides what leaves the result.
 */
#ifdef QUILLON_STATIC
#define QUILLON_API
#else
#define QUILLON_API __attribute__((visibility("default")))
#endif
