// Attribute types: the two grammars, how two definitions meet in one body, the text forms, and comparison.
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::logged_arguments;
using schema_test::parsed;
using schema_test::refused;

namespace {

using attribute_map = ldcf_map_name_to<ldcf_attrtype>;

// Reads one definition into a map: "xan" ahead of it says that it is an extended one.
void read(attribute_map& map, const std::string& text, const char* file = "test")
{
    const bool extended = text.starts_with("xan");
    ldcf_token_factory factory(text.c_str() + (extended ? 3 : 0), file);
    extended ? ldcf_attrtype::parse_xan(factory, map) : ldcf_attrtype::parse_v3(factory, map);
}

// Reads definitions, the last of which may be refused; tells the refusal, or the keys and the two forms of the type.
std::string read_in_turn(const std::vector<std::string>& texts)
{
    attribute_map map;
    std::string result = refused([&] {
        for (const std::string& text : texts) {
            read(map, text);
        }
    });
    if (result.empty()) {
        for (const auto& entry : map) {
            result += std::string(entry.first) + ",";
        }
        result += map.begin()->second.v3_string().c_str() + std::string("|") + map.begin()->second.xan_string().c_str();
    }
    return result;
}

#define V3_LIST                                                                                           \
    "'NAME' 'DESC' 'OBSOLETE' 'SUP' 'EQUALITY' 'ORDERING' 'SUBSTR' 'SYNTAX' 'SINGLE-VALUE' 'COLLECTIVE' " \
    "'NO-USER-MODIFICATION' 'USAGE'"
#define XAN_LIST "'DBNAME' 'ACCESS-CLASS' 'LENGTH' 'EQUALITY' 'ORDERING' 'SUBSTR' 'APPROX' 'REVERSE'"
#define TOKEN(id) "exc_invalid_token_t " #id " @1: expected "
#define GRAMMAR "exc_invalid_grammar_t 2 @1: expected one of the following: "
#define SYNTAX_FAULT "exc_invalid_grammar_t 1 @1: expected numeric object ID or numeric object OID{ <number>}" NOT_FOUND

}  // namespace

TEST(LdcfAttrtype, DefinitionsReadAndPrint)
{
    const std::pair<const char*, const char*> cases[] = {
        {"(1.2)", "1.2,( 1.2 )|"},
        {"( 1.2 USAGE DSAOPERATION no-user-modification collective SINGLE-VALUE SYNTAX 1.3{64} SUBSTR c ORDERING b "
         "EQUALITY 'a' SUP name OBSOLETE DESC 'A type' NAME ( 'y' 'X' 'Y' ) )",
         "1.2,X,y,( 1.2 NAME ( 'y' 'X' ) DESC 'A type' OBSOLETE SUP name EQUALITY a ORDERING b SUBSTR c SYNTAX 1.3{64} "
         "SINGLE-VALUE COLLECTIVE NO-USER-MODIFICATION USAGE dSAOperation )|"},
        {"( 1 NAME 'a' NAME 'b' SUP c SUP 2.4 DESC 'x' DESC 'y' OBSOLETE OBSOLETE USAGE dSAOperation USAGE "
         "userapplications )",
         "1,b,( 1 NAME 'b' DESC 'y' OBSOLETE SUP 2.4 )|"},
        {"( 1 USAGE directoryOperation )", "1,( 1 USAGE directoryOperation )|"},
        {"( 1 USAGE distributedOperation )", "1,( 1 USAGE distributedOperation )|"},
        {"( 1 SYNTAX 3 {64} )", "1,( 1 SYNTAX 3{64} )|"},
        {"( 1 SYNTAX '1.3' )", "1,( 1 SYNTAX 1.3 )|"},
        {"( 1 SYNTAX '1.3'{64} )", "1,( 1 SYNTAX 1.3{64} )|"},
        {"( 1 SYNTAX ' 1.3 { 64 } ' OBSOLETE )", "1,( 1 OBSOLETE SYNTAX 1.3{64} )|"},
        {"( 1 SYNTAX 1.3{0} )", "1,( 1 SYNTAX 1.3 )|"},
        {"( abc NAME ( 'ABC' 'x' ) )", "abc,x,( abc NAME ( 'ABC' 'x' ) )|"},
        {"xan( 1 )", "1,( 1 )|( 1 )"},
        {"xan( 1 dbname ( 'a b' 'c' ) )", "1,( 1 )|( 1 DBNAME ( 'a b' 'c' ) )"},
        {"xan( 1 EQUALITY 16 ORDERING )", "1,( 1 )|( 1 EQUALITY 16 ORDERING )"},
        {"xan( 1 NONMATCHABLE secure-connection-required RETURN-VALUE TYPE-ONLY ENCRYPT aes-192 REVERSE 5 APPROX 4 "
         "SUBSTR 0 ORDERING 2 EQUALITY LENGTH 7 ACCESS-CLASS critical DBNAME 't' )",
         "1,( 1 )|( 1 DBNAME 't' ACCESS-CLASS CRITICAL LENGTH 7 EQUALITY ORDERING 2 SUBSTR APPROX 4 REVERSE 5 ENCRYPT "
         "AES-192 RETURN-VALUE type-only SECURE-CONNECTION-REQUIRED NONMATCHABLE )"},
        {"xan( 1 ACCESS-CLASS object ACCESS-CLASS Normal LENGTH 5 LENGTH 0 )", "1,( 1 )|( 1 )"},
        {"xan( 1 ACCESS-CLASS SENSITIVE ENCRYPT SSHA RETURN-VALUE encrypted )",
         "1,( 1 )|( 1 ACCESS-CLASS SENSITIVE ENCRYPT SSHA RETURN-VALUE encrypted )"},
        {"xan( 1 ACCESS-CLASS RESTRICTED ENCRYPT AES-128 )", "1,( 1 )|( 1 ACCESS-CLASS RESTRICTED ENCRYPT AES-128 )"},
        {"xan( 1 ACCESS-CLASS SYSTEM ENCRYPT AES-256 )", "1,( 1 )|( 1 ACCESS-CLASS SYSTEM ENCRYPT AES-256 )"},
        {"xan( 1 ACCESS-CLASS OBJECT )", "1,( 1 )|( 1 ACCESS-CLASS OBJECT )"},
    };
    for (const auto& [text, result] : cases) {
        EXPECT_EQ(read_in_turn({text}), result) << text;
    }
}

TEST(LdcfAttrtype, RefusalsNameWhatWasExpected)
{
    const std::pair<const char*, const char*> cases[] = {
        {"1", TOKEN(1) "'('" NOT_FOUND "'1'"},
        {"( 1 $ )", TOKEN(2) "one of the following: " V3_LIST " ')'" NOT_FOUND "'$ )'"},
        {"( 1 LENGTH )", GRAMMAR V3_LIST NOT_FOUND "'LENGTH )'"},
        {"( 1 USAGE 'x' )", TOKEN(15) "usage specification" NOT_FOUND "''x' )'"},
        {"( 1 USAGE x )",
         GRAMMAR "'userApplications' 'directoryOperation' 'distributedOperation' 'dSAOperation'" NOT_FOUND "'x )'"},
        {"( 1 SYNTAX cn )", SYNTAX_FAULT "'cn )'"},
        {"( 1 SYNTAX 'cn' )", SYNTAX_FAULT "''cn' )'"},
        {"( 1 SYNTAX '1.3{64' )", SYNTAX_FAULT "''1.3{64' )'"},
        {"( 1 SYNTAX '1.3{x}' )", SYNTAX_FAULT "''1.3{x}' )'"},
        {"( 1 SYNTAX '1.3{4}5' )", SYNTAX_FAULT "''1.3{4}5' )'"},
        {"( 1 SYNTAX '1.3 4' )", SYNTAX_FAULT "''1.3 4' )'"},
        {"( 1 SYNTAX 1.3{1.2} )", TOKEN(5) "number after '{'" NOT_FOUND "'1.2} )'"},
        {"( 1 SYNTAX '1.3'{4 )", TOKEN(6) "'}' after '{' <number>" NOT_FOUND "')'"},
        {"( 1 NAME 'a'", "exc_unexpected_end_of_input_t 13 @1: unexpected end of input"},
        {"xan( 1 $ )", TOKEN(2) "one of the following: " XAN_LIST " ')'" NOT_FOUND "'$ )'"},
        {"xan( 1 NAME )",
         GRAMMAR XAN_LIST " 'ENCRYPT' 'RETURN-VALUE' 'SECURE-CONNECTION-REQUIRED' 'NONMATCHABLE'" NOT_FOUND "'NAME )'"},
        {"xan( 1 DBNAME ( 'a' 'b' 'c' ) )",
         "exc_invalid_grammar_t 16 @1: expected one or two quoted strings (database table and/or column "
         "names)" NOT_FOUND "') )'"},
        {"xan( 1 ACCESS-CLASS 1 )", TOKEN(17) "ACCESS-CLASS specification" NOT_FOUND "'1 )'"},
        {"xan( 1 ACCESS-CLASS x )",
         GRAMMAR "'normal' 'sensitive' 'critical' 'restricted' 'system' 'object'" NOT_FOUND "'x )'"},
        {"xan( 1 LENGTH x )", TOKEN(5) "number after 'LENGTH'" NOT_FOUND "'x )'"},
        {"xan( 1 ENCRYPT 1 )", TOKEN(41) "ENCRYPT specification" NOT_FOUND "'1 )'"},
        {"xan( 1 ENCRYPT DES )", GRAMMAR "'SSHA' 'AES-128' 'AES-192' 'AES-256'" NOT_FOUND "'DES )'"},
        {"xan( 1 RETURN-VALUE 1 )", TOKEN(42) "RETURN-VALUE specification" NOT_FOUND "'1 )'"},
        {"xan( 1 RETURN-VALUE cleartext )", GRAMMAR "'encrypted' 'type-only'" NOT_FOUND "'cleartext )'"},
    };
    for (const auto& [text, fault] : cases) {
        EXPECT_EQ(read_in_turn({text}), fault) << text;
    }
}

TEST(LdcfAttrtype, TheTwoDefinitionsMeetInOneBodyInEitherOrder)
{
    const std::string standard = "( 1 NAME ( 'b' 'a' ) SYNTAX 5{3} )";
    const std::string result = "1,a,b,( 1 NAME ( 'b' 'a' ) SYNTAX 5{3} )|( 1 DBNAME 't' LENGTH 4 )";
    EXPECT_EQ(read_in_turn({standard, "xan( 1 DBNAME 't' LENGTH 4 )"}), result);
    EXPECT_EQ(read_in_turn({"xan( 1 DBNAME 't' LENGTH 4 )", standard}), result);
    EXPECT_EQ(read_in_turn({standard, "xan( A DBNAME 't' LENGTH 4 )"}), result);  // by a name that is known already

    attribute_map map;
    read(map, "xan( 1 DBNAME 't' )", "x");
    EXPECT_STREQ(map["1"].v3_string(), "( 1 )");  // asked for too early, which must not stand in the way
    read(map, standard, "v");
    EXPECT_STREQ((map["1"].v3_string() + map["1"]->v3_file() + map["1"]->xan_file()), (standard + "vx").c_str());
    EXPECT_EQ(map["1"]->state(), ldcf_attrtype_state::both_defined);

    const std::string taken = "exc_invalid_grammar_t 20 @1: attribute type '1' already has an XAN extended definition";
    EXPECT_EQ(read_in_turn({"xan( 1 )", "xan( 1 )"}), taken);
    EXPECT_EQ(read_in_turn({standard, "xan( 1 )", "xan( 1 )"}), taken);
    EXPECT_EQ(read_in_turn({standard, "( 2 NAME ( 'x' 'A' ) SYNTAX 5 )"}),
              "exc_invalid_grammar_t 18 @1: attribute type 'A' has already been defined");
    EXPECT_EQ(logged_arguments([&] { read(map, "xan( b )", "file"); }), (std::vector<std::string>{"file", "1", "'b'"}));

    // A type that is complete takes no further definition.
    map["1"]->complete(map, {}, {{"5", parsed<ldcf_syntax>("( 5 )")}});
    EXPECT_EQ(refused([&] { read(map, "( 1 NAME 'c' SYNTAX 5 )"); }), "exc_invalid_state_t 0: exc_invalid_state");
    EXPECT_EQ(refused([&] { read(map, "xan( 1 )"); }), "exc_invalid_state_t 0: exc_invalid_state");
    EXPECT_EQ(map.size(), 3u);
}

TEST(LdcfAttrtype, AlternateDefinitionsAddTheirNamesToTheFirst)
{
    attribute_map map;
    read(map, "( 1 NAME 'm' DESC 'd' SYNTAX 5 )");
    EXPECT_STREQ(map["1"].v3_string(), "( 1 NAME 'm' DESC 'd' SYNTAX 5 )");
    read(map, "( 1 NAME ( 'z' 'a' ) DESC 'd' SYNTAX 5 )");
    EXPECT_EQ(map.size(), 4u);
    EXPECT_TRUE(map["1"] == map["a"] && map["1"] == map["M"] && map["1"] == map["z"]);
    // A refused one leaves the first as it was.
    EXPECT_EQ(
        refused([&] { read(map, "( 1 NAME 'q' DESC 'd' SYNTAX 5 )", "other"); }),
        "exc_invalid_grammar_t 21 @1: all alternate definitions of same attribute type must be in a single file: '1' "
        "is also defined in test");
    EXPECT_EQ(refused([&] { read(map, "( 1 NAME 'q' SYNTAX 5 )"); }),
              "exc_invalid_grammar_t 22 @1: inconsistent attribute types 'q' and 'm' (with OID 1)");
    EXPECT_EQ(map.size(), 4u);
    EXPECT_STREQ(map["a"].v3_string(), "( 1 NAME ( 'm' 'a' 'z' ) DESC 'd' SYNTAX 5 )");

    // A type that was known by its oid alone goes by the first name that it gets, so that its text can be read back.
    attribute_map nameless;
    read(nameless, "( 2 SYNTAX 5 )");
    read(nameless, "( 2 NAME ( 'member' 'b' ) SYNTAX 5 )");
    EXPECT_STREQ(nameless["2"].v3_string(), "( 2 NAME ( 'member' 'b' ) SYNTAX 5 )");
    EXPECT_EQ(nameless["b"]->attr_id(), 0);

    const std::string rest = "EQUALITY e SYNTAX 5 SINGLE-VALUE";
    const std::pair<std::string, bool> items[] = {
        {"DESC 'e' SUP s EQUALITY e SYNTAX 5{9} SINGLE-VALUE", true},  // the length doesn't count
        {"DESC 'E' SUP s " + rest, false},
        {"DESC 'e' SUP S " + rest, false},  // case does
        {"DESC 'e' SUP s ORDERING o " + rest, false},
        {"DESC 'e' SUP s SUBSTR o " + rest, false},
        {"DESC 'e' SUP s COLLECTIVE " + rest, false},
        {"DESC 'e' SUP s OBSOLETE " + rest, false},
        {"DESC 'e' SUP s NO-USER-MODIFICATION " + rest, false},
        {"DESC 'e' SUP s USAGE dSAOperation " + rest, false},
        {"DESC 'e' SUP s EQUALITY f SYNTAX 5 SINGLE-VALUE", false},
        {"DESC 'e' SUP s EQUALITY e SYNTAX 5", false},
        {"DESC 'e' SUP s EQUALITY e SYNTAX 6 SINGLE-VALUE", false},
    };
    for (const auto& [text, agrees] : items) {
        const std::string result =
            read_in_turn({"( 1 NAME 'x' DESC 'e' SUP s " + rest + " )", "( 1 NAME 'y' " + text + " )"});
        EXPECT_EQ(result.starts_with("1,x,y,"), agrees) << result;
    }
}

TEST(LdcfAttrtype, WellKnownAttributesHaveTheirNumberAndClass)
{
    // The class, then names with their numbers.
    const char* const lines[] = {
        "1 subschemasubentry 10 XAN-capabilitiessubentry 18 replicaCredentials -21 xan-enabledcapabilities -11 "
        "xan-supportedcapabilities -12 subtreeSpecification -1",
        "3 aclpropagate -2 ownerpropagate -3 xan-filteraclinherit -4 xan-filteraclentry -5 aclsource -9 ownersource "
        "-10 aclEntry -16 entryowner -17 xan-effectiveacl -18",
        "4 aliasedObjectName -1 aliasedentryName -1",
        "5 xan-entryUUID 2 hasSubordinates 3 numSubordinates 24 xan-entryCheckSum 4 xan-entryCheckSumOp 5 creatorsName "
        "6 modifiersName 7 createTimestamp 8 modifytimestamp 9",
        "6 xan-replicationthisserverismaster 20 xan-replicationisquiesced 21 xan-replicationChangeLDIF -1 "
        "xan-replicationLastActivationTime -1 xan-replicationLastChangeId -1 xan-replicationLastFinishTime -1 "
        "xan-replicationLastGlobalChangeId -1 xan-replicationLastResult -1 xan-replicationLastResultAdditional -1 "
        "xan-replicationNextTime -1 xan-replicationPendingChangeCount -1 xan-replicationPendingChanges -1 "
        "xan-replicationState -1",
        "7 pwdchangedtime 11 pwdaccountlockedtime 12 xan-pwdaccountlocked 25 pwdexpirationwarned 13 pwdfailuretime 14 "
        "pwdhistory 15 pwdgraceusetime 16 pwdReset 17 xan-pwdgrouppolicydn 27 xan-pwdindividualpolicydn 28",
        "8 xan-allmembers -7 xan-allgroups -8",
        "9 MEMBER 0 uniqueMember 1 userpassword 22 secretkey 23 xan-replicaKeyPwd -22 changes -23 objectclass -6 cn "
        "-13 xan-membergroup -14 ref -15 any -1",
        "10 xan-vrndCryptoSync -19 xan-vrndCryptoSalt -20",
    };
    for (const char* const line : lines) {
        std::istringstream in(line);
        int attr_class = 0, id = 0;
        in >> attr_class;
        for (std::string name; in >> name >> id;) {
            const std::string text = "( 1 NAME ( '" + name + "' 'member' ) )";
            const ldcf_attrtype type = parsed<ldcf_attrtype>(text, "dir/V3.config.at.old");
            EXPECT_TRUE(type->attr_id() == id && type->attr_class() == attr_class) << name;
            const ldcf_attrtype configuration = parsed<ldcf_attrtype>(text, "dir/v3.CONFIG.at");
            EXPECT_TRUE(configuration->attr_id() == -1 && configuration->attr_class() == 2) << name;
        }
    }
    EXPECT_EQ(parsed<ldcf_attrtype>("( 1 NAME 'x' )", "V3.config.at")->attr_class(), 2);
    EXPECT_EQ(parsed<ldcf_attrtype>("( 1 NAME 'x' USAGE distributedOperation )")->attr_class(), 1);
}

TEST(LdcfAttrtype, ADefinitionListIsSearchedByNameAndByOid)
{
    std::string texts[] = {"( 1.2 broken", "( 1.3 NAME ( 'a' 'b' ) DESC 'x' )", "( 1.4 DESC 'x' NAME 'hidden' )",
                           "1.5",          "( 1.6 OBSOLETE name 'c' )",         "( word )"};
    std::vector<char*> list;
    for (std::string& text : texts) {
        list.push_back(text.data());
    }
    list.push_back(nullptr);
    const test_support::message_catcher log;
    // The oid of the first counts, being read ahead of its fault; a quoted text ahead of NAME hides the third's name.
    std::istringstream sought("a B c 1.3 oid.1.3 OID.1.6 1.4 1.2 | hidden x 1.5 1.30 oid.a word");
    bool found = true;
    for (std::string name; sought >> name;) {
        found = found && name != "|";
        const test_support::debug_catcher debug(LDAP_DEBUG_TRACE);
        EXPECT_EQ(attributeTypesContainsAttr(list.data(), name.data()), found) << name;
        EXPECT_EQ(debug.has("ldcf_attrtype::attributeTypesContainsAttr: attribute " + name +
                            " found in the given attributeType list\n"),
                  found);
    }
}

TEST(LdcfAttrtype, EqualityComparesWhatCompleteTypesSay)
{
    const std::string base = "NAME ( 'a' 'b' ) EQUALITY caseIgnoreMatch SYNTAX " ARC "15";
    const char* const extension = "DBNAME ( 't' 'c' ) ACCESS-CLASS CRITICAL";
    const auto make = [&](ldcf_schema& schema, const std::string& items, const std::string& extended) {
        schema.parse_str(schema_test::required_text().c_str(), "r");
        schema.parse_str(("attributeTypes { ( 7 NAME 's' SYNTAX " ARC "15 ) ( 6 " + items + " ) }").c_str(), "t");
        schema.parse_str(("XANattributeTypes:( 6 " + extended + " )").c_str(), "t");
        schema.complete();
        return schema.attribute_types["6"];
    };
    const auto equal = [&](const std::string& items, const std::string& extended, bool standard) {
        ldcf_schema one, two;
        const ldcf_attrtype a = make(one, base, extension);
        const ldcf_attrtype b = make(two, items, extended);
        return standard ? a.v3_syntax_equal(b) : a.xan_syntax_equal(b);
    };
    EXPECT_TRUE(equal("DESC 'd' NAME ( 'A' 'B' ) EQUALITY 2.5.13.2 SYNTAX " ARC "15{240}", extension, true));
    for (const char* items : {"NAME ( 'b' 'a' ) ", "NAME ( 'a' 'c' ) ", "SYNTAX " ARC "26",
                              "EQUALITY caseIgnoreIA5Match", "SUBSTR caseIgnoreSubstringsMatch", "SUP s", "OBSOLETE",
                              "SINGLE-VALUE", "COLLECTIVE", "NO-USER-MODIFICATION", "USAGE dSAOperation"}) {
        EXPECT_FALSE(equal(base + " " + items, extension, true)) << items;  // the last of a kind counts
    }
    EXPECT_TRUE(equal(base, "DBNAME ( 'T' 'c' ) ACCESS-CLASS CRITICAL LENGTH 9 EQUALITY NONMATCHABLE", false));
    EXPECT_FALSE(equal(base, "DBNAME 't' ACCESS-CLASS CRITICAL", false));
    EXPECT_FALSE(equal(base, "DBNAME ( 't' 'c' )", false));
}
