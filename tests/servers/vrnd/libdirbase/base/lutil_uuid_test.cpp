// Random bytes and identifiers. The digest's functions are met on their way from the library, so that what enters into
// a result can be looked at and the result made again.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include <dlfcn.h>
#include <unistd.h>

#include "libraries/libvrnutil/lutil_md5.h"
#include "servers/vrnd/libdirbase/base/lutil_uuid.h"

namespace {

using bytes = std::vector<unsigned char>;

// While set, takes what this thread's digests run over.
thread_local std::vector<bytes>* digested = nullptr;

}  // namespace

extern "C" void lutil_MD5Update(lutil_MD5Context* context, const unsigned char* data, std::size_t length)
{
    static const auto next = reinterpret_cast<decltype(lutil_MD5Update)*>(dlsym(RTLD_NEXT, "lutil_MD5Update"));
    if (digested != nullptr) {
        digested->emplace_back(data, data + length);
    }
    next(context, data, length);
}

namespace {

bytes md5(const bytes& first, const bytes& second)
{
    lutil_MD5Context context;
    lutil_MD5Init(&context);
    lutil_MD5Update(&context, first.data(), first.size());
    lutil_MD5Update(&context, second.data(), second.size());
    bytes digest(16);
    lutil_MD5Final(digest.data(), &context);
    return digest;
}

TEST(LutilEntropy, EachRoundIsTheDigestOfTheBlockAndTheBuffer)
{
    std::uint64_t last_counter = 0;
    for (const std::size_t size : {1u, 16u, 17u, 50u}) {
        bytes buffer(size, 0xA5);
        bytes expected = buffer;
        std::vector<bytes> fed;
        digested = &fed;
        EXPECT_EQ(lutil_entropy(buffer.data(), size), 0);
        digested = nullptr;

        const std::size_t rounds = (size + 15) / 16;
        ASSERT_EQ(fed.size(), 2 * rounds) << size;
        std::uint64_t stack = 0;
        for (std::size_t round = 1; round <= rounds; ++round) {
            const bytes& block = fed[2 * round - 2];
            std::uint64_t words[6];
            ASSERT_EQ(block.size(), sizeof words);
            std::memcpy(words, block.data(), sizeof words);
            EXPECT_TRUE(last_counter == 0 || words[0] == last_counter + 1);
            last_counter = words[0];
            EXPECT_EQ(words[1], reinterpret_cast<std::uintptr_t>(buffer.data()));
            EXPECT_TRUE(words[2] != 0 && (round == 1 || words[2] == stack));
            stack = words[2];
            EXPECT_EQ(words[3], static_cast<std::uint64_t>(getpid()) + round);
            EXPECT_NEAR(static_cast<double>(words[4]), static_cast<double>(std::time(nullptr)), 60);
            EXPECT_EQ(words[5], round);

            EXPECT_EQ(fed[2 * round - 1], expected) << "the whole buffer as it stands";
            const bytes digest = md5(block, expected);
            const std::size_t done = 16 * (round - 1);
            std::copy_n(digest.data(), std::min<std::size_t>(16, size - done), expected.data() + done);
        }
        EXPECT_EQ(buffer, expected) << size;
    }
    EXPECT_EQ(lutil_entropy(nullptr, 0), 0);
}

std::string new_uuid()
{
    char text[37];
    EXPECT_EQ(lutil_uuidstr(text, sizeof text), 36u);
    return text;
}

TEST(LutilUuidstr, ManyThreadsGetDifferentIdentifiersAndBytesAndOneNodeWithTheTopBitSet)
{
    std::vector<std::set<std::string>> made(16);  // for each thread its identifiers, and its random bytes
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < made.size(); i += 2) {
        threads.emplace_back([&made, i] {
            for (int round = 0; round < 1000; ++round) {  // no more than the sequence tells apart within a second
                made[i].insert(new_uuid());
                unsigned char random[16] = {};
                lutil_entropy(random, sizeof random);
                made[i + 1].emplace(random, random + sizeof random);
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    std::set<std::string> all;
    for (std::set<std::string>& mine : made) {
        all.merge(mine);
    }
    EXPECT_EQ(all.size(), 16'000u);
    EXPECT_NE(lutil_eaddr()[0] & 0x80, 0);
    const std::string node = new_uuid().substr(24);
    for (const std::string& text : all) {
        EXPECT_TRUE(text.size() == 16 || text.substr(24) == node) << text;
    }
}

std::uint64_t hex(const std::string& text)
{
    return std::strtoull(text.c_str(), nullptr, 16);
}

TEST(LutilUuidstr, TheGroupsHoldTheTimeTheSequenceAndTheNode)
{
    std::uint64_t last_sequence = hex(new_uuid().substr(19, 4));
    for (int round = 0; round < 3; ++round) {
        const std::string text = new_uuid();
        ASSERT_THAT(text, testing::MatchesRegex("[0-9a-f]{8}-[0-9a-f]{4}-[0-9a-f]{4}-[0-9a-f]{4}-[0-9a-f]{12}"));

        const std::uint64_t time_high = hex(text.substr(14, 4)) - 0x1000;
        const std::uint64_t time = time_high << 48 | hex(text.substr(9, 4)) << 32 | hex(text.substr(0, 8));
        const std::uint64_t units = time - 477316125000000;  // 0x1B21DD2138140
        EXPECT_EQ(units % 10000000, 0u);
        EXPECT_NEAR(static_cast<double>(units) / 1e7, static_cast<double>(std::time(nullptr)), 60);

        const std::uint64_t sequence = hex(text.substr(19, 4));
        EXPECT_EQ(sequence - 0x8000, (last_sequence - 0x8000 + 1) % 8192) << text;
        last_sequence = sequence;
        for (std::size_t i = 0; i < 6; ++i) {
            EXPECT_EQ(hex(text.substr(24 + 2 * i, 2)), lutil_eaddr()[i]) << text;
        }
    }
}

TEST(LutilUuidstr, ATextThatDoesNotFitIsNotWritten)
{
    for (const std::size_t size : {0u, 1u, 36u}) {
        std::string buffer(37, '#');
        EXPECT_EQ(lutil_uuidstr(buffer.data(), size), 0u);
        EXPECT_EQ(buffer, std::string(37, '#'));
    }
    EXPECT_EQ(lutil_uuidstr(nullptr, 0), 0u);
}

}  // namespace
