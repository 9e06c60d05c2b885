// Reading log files in tests.
#pragma once

#include <regex>
#include <sstream>
#include <string>
#include <vector>

namespace test_support {

inline std::vector<std::string> lines_of(const std::string& text)
{
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        lines.push_back(line);
    }
    return lines;
}

// A log line without the time in front of it. A line that doesn't begin with a time such as
// 2026-11-22T20:15:03.123+0000 and a blank comes back with "no time: " in front.
inline std::string without_time(const std::string& line)
{
    static const std::regex time(R"(\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}[+-]\d{4} )");
    std::smatch found;
    const bool there = std::regex_search(line, found, time, std::regex_constants::match_continuous);
    return there ? found.suffix().str() : "no time: " + line;
}

inline std::vector<std::string> lines_without_time(const std::string& log)
{
    std::vector<std::string> lines = lines_of(log);
    for (std::string& line : lines) {
        line = without_time(line);
    }
    return lines;
}

}  // namespace test_support
