// The generator of schemas: see generated_schema.h.
#include "bench/support/generated_schema.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <stdexcept>

#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace bench_support {

namespace {

constexpr std::size_t attribute_types_per_file = 2'000;
constexpr std::size_t column_name_limit = 17;
constexpr int deepest_supertype = 3;
constexpr int deepest_class = 3;

constexpr const char* owners[30] = {
    "account", "asset",  "badge", "branch", "building", "cable",  "cert",  "client", "contact", "cost",
    "crew",    "depot",  "desk",  "device", "dept",     "employ", "fleet", "group",  "host",    "item",
    "lab",     "member", "node",  "order",  "parcel",   "person", "rack",  "room",   "site",    "vendor",
};
constexpr const char* subjects[30] = {
    "Access", "Area",  "Audit", "Bill",  "Boot",  "Call",  "Card",  "Check", "Code",  "Dial",
    "Door",   "Entry", "Fax",   "Grade", "Home",  "Key",   "Lease", "Mail",  "Name",  "Net",
    "Owner",  "Pay",   "Phone", "Plan",  "Print", "Quota", "Role",  "Shift", "State", "Tax",
};
constexpr const char* aspects[30] = {
    "Alias", "Amount", "Begin", "Class",  "Count",  "Date",   "Digest", "End",   "Flag",  "Form",
    "Host",  "Id",     "Index", "Info",   "Kind",   "Label",  "Level",  "Limit", "Link",  "List",
    "Mode",  "Note",   "Path",  "Policy", "Rating", "Reason", "Status", "Text",  "Token", "Unit",
};

// What a type without a supertype is made of; each line as often as its weight.
struct kind_of_value {
    unsigned weight;
    const char* definition;
};
constexpr kind_of_value kinds_of_value[] = {
    {40, "EQUALITY caseIgnoreMatch SUBSTR caseIgnoreSubstringsMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.15{256}"},
    {15, "EQUALITY caseIgnoreMatch ORDERING caseIgnoreOrderingMatch SUBSTR caseIgnoreSubstringsMatch "
         "SYNTAX 1.3.6.1.4.1.1466.115.121.1.15"},
    {10, "EQUALITY caseIgnoreIA5Match SUBSTR caseIgnoreIA5SubstringsMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.26"},
    {12, "EQUALITY distinguishedNameMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.12"},
    {10, "EQUALITY integerMatch ORDERING integerOrderingMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.27 SINGLE-VALUE"},
    {6, "EQUALITY generalizedTimeMatch ORDERING generalizedTimeOrderingMatch "
        "SYNTAX 1.3.6.1.4.1.1466.115.121.1.24 SINGLE-VALUE"},
    {4, "EQUALITY booleanMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.7 SINGLE-VALUE"},
    {3, "EQUALITY octetStringMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.40"},
};

// Numbers that are the same everywhere: the standard fixes the engine's raw output, not what distributions make of it.
class numbers {
public:
    std::size_t below(std::size_t limit) { return engine_() % limit; }
    bool percent(std::size_t chance) { return below(100) < chance; }

private:
    std::mt19937 engine_{20'000};
};

const char* pick_kind_of_value(numbers& random)
{
    std::size_t ticket = random.below(100);
    for (const kind_of_value& kind : kinds_of_value) {
        if (ticket < kind.weight) {
            return kind.definition;
        }
        ticket -= kind.weight;
    }
    throw std::logic_error("the weights add up to less than 100");
}

std::string attribute_oid(std::size_t index)
{
    return "1.3.6.1.4.1.99999.4." + std::to_string(index / 100) + "." + std::to_string(index % 100);
}

std::string class_name(std::size_t index)
{
    return std::string(owners[index % 30]) + subjects[index / 30 % 30] + "Object" + std::to_string(index / 900);
}

// One attribute type after the other; a supertype is always an earlier one.
class attribute_generator {
public:
    void append_to(std::string& standard, std::string& extended)
    {
        const std::size_t index = depths_.size();
        const std::string name = generated_attribute_name(index);
        standard += "    ( " + attribute_oid(index) + " NAME ";
        standard += random_.percent(33) ? "( '" + name + "' 'x-" + name + "' )" : "'" + name + "'";
        standard += " DESC 'Says of the " + std::string(owners[index % 30]) + " what the register of the site keeps'\n";
        standard += "        " + value_definition(index) + " )\n";
        if (name.length() > column_name_limit || random_.percent(20)) {
            const std::string store_name = "gen" + std::to_string(index);
            extended += "    ( " + attribute_oid(index) + " DBNAME ( '" + store_name + "' '" + store_name +
                        "' ) ACCESS-CLASS NORMAL LENGTH 256 EQUALITY )\n";
        }
    }

private:
    std::string value_definition(std::size_t index)
    {
        if (index > 0 && random_.percent(33)) {
            const std::size_t supertype = random_.below(index);
            if (depths_[supertype] < deepest_supertype) {
                depths_.push_back(depths_[supertype] + 1);
                return "SUP " + generated_attribute_name(supertype);
            }
        }
        depths_.push_back(0);
        return pick_kind_of_value(random_);
    }

    numbers random_;
    std::vector<int> depths_;  // how many supertypes each type has above it
};

// The same for classes.
class class_generator {
public:
    explicit class_generator(schema_size size) : size_(size) {}

    void append_to(std::string& text)
    {
        const std::size_t index = depths_.size();
        text += "    ( 1.3.6.1.4.1.99999.6." + std::to_string(index) + " NAME '" + class_name(index) +
                "' DESC 'Entry of the register of the site'\n        SUP " + superclasses(index);
        text += random_.percent(25) ? " AUXILIARY\n" : " STRUCTURAL\n";
        const std::size_t count = 10 + random_.below(11);
        const std::size_t required = 1 + random_.below(3);
        text += "        MUST " + attributes(index, required) + "\n";
        text += "        MAY " + attributes(index, count - required) + " )\n";
    }

private:
    std::string superclasses(std::size_t index)
    {
        const std::size_t first = index == 0 || random_.percent(30) ? index : random_.below(index);
        if (first == index || depths_[first] >= deepest_class) {
            depths_.push_back(1);
            return "top";
        }
        const std::size_t second = random_.below(index);
        const bool two = random_.percent(5) && second != first && depths_[second] < deepest_class;
        depths_.push_back((two ? std::max(depths_[first], depths_[second]) : depths_[first]) + 1);
        return two ? "( " + class_name(first) + " $ " + class_name(second) + " )" : class_name(first);
    }

    // Half of a class's types are its own, the rest come from anywhere.
    std::string attributes(std::size_t index, std::size_t count)
    {
        std::string text;
        for (std::size_t i = 0; i < count; ++i) {
            const std::size_t own = index * size_.attribute_types / size_.classes + random_.below(20);
            const std::size_t chosen =
                random_.percent(50) ? own % size_.attribute_types : random_.below(size_.attribute_types);
            text += (i == 0 ? "" : " $ ") + generated_attribute_name(chosen);
        }
        return count == 1 ? text : "( " + text + " )";
    }

    numbers random_;
    schema_size size_;
    std::vector<int> depths_;
};

std::string read_file(const std::filesystem::path& file)
{
    std::ifstream in(file, std::ios::binary);
    if (!in) {
        throw std::runtime_error("can't read " + file.string());
    }
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

constexpr char root_definitions[] =
    "attributeTypes {\n"
    "    ( 2.5.4.0 NAME 'objectClass' EQUALITY objectIdentifierMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.38 )\n"
    "}\n"
    "objectClasses {\n"
    "    ( 2.5.6.0 NAME 'top' ABSTRACT MUST objectClass )\n"
    "}\n";

}  // namespace

const char* const additional_attribute =
    "( 1.3.6.1.4.1.99999.9.1 NAME ( 'parkingPermit' 'parkingTicket' ) DESC 'Place where the person may park' "
    "SUP accountAccessAlias )";

std::string generated_attribute_name(std::size_t index)
{
    return std::string(owners[index % 30]) + subjects[index / 30 % 30] + aspects[index / 900 % 30];
}

std::vector<schema_text> generate_schema(schema_size size)
{
    const std::filesystem::path shipped = DIRBASE_SOURCE_SCHEMA_DIR;
    std::vector<schema_text> files;
    for (const char* name : {"V3.core.sx", "V3.core.mr"}) {
        files.push_back({name, read_file(shipped / name)});
    }
    files.push_back({"V3.root", root_definitions});

    const std::size_t parts = std::max<std::size_t>(1, size.attribute_types / attribute_types_per_file);
    attribute_generator types;
    class_generator classes(size);
    std::vector<schema_text> class_files;
    for (std::size_t part = 0; part < parts; ++part) {
        std::string standard;
        std::string extended;
        for (std::size_t i = part * size.attribute_types / parts; i < (part + 1) * size.attribute_types / parts; ++i) {
            types.append_to(standard, extended);
        }
        std::string class_text;
        for (std::size_t i = part * size.classes / parts; i < (part + 1) * size.classes / parts; ++i) {
            classes.append_to(class_text);
        }
        const std::string name = "V3.part" + std::to_string(part);
        files.push_back(
            {name + ".at", "attributeTypes {\n" + standard + "}\n\nXANattributeTypes {\n" + extended + "}\n"});
        class_files.push_back({name + ".oc", "objectClasses {\n" + class_text + "}\n"});
    }
    std::move(class_files.begin(), class_files.end(), std::back_inserter(files));
    files.push_back({"V3.additions", ""});
    return files;
}

std::string shipped_schema_text()
{
    std::vector<std::filesystem::path> files;
    for (const auto& entry : std::filesystem::directory_iterator(DIRBASE_SOURCE_SCHEMA_DIR)) {
        if (entry.path().filename().string().rfind("V3.", 0) == 0) {
            files.push_back(entry.path());
        }
    }
    std::sort(files.begin(), files.end());
    std::string text;
    for (const std::filesystem::path& file : files) {
        text += read_file(file);
    }
    return text;
}

void require_shipped_schema()
{
    if (!ldcf_schema_g->attribute_types.empty()) {
        return;
    }
    provide_backend();
    ldcf_api_schema_init();
    ldcf_schema_g->parse_str(shipped_schema_text().c_str(), "shipped");
    if (ldcf_api_schema_complete() != 0 || ldcf_api_schema_complete_db_names() != 0) {
        std::abort();
    }
}

void provide_backend()
{
    static Backend relational_store{.be_type = "rdbm"};
    g_backends = &relational_store;
}

void parse_all(ldcf_schema& schema, const std::vector<schema_text>& texts)
{
    for (const schema_text& part : texts) {
        schema.parse_str(part.text.c_str(), part.file.c_str());
    }
}

}  // namespace bench_support
