#pragma once

// Symbols are hidden by default; only what carries this mark is the public API.
#define OX_EXPORT __attribute__((visibility("default")))
