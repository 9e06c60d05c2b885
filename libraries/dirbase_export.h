// Marks what a shared library of this system offers to its callers; everything else is compiled hidden.
#pragma once

#define DIRBASE_EXPORT __attribute__((visibility("default")))
