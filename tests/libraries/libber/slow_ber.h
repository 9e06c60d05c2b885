// A second, slow and obvious encoder of BER, and values of any shape for both.
#pragma once

#include <cstdint>
#include <random>
#include <string>
#include <vector>

namespace slow_ber {

inline std::string tlv(unsigned tag, const std::string& content)
{
    std::string octets;
    for (std::size_t rest = content.size(); rest != 0; rest /= 256) {
        octets.insert(octets.begin(), static_cast<char>(rest % 256));
    }
    if (content.size() < 128) {
        octets = std::string(1, static_cast<char>(content.size()));
    } else {
        octets.insert(octets.begin(), static_cast<char>(128 + octets.size()));
    }
    return static_cast<char>(tag) + octets + content;
}

// The fewest octets whose value, taken as two's complement, is the number.
inline std::string integer(unsigned tag, std::int64_t number)
{
    std::string octets;
    for (int shift = 56; shift >= 0; shift -= 8) {
        octets += static_cast<char>(number >> shift);
    }
    while (octets.size() > 1 && ((octets[0] == 0 && octets[1] >= 0) || (octets[0] == -1 && octets[1] < 0))) {
        octets.erase(0, 1);
    }
    return tlv(tag, octets);
}

inline std::string text(const std::string& bytes)
{
    return tlv(0x04, bytes);
}

inline std::string seq(const std::string& content)
{
    return tlv(0x30, content);
}

inline std::string set(const std::string& content)
{
    return tlv(0x31, content);
}

struct node {
    unsigned tag = 0;
    std::string bytes;            // of a primitive
    std::vector<node> members{};  // of a construction

    bool is_construction() const { return (tag & 0x20) != 0; }

    std::string encoded() const
    {
        std::string content = bytes;
        for (const node& member : members) {
            content += member.encoded();
        }
        return tlv(tag, content);
    }
};

// A tree with contents around the lengths at which the form of a length changes.
inline node random_tree(std::mt19937& random, unsigned depth)
{
    const auto below = [&](unsigned limit) { return static_cast<unsigned>(random() % limit); };
    if (depth != 0 && below(3) != 0) {
        node made{below(2) == 0 ? 0x30 : 0xA0 + below(31), ""};
        for (unsigned count = below(6); count != 0; --count) {
            made.members.push_back(random_tree(random, depth - 1));
        }
        return made;
    }
    static constexpr unsigned sizes[] = {0, 1, 20, 100, 120, 130, 250, 260, 65'530};
    return {below(2) == 0 ? 0x04 : 0x80 + below(31),
            std::string(sizes[below(8 + (below(20) == 0 ? 1 : 0))] + below(8), 'x')};
}

}  // namespace slow_ber
