// Reading times: see timestamp.h.
//
// The texts are read where they stand, once their length has been seen to be that of a time. Digits are checked before
// anything is made of them, so every field is a small number and no arithmetic here comes near the ends of its type.
#include "servers/vrnd/libdirbase/model/timestamp.h"

#include <cstdlib>
#include <cstring>
#include <ctime>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"

namespace {

constexpr std::size_t text_room = 30;  // of a text with its terminator
constexpr int february = 2;
constexpr int fraction_digits = 9;       // nanoseconds
constexpr int fraction_digits_read = 6;  // microseconds

// Days of a month that counts from 1, leap days apart. A month can be looked up that is one step outside the year.
constexpr std::int32_t month_table[] = {31, 31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31, 31};
constexpr int month_table_size = sizeof month_table / sizeof *month_table;

// A syntax as its log lines name it.
struct time_syntax {
    const char* parser;
    const char* name;
};
constexpr time_syntax generalized_time = {"str2GeneralizedTime", "generalizedTime"};
constexpr time_syntax utc_time = {"str2UTCTime", "UTCTime"};

int refuse(const time_syntax& syntax, const char* what)
{
    debug_error("Error - %s: bad %s in %s\n", syntax.parser, what, syntax.name);
    return LDAP_INVALID_SYNTAX;
}

bool has_length_of_time(const char* text)
{
    return text != nullptr && strnlen(text, text_room) < text_room;
}

bool is_digit(char character)
{
    return character >= '0' && character <= '9';
}

// The terminator is no digit, so that a short text is no danger.
bool starts_with_digits(const char* text, int count)
{
    for (int i = 0; i < count; ++i) {
        if (!is_digit(text[i])) {
            return false;
        }
    }
    return true;
}

// The value of up to four digits.
std::int16_t number(const char* digits, int count)
{
    int value = 0;
    for (int i = 0; i < count; ++i) {
        value = value * 10 + (digits[i] - '0');
    }
    return static_cast<std::int16_t>(value);
}

bool is_leap_year(int year)
{
    return year % 100 == 0 ? year % 400 == 0 : year % 4 == 0;
}

// None for a month outside the table.
int days_of_month(int month, int year)
{
    if (month < 0 || month >= month_table_size) {
        return 0;
    }
    return month_table[month] + (month == february && is_leap_year(year) ? 1 : 0);
}

// Takes a field back into its range, 0 to size - 1, if one step is enough for that. Returns what its neighbour gains.
int carry_once(int& field, int size)
{
    if (field < 0) {
        field += size;
        return -1;
    }
    if (field >= size) {
        field -= size;
        return 1;
    }
    return 0;
}

// The sign of hours and minutes is that of the zone.
void subtract_offset(tag_timestamp_struct& time, int hours, int minutes)
{
    int year = time.year;
    int month = time.month;
    int minute = time.minute - minutes;
    int hour = time.hour - hours + carry_once(minute, 60);
    int day = time.day + carry_once(hour, 24);
    if (day < 1) {
        --month;
        day = days_of_month(month, year);
    }
    if (day > days_of_month(month, year)) {
        day = 1;
        ++month;
    }
    if (month < 1) {
        month = 12;
        year = year == 1 ? -1 : year - 1;
    }
    if (month > 12) {
        month = 1;
        year = year == -1 ? 1 : year + 1;
    }
    time.year = static_cast<std::int16_t>(year);
    time.month = static_cast<std::int16_t>(month);
    time.day = static_cast<std::int16_t>(day);
    time.hour = static_cast<std::int16_t>(hour);
    time.minute = static_cast<std::int16_t>(minute);
}

void adjust_local_time(tag_timestamp_struct& time)
{
    std::tm local = {};
    local.tm_year = time.year - 1900;
    local.tm_mon = time.month - 1;
    local.tm_mday = time.day;
    local.tm_hour = time.hour;
    local.tm_min = time.minute;
    local.tm_sec = time.second;
    local.tm_isdst = 0;
    const std::time_t calendar_time = std::mktime(&local);
    if (calendar_time < 0) {
        debug_error("Error - adjust_to_UTC: timestamp value %d:%d:%d:%d:%d:%d cannot be adjusted to UTC\n", time.year,
                    time.month, time.day, time.hour, time.minute, time.second);
        return;
    }

    std::tm utc = {};
    if (gmtime_r(&calendar_time, &utc) == nullptr) {
        debug_error("Error - adjust_to_UTC: timestamp value cannot be adjusted to UTC\n");
        return;
    }
    time.year = static_cast<std::int16_t>(utc.tm_year + 1900);
    time.month = static_cast<std::int16_t>(utc.tm_mon + 1);
    time.day = static_cast<std::int16_t>(utc.tm_mday);
    time.hour = static_cast<std::int16_t>(utc.tm_hour);
    time.minute = static_cast<std::int16_t>(utc.tm_min);
    time.second = static_cast<std::int16_t>(utc.tm_sec);
}

// Month, day, hour and minute, two digits each, into a record that has its year.
int read_month_to_minute(const time_syntax& syntax, const char* digits, tag_timestamp_struct& time)
{
    time.month = number(digits, 2);
    time.day = number(digits + 2, 2);
    time.hour = number(digits + 4, 2);
    time.minute = number(digits + 6, 2);
    if (time.month < 1 || time.month > 12) {
        return refuse(syntax, "month value");
    }
    if (const int rc = check_date(&time); rc != LDAP_SUCCESS) {
        return rc;
    }
    if (time.hour > 23) {
        return refuse(syntax, "hour value");
    }
    return time.minute > 59 ? refuse(syntax, "minute value") : LDAP_SUCCESS;
}

int read_second(const time_syntax& syntax, const char* digits, tag_timestamp_struct& time)
{
    if (!starts_with_digits(digits, 2) || number(digits, 2) > 59) {
        return refuse(syntax, "second value");
    }
    time.second = number(digits, 2);
    return LDAP_SUCCESS;
}

// Any number of digits, in nanoseconds. Returns where they end.
const char* read_fraction(const char* digits, std::int32_t& fraction)
{
    fraction = 0;
    int count = 0;
    for (; is_digit(digits[count]); ++count) {
        if (count < fraction_digits_read) {
            fraction = fraction * 10 + (digits[count] - '0');
        }
    }
    for (int read = count < fraction_digits_read ? count : fraction_digits_read; read < fraction_digits; ++read) {
        fraction *= 10;
    }
    return digits + count;
}

// The year that ends in two digits and is in the window around the present one, in the sense of str2UTCTime.
int find_century(int two_digits, std::int16_t& year)
{
    const std::time_t now = std::time(nullptr);
    std::tm local = {};
    if (now == -1 || localtime_r(&now, &local) == nullptr) {
        debug_error("Error - str2UTCTime: time function failed \n");
        return LDAP_OPERATIONS_ERROR;
    }
    const int present = (local.tm_year + 1900) % 100;
    int century = local.tm_year + 1900 - present;
    if (present + 20 < 100) {
        century -= two_digits > present + 20 ? 100 : 0;
    } else {
        century += two_digits > present - 80 ? 0 : 100;
    }
    year = static_cast<std::int16_t>(century + two_digits);
    return LDAP_SUCCESS;
}

}  // namespace

extern "C" {

int check_date(const tag_timestamp_struct* time)
{
    if (time->day < 1) {
        debug_error("Error - check_date: bad day value in generalizedTime\n");
        return LDAP_INVALID_SYNTAX;
    }
    return time->day <= days_of_month(time->month, time->year) ? LDAP_SUCCESS : LDAP_INVALID_SYNTAX;
}

int adjust_to_UTC(tag_timestamp_struct* time, const char* zone)
{
    if (!has_length_of_time(zone)) {
        return LDAP_INVALID_SYNTAX;
    }
    if (zone[0] == '\0') {
        adjust_local_time(*time);
        return LDAP_SUCCESS;
    }
    if (std::strcmp(zone, "Z") == 0) {
        return LDAP_SUCCESS;
    }
    const bool east = zone[0] == '+';
    if ((!east && zone[0] != '-') || !starts_with_digits(zone + 1, 4) || zone[5] != '\0') {
        return LDAP_INVALID_SYNTAX;
    }
    const int hours = number(zone + 1, 2);
    const int minutes = number(zone + 3, 2);
    subtract_offset(*time, east ? hours : -hours, east ? minutes : -minutes);
    return LDAP_SUCCESS;
}

int str2GeneralizedTime(const char* text, tag_timestamp_struct* time)
{
    if (!has_length_of_time(text)) {
        return LDAP_INVALID_SYNTAX;
    }
    if (!starts_with_digits(text, 14)) {
        return refuse(generalized_time, "character");
    }
    tag_timestamp_struct parsed = {};
    parsed.year = number(text, 4);
    if (parsed.year < 1) {
        return refuse(generalized_time, "year value");
    }
    if (const int rc = read_month_to_minute(generalized_time, text + 4, parsed); rc != LDAP_SUCCESS) {
        return rc;
    }
    if (const int rc = read_second(generalized_time, text + 12, parsed); rc != LDAP_SUCCESS) {
        return rc;
    }
    const char* zone = text + 14;
    if (*zone == '.' || *zone == ',') {
        const char* digits = zone + 1;
        zone = read_fraction(digits, parsed.fraction);
        if (zone == digits) {
            return refuse(generalized_time, "fraction value");
        }
    }

    const int rc = adjust_to_UTC(&parsed, zone);
    if (time != nullptr) {
        *time = parsed;
    }
    return rc;
}

int str2UTCTime(const char* text, tag_timestamp_struct* time)
{
    if (!has_length_of_time(text)) {
        return LDAP_INVALID_SYNTAX;
    }
    if (!starts_with_digits(text, 10)) {
        return refuse(utc_time, "character");
    }
    tag_timestamp_struct parsed = {};
    if (const int rc = find_century(number(text, 2), parsed.year); rc != LDAP_SUCCESS) {
        return rc;
    }
    if (const int rc = read_month_to_minute(utc_time, text + 2, parsed); rc != LDAP_SUCCESS) {
        return rc;
    }
    const char* zone = text + 10;
    if (is_digit(*zone)) {
        if (const int rc = read_second(utc_time, zone, parsed); rc != LDAP_SUCCESS) {
            return rc;
        }
        zone += 2;
    }

    const int rc = adjust_to_UTC(&parsed, zone);
    if (rc == LDAP_SUCCESS && time != nullptr) {
        *time = parsed;
    }
    return rc;
}

tag_timestamp_struct* str2timestamp(const char* text, std::uint32_t syntax, int* result)
{
    *result = LDAP_SUCCESS;
    heap_pointer<tag_timestamp_struct> time(
        static_cast<tag_timestamp_struct*>(std::malloc(sizeof(tag_timestamp_struct))));
    if (time == nullptr) {
        debug_error("Error - str2timestamp: malloc failed. Out of memory\n");
        *result = LDAP_NO_MEMORY;
        return nullptr;
    }
    switch (syntax) {
    case SC_GT: *result = str2GeneralizedTime(text, time.get()); break;
    case SC_UTCT: *result = str2UTCTime(text, time.get()); break;
    default: *result = LDAP_OPERATIONS_ERROR; break;
    }
    return *result == LDAP_SUCCESS ? time.release() : nullptr;
}

}  // extern "C"
