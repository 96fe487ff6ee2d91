#pragma once

/// Marks what the outside services hand to the library and to its callers: everything else of an
/// implementation stays hidden in its shared object.
#define KELM_SERVICES_EXPORT __attribute__((visibility("default")))
