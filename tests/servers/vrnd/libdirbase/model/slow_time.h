// Reading times once more, slow and obvious, by regular expressions and the calendar of std::chrono: what the tests and
// the fuzzer compare the library with.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <regex>
#include <string>
#include <utility>

#include "servers/vrnd/libdirbase/model/timestamp.h"

namespace test_support {

struct slow_time {
    int result = 21;
    std::optional<tag_timestamp_struct> stored = std::nullopt;  // what the caller's record receives, if anything
};

// Reads a Generalized Time, or a UTC Time in that present year, where local time is `ahead` of UTC all year round.
inline slow_time slow_read_time(const std::string& text, bool generalized, int present_year, std::chrono::minutes ahead)
{
    using namespace std::chrono;
    static const std::string two = "([0-9]{2})";
    static const std::regex utc_form(two + two + two + two + two + two + "?()(Z|[+-][0-9]{4}|)");
    static const std::regex generalized_form("([0-9]{4})" + two + two + two + two + two +
                                             "(?![.,](?![0-9]))(?:[.,]([0-9]+))?([^]*)");
    static const std::regex offset_form("([+-])" + two + two);

    std::smatch match;
    if (text.size() >= 30 || !std::regex_match(text, match, generalized ? generalized_form : utc_form)) {
        return {};
    }
    const auto field = [&](std::size_t group) { return match.length(group) == 0 ? 0 : std::stoi(match.str(group)); };
    int full_year = field(1);
    for (int candidate = present_year - 79; !generalized && candidate <= present_year + 20; ++candidate) {
        full_year = candidate % 100 == field(1) ? candidate : full_year;
    }
    const year_month_day date = year(full_year) / field(2) / field(3);
    if (full_year == 0 || !date.ok() || field(4) > 23 || field(5) > 59 || field(6) > 59) {
        return {};
    }

    int result = 0;
    sys_seconds time = sys_days(date) + hours(field(4)) + minutes(field(5)) + seconds(field(6));
    std::optional<std::pair<int, int>> odd;  // hour and minute, when the offset may be too much for one carry
    const std::string zone = match.str(8);
    std::smatch offset;
    if (std::regex_match(zone, offset, offset_form)) {
        const int sign = offset.str(1) == "+" ? 1 : -1;
        const int offset_hours = sign * std::stoi(offset.str(2));
        const int offset_minutes = sign * std::stoi(offset.str(3));
        if (std::abs(offset_hours) < 24 && std::abs(offset_minutes) < 60) {
            time -= hours(offset_hours) + minutes(offset_minutes);
        } else {
            const auto carry = [](int value, int size) { return value < 0 ? -1 : value >= size ? 1 : 0; };
            const int minute = field(5) - offset_minutes;
            const int hour = field(4) - offset_hours + carry(minute, 60);
            odd = {hour - carry(hour, 24) * 24, minute - carry(minute, 60) * 60};
            time = sys_days(date) + days(carry(hour, 24)) + seconds(field(6));
        }
    } else if (zone.empty()) {
        time -= time >= sys_seconds(ahead) ? ahead : minutes(0);
    } else if (zone != "Z") {
        result = 21;
    }

    const year_month_day day(floor<days>(time));
    const hh_mm_ss clock(time - floor<days>(time));
    const auto narrow = [](auto value) { return static_cast<std::int16_t>(value); };
    const int known_year = day.year() == year(0) ? -1 : int(day.year());
    const auto hour = odd ? odd->first : clock.hours().count();
    const auto minute = odd ? odd->second : clock.minutes().count();
    const int microseconds = std::stoi((match.str(7) + "000000").substr(0, 6));
    return {result,
            {{narrow(known_year), narrow(unsigned(day.month())), narrow(unsigned(day.day())), narrow(hour),
              narrow(minute), narrow(field(6)), microseconds * 1000}}};
}

}  // namespace test_support
