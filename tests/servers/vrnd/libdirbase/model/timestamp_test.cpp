// Times: tables, and random texts against the slow second implementation of slow_time.h. The present is one of our
// making, and local time is five and a half hours ahead, so that a new year begins here first.
#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <ctime>
#include <random>
#include <string>
#include <vector>

#include <dlfcn.h>

#include "tests/servers/vrnd/libdirbase/model/slow_time.h"
#include "tests/support/message_catcher.h"

namespace {

// While it isn't 0, time() tells the second before this year begins in UTC; -1: time() fails.
thread_local int present_year = 0;

}  // namespace

extern "C" std::time_t time(std::time_t* out) noexcept
{
    using namespace std::chrono;
    static const auto next = reinterpret_cast<decltype(::time)*>(dlsym(RTLD_NEXT, "time"));
    if (present_year <= 0) {
        return present_year < 0 ? -1 : next(out);
    }
    return sys_seconds(sys_days(year(present_year) / 1 / 1)).time_since_epoch().count() - 1;
}

namespace {

constexpr tag_timestamp_struct none = {-7, -7, -7, -7, -7, -7, -7};  // what stands in a record before

void set_zone(const char* zone)
{
    zone == nullptr ? unsetenv("TZ") : setenv("TZ", zone, 1);
    tzset();
}

struct Timestamp : testing::Test {
    Timestamp() { set_zone("HERE-5:30"); }
    ~Timestamp() override { set_zone(nullptr), present_year = 0; }
};

struct row {
    std::string text;
    int result;
    tag_timestamp_struct stored;
    std::vector<std::string> lines = {};  // of the debug log
};

void expect_rows(int (*parse)(const char*, tag_timestamp_struct*), const std::vector<row>& table)
{
    for (const row& r : table) {
        const test_support::debug_catcher debug;
        tag_timestamp_struct stored = none;
        EXPECT_EQ(parse(r.text.c_str(), &stored), r.result) << r.text;
        EXPECT_EQ(stored, r.stored) << r.text;
        EXPECT_EQ(debug.texts(), r.lines) << r.text;
        EXPECT_EQ(parse(r.text.c_str(), nullptr), r.result) << r.text;
    }
    EXPECT_EQ(parse(nullptr, nullptr), 21);
}

TEST_F(Timestamp, GeneralizedTimes)
{
    const char* too_early = "Error - adjust_to_UTC: timestamp value 1970:1:1:5:29:59 cannot be adjusted to UTC\n";
    const std::vector<row> table = {
        {"20240229123456Z", 0, {2024, 2, 29, 12, 34, 56, 0}},
        {"19000229000000Z", 21, none},
        {"20240400000000Z", 21, none, {"Error - check_date: bad day value in generalizedTime\n"}},
        {"00000101000000Z", 21, none, {"Error - str2GeneralizedTime: bad year value in generalizedTime\n"}},
        {"20241301000000Z", 21, none, {"Error - str2GeneralizedTime: bad month value in generalizedTime\n"}},
        {"20240101240000Z", 21, none, {"Error - str2GeneralizedTime: bad hour value in generalizedTime\n"}},
        {"20240101000060Z", 21, none, {"Error - str2GeneralizedTime: bad second value in generalizedTime\n"}},
        {"202401010000Z", 21, none, {"Error - str2GeneralizedTime: bad character in generalizedTime\n"}},
        {"20240101000000.Z", 21, none, {"Error - str2GeneralizedTime: bad fraction value in generalizedTime\n"}},
        {"20240101000000,1234567Z", 0, {2024, 1, 1, 0, 0, 0, 123456000}},
        {"20240101003000+01", 21, {2024, 1, 1, 0, 30, 0, 0}},  // as written, though the zone is bad
        {"20240229233000-0100", 0, {2024, 3, 1, 0, 30, 0, 0}},
        {"00010101000000+0001", 0, {-1, 12, 31, 23, 59, 0, 0}},  // there is no year 0
        {"99991231235959-2359", 0, {10000, 1, 1, 23, 58, 59, 0}},
        {"20240101000000+9999", 0, {2023, 12, 31, -76, -39, 0, 0}},  // each field carries once only
        {"20231231235900-9999", 0, {2024, 1, 1, 99, 98, 0, 0}},
        {"20240101000000.1234567890123Z", 0, {2024, 1, 1, 0, 0, 0, 123456000}},  // 29 characters
        {"20240101000000.12345678901234Z", 21, none},
        {"19700101052959", 0, {1970, 1, 1, 5, 29, 59, 0}, {too_early}},
    };
    expect_rows(str2GeneralizedTime, table);
    set_zone("CET-1CEST,M3.5.0,M10.5.0/3");  // no text is in summer time
    expect_rows(str2GeneralizedTime, {{"20240701120000.25", 0, {2024, 7, 1, 11, 0, 0, 250000000}}});
}

TEST_F(Timestamp, UtcTimes)
{
    const std::vector<row> table = {
        {"4602281234Z", 0, {2046, 2, 28, 12, 34, 0, 0}},
        {"470228123456Z", 0, {1947, 2, 28, 12, 34, 56, 0}},
        {"2402000000Z", 21, none, {"Error - check_date: bad day value in generalizedTime\n"}},
        {"240101000Z", 21, none, {"Error - str2UTCTime: bad character in UTCTime\n"}},
        {"2401010060Z", 21, none, {"Error - str2UTCTime: bad minute value in UTCTime\n"}},
        {"24010100005Z", 21, none, {"Error - str2UTCTime: bad second value in UTCTime\n"}},
        {"2401010000.5Z", 21, none},  // nothing is stored when the zone is bad
    };
    present_year = 2026;
    expect_rows(str2UTCTime, table);
    present_year = -1;
    expect_rows(str2UTCTime, {{"2401010000Z", 1, none, {"Error - str2UTCTime: time function failed \n"}}});
}

// A text like a time, with every field on a limit or past it now and then, and at times a wrong character.
std::string random_time(std::mt19937& random, bool generalized)
{
    const auto pick = [&](int from, int to) { return std::uniform_int_distribution(from, to)(random); };
    const auto digits = [](int value) { return std::to_string(10000 + value).substr(1); };
    std::string text = digits(pick(0, 1) ? pick(1, 9999) : pick(0, 99) * 100).substr(generalized ? 0 : 2);
    for (int most : {13, 32, 24, 60, 60}) {
        text += pick(0, 30) ? digits(pick(0, 15) ? pick(1, most - 1) : most).substr(2) : "";
    }
    text += pick(0, 2) ? "" : "." + std::to_string(random()).substr(0, random() % 10);
    const std::string offset = digits(pick(0, 1) ? pick(0, 9999) : pick(0, 23) * 100 + pick(0, 59));
    text += std::vector<std::string>{"", "Z", "+" + offset, "-" + offset}.at(random() % 4);
    if (pick(0, 7) == 0) {
        text.at(random() % text.size()) = "0129Zz+-., \xFF"[pick(0, 11)];
    }
    return text;
}

TEST_F(Timestamp, RandomTextsReadAsBySlowImplementation)
{
    std::mt19937 random(20260701);
    int accepted = 0;
    for (int i = 0; i < 60000 && !HasFailure(); ++i) {
        const bool generalized = i % 2 == 0;
        present_year = std::uniform_int_distribution(1971, 2199)(random);
        const std::string text = random_time(random, generalized);
        const auto expected = test_support::slow_read_time(text, generalized, present_year, std::chrono::minutes(330));
        tag_timestamp_struct stored = none;
        EXPECT_EQ((generalized ? str2GeneralizedTime : str2UTCTime)(text.c_str(), &stored), expected.result) << text;
        EXPECT_EQ(stored, expected.stored.value_or(none)) << text << " in " << present_year;
        accepted += expected.result == 0 ? 1 : 0;
    }
    EXPECT_GT(accepted, 20000);
}

}  // namespace
