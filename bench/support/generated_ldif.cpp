// An LDIF file of any size: see generated_ldif.h.
#include "bench/support/generated_ldif.h"

#include <array>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace bench_support {

namespace {

constexpr const char* first_names[] = {"Aldra", "Bevin",  "Corwen", "Delwyn", "Farrin", "Hollis", "Ineke",
                                       "Kessa", "Lorcan", "Nialla", "Perrin", "Quenna", "Sivert"};
constexpr const char* last_names[] = {"Amberbrook", "Birchcroft", "Copperdale", "Fallowfell", "Glimgarth", "Hazelholt",
                                      "Larchmere",  "Nettlenook", "Otterquist", "Elderstead", "Marrowyard"};
constexpr const char* units[] = {"Accounts", "Clockwork", "Drawing Office", "Glass House", "Library", "Shipping"};
constexpr std::size_t group_every = 100;
constexpr std::size_t members = 50;
constexpr std::size_t flush_above = std::size_t{1} << 20;

template <std::size_t count>
const char* pick(const char* const (&words)[count], std::size_t number)
{
    return words[number % count];
}

std::string person_dn(std::size_t number)
{
    return "uid=u" + std::to_string(number) + ",ou=" + pick(units, number) + ",ou=People,o=Quillhaven Works";
}

void append_person(std::string& text, std::size_t number)
{
    const std::string digits = std::to_string(number);
    const std::string first = pick(first_names, number);
    const std::string last = pick(last_names, number / 7);
    text += "dn: " + person_dn(number) + "\nobjectClass: top\nobjectClass: person\n";
    text += "objectClass: organizationalPerson\nobjectClass: inetOrgPerson\n";
    text += "cn: " + first + " " + last + "\nsn: " + last + "\ngivenName: " + first + "\nuid: u" + digits;
    text += "\nmail: u" + digits + "@quillhaven.example\ntelephoneNumber: +1 555 01" + digits;
    text += "\nemployeeNumber: " + digits + "\nou: " + pick(units, number);
    if (number % 3 == 0) {
        text += "\ntitle;lang-de:: R8OkcnRuZXI=";
    }
    if (number % 5 == 0) {
        text += "\ndescription: has looked after the lathes, the lamps and the ladders for years, and\n"
                "  knows where everything is";
    }
    text += "\nmanager: " + person_dn(number / group_every) + "\n\n";
}

void append_group(std::string& text, std::size_t number)
{
    text += "dn: cn=group " + std::to_string(number) + ",ou=Groups,o=Quillhaven Works\n";
    text += "objectClass: top\nobjectClass: groupOfNames\ncn: group " + std::to_string(number) + "\n";
    for (std::size_t i = 0; i < members; ++i) {
        text += "member: " + person_dn(number + 1 + i) + "\n";
    }
    text += '\n';
}

}  // namespace

void generate_ldif(const std::string& path, std::size_t entries)
{
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    std::string text = "version: 1\n\n";
    for (std::size_t number = 0; number < entries; ++number) {
        if (number % group_every == 0) {
            append_group(text, number);
        } else {
            append_person(text, number);
        }
        if (text.size() > flush_above || number + 1 == entries) {
            out << text;
            text.clear();
        }
    }
    if (!out.flush()) {
        throw std::runtime_error("can't write " + path);
    }
}

}  // namespace bench_support
