// An LDIF file of any size: people as a directory has them, every hundredth entry a group of fifty.
#pragma once

#include <cstddef>
#include <string>

namespace bench_support {

// Writes a file with so many entries, valid against the shipped schema with modes 2 and 3 of the check. The same number
// always gives the same file, of about 430 bytes an entry. Raises std::runtime_error when it can't be written.
void generate_ldif(const std::string& path, std::size_t entries);

}  // namespace bench_support
