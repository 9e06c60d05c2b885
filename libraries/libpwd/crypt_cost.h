// What a comparison with a value of crypt(3) may cost. For libpwd itself.
#pragma once

#include <string_view>

// Whether a setting (a salt, or a whole hash, of any kind that crypt(3) has) asks for no more work and memory than a
// server can spend on one comparison while others wait for it: about a second of a processor and 64 MB. A setting names
// its cost itself, and whoever may store a password chooses it. Kinds that aren't known here are refused.
bool crypt_cost_is_bearable(std::string_view setting);
