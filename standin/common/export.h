// Marks a function or data object of the engine's C interface as exported
// from its library; everything else in the stand-in stays hidden.
#pragma once

#define VRX_EXPORT __attribute__((visibility("default")))
