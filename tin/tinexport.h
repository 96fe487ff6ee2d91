#pragma once

/// Marks what the library exports; everything else stays hidden in the shared object.
#define KELM_TIN_EXPORT __attribute__((visibility("default")))
