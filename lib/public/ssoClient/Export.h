#pragma once

/** Marks what the shared library `libssoclient` exports; everything else stays hidden. */
#define SSOCLIENT_API __attribute__((visibility("default")))
