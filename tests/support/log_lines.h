// Reading log files in tests.
#pragma once

#include <cstddef>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

namespace test_support {

inline std::vector<std::string> lines_of(const std::string& text)
{
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);)
        lines.push_back(line);
    return lines;
}

// A log line without the time in front of it. A line that doesn't begin with a time such as
// 2026-11-22T20:15:03.123+0000 and a blank comes back with "no time: " in front.
inline std::string without_time(std::string_view line)
{
    constexpr std::string_view shape = "dddd-dd-ddTdd:dd:dd.dddsdddd ";
    const auto fits = [](char byte, char kind) {
        if (kind == 'd')
            return byte >= '0' && byte <= '9';
        return kind == 's' ? byte == '+' || byte == '-' : byte == kind;
    };
    for (std::size_t at = 0; at < shape.size(); ++at) {
        if (at >= line.size() || !fits(line[at], shape[at]))
            return "no time: " + std::string(line);
    }
    return std::string(line.substr(shape.size()));
}

}  // namespace test_support
