// A small active schema for the fuzzers of what looks attribute types up.
#pragma once

namespace fuzz_support {

// Loads it: types with several names ("c", "cn", "commonName", 2.3; "sn", "surname", 2.4), one whose OID is much
// shorter than its name (1.1), and one whose values are compared exactly ("x", "exact", 1.2).
void load_small_schema();

}  // namespace fuzz_support
