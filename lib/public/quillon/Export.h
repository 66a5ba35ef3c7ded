#pragma once

/** Marks what the shared library `libquillon` exports; everything else stays hidden. */
#define QUILLON_API __attribute__((visibility("default")))
