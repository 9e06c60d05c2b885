// The commands of the group `dirbase filter`. Each writes its results to standard output and returns its exit status.
#pragma once

#include <string>
#include <vector>

#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

// Tells what a server makes of filters: the canonical text and the elements, or why there are none. "-" stands for
// those on standard input, one a line. A filter that isn't defined is a finding.
int parse_filters(const common_options& common, const std::vector<std::string>& filters);

}  // namespace dirbase_tool
