// Times as values: from the texts of Generalized Time and UTC Time (RFC 4517, 3.3.13 and 3.3.34) to one record, which
// is in Coordinated Universal Time.
//
// The forms read here are those that the server has always stored. They are narrower than the RFC's in that Generalized
// Time must have its seconds, that 60 is no second, and that a zone has four digits; they are wider in that a text
// without a zone is a local time, and that any four digits make an offset.
//
// A text is refused with LDAP_INVALID_SYNTAX. So is a null text, and one of more than 29 characters. The
// debug log tells which field was bad, except for these two, the zone, and a day that is past the end of its month.
// Nothing here locks, and every function may be called from any thread. Local times and the present year follow the
// process's time zone: no thread may change the variable TZ meanwhile.
#pragma once

#include <stddef.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"

// A time. Value trees hold its bytes as they are. There is no year 0: year 1 follows -1.
typedef struct tag_timestamp_struct tag_timestamp_struct;
struct tag_timestamp_struct {
    int16_t year;
    int16_t month;  // from 1
    int16_t day;    // from 1
    int16_t hour;
    int16_t minute;
    int16_t second;
    int32_t fraction;  // nanoseconds, in whole microseconds

#ifdef __cplusplus
    friend bool operator==(const tag_timestamp_struct&, const tag_timestamp_struct&) = default;
#endif
};
#ifdef __cplusplus
static_assert(sizeof(tag_timestamp_struct) == 16 && offsetof(tag_timestamp_struct, fraction) == 12,
              "value trees hold times in 16 bytes");
#endif

DIRBASE_C_BEGIN

// Whether the month has the day: LDAP_SUCCESS or LDAP_INVALID_SYNTAX. `time` isn't null; year and month have been
// checked already.
DIRBASE_EXPORT int check_date(const tag_timestamp_struct* time);

// Brings a time to UTC.
//
//   time  not null, and a date that check_date passes; of any other the result makes no sense.
//   zone  what followed the time in the text. "Z": it is UTC already. A sign and four digits: it is that many hours and
//         minutes ahead of UTC, or behind. Nothing: it is local, and never daylight-saving, time.
//
// Returns LDAP_SUCCESS, or LDAP_INVALID_SYNTAX for another zone; the record is then as it was. A local time before 1970
// can't be told in UTC: the record stays, with a line in the debug log, and the result is 0.
//
// Of an offset beyond 23 hours or 59 minutes, each field passes at most one unit to the next, so that fields may end up
// outside their ranges.
DIRBASE_EXPORT int adjust_to_UTC(tag_timestamp_struct* time, const char* zone);

// Reads YYYYMMDDHHMMSS, then a point or comma and digits of a second if any, then a zone or none. The fraction is cut
// after six digits.
//
//   time  receives the time; null to check the text only. When only the zone is bad it receives the time as written,
//         and else nothing on failure.
//
// Returns LDAP_SUCCESS or LDAP_INVALID_SYNTAX.
DIRBASE_EXPORT int str2GeneralizedTime(const char* text, tag_timestamp_struct* time);

// Reads YYMMDDHHMM, then SS if any, then a zone or none. The two digits stand for a
// year from 79 years before the present local year to 20 years after it.
//
//   time  receives the time, on success only; null to check the text only.
//
// Returns LDAP_SUCCESS, LDAP_INVALID_SYNTAX, or LDAP_OPERATIONS_ERROR when the system's clock can't be read.
DIRBASE_EXPORT int str2UTCTime(const char* text, tag_timestamp_struct* time);

// Reads a text of syntax SC_GT or SC_UTCT into a new record for the caller to free().
//
//   result  receives 0, a code of the two functions above, 90 when memory ran out, or 1 for another syntax code; the
//           return is null then.
DIRBASE_EXPORT tag_timestamp_struct* str2timestamp(const char* text, uint32_t syntax, int* result);

DIRBASE_C_END
