#!/usr/bin/env bash
# Makes the seeds of the fuzzers again, those of the schema's from the shipped schema; run it when the schema or a
# grammar changed.
#
#   fuzz/make_seeds.sh
#
# parse_str_fuzz gets one definition of each shape (the sequence of its keywords), with the extended one that belongs to
# it. token_fuzz gets the beginnings of some files, stream_fuzz one text for each reader, time_fuzz one for each form,
# the fuzzers of DNs a DN a line, and cfg_fuzz configurations, each behind a base and a filter. What fuzz/minimise.sh kept
# in their folders goes, and is chosen again by its next run.
set -euo pipefail
cd "$(dirname "$0")"
schema=../share/schema
fuzzers=(parse_str_fuzz token_fuzz stream_fuzz time_fuzz dn_normalize_esc_fuzz dn_plain_fuzz cfg_fuzz)
rm -rf "${fuzzers[@]/#/corpus/}"
mkdir -p "${fuzzers[@]/#/corpus/}"

# Definitions are read as lists of words up to the parenthesis that closes them; what is quoted is one word.
cat $schema/V3.*.sx $schema/V3.*.mr $schema/V3.*.at $schema/V3.*.oc | awk -v out=corpus/parse_str_fuzz -v limit=18 '
    function take(    words, oid) {
        split(definition, words, " ")
        oid = words[2]
        if (section == "XANattributeTypes") {
            extended[oid] = definition
        } else if (definition !~ /NAME \047(objectClass|name|top|[A-Za-z0-9]+Match)\047/) {  # the fuzzer knows these
            sections[++count] = section
            oids[count] = oid
            definitions[count] = definition
        }
    }
    function is_name(word) { return word ~ /^[A-Za-z-]+$/ && word ~ /[a-z]/ && word != "top" }
    # Lets a definition refer only to what the fuzzer knows.
    function at_home(section, text,    words, count, i) {
        if (section == "attributeTypes")
            sub(/ SUP [A-Za-z-]+/, " SUP name", text)
        if (section != "objectClasses")
            return text
        sub(/DESC \047[^\047]*\047/, "DESC \047Text\047", text)
        sub(/ SUP [A-Za-z-]+/, " SUP top", text)
        count = split(text, words, " ")
        text = words[1]
        for (i = 2; i <= count; ++i)
            text = text " " (is_name(words[i]) ? (i % 4 ? "name" : "objectClass") : words[i])
        return text
    }
    # What two definitions have in common that differ only in names, oids and descriptions.
    function shape(text) {
        gsub(/\047[^\047]*\047/, "", text)
        gsub(/[a-z0-9.][A-Za-z0-9.{}-]*|[ ()$\n]+/, " ", text)
        gsub(/ +/, " ", text)
        return text
    }
    /^[A-Za-z]+ \{/ { section = $1 }
    /^#|^[A-Za-z}]/ { next }
    {
        sub(/^ +/, definition == "" ? "" : " ")
        definition = definition $0
        unquoted = definition
        gsub(/\047[^\047]*\047/, "", unquoted)
        if (definition != "" && gsub(/\(/, "", unquoted) == gsub(/\)/, "", unquoted)) {
            take()
            definition = ""
        }
    }
    END {
        for (i = 1; i <= count; ++i) {
            text = sections[i] " { " at_home(sections[i], definitions[i]) " }"
            if (sections[i] == "attributeTypes" && oids[i] in extended)
                text = text "\nXANattributeTypes { " extended[oids[i]] " }"
            if (!seen[sections[i], shape(text)]++ && made[sections[i]]++ < limit) {
                file = out "/" sections[i] "-" made[sections[i]]
                print text >file
                close(file)
            }
        }
    }'

# Definitions that refer to each other, and what the shipped schema has no example of.
cat >corpus/parse_str_fuzz/chain <<'END'
attributeTypes { ( 1.1 NAME ( 'a' 'b' ) SUP 1.2 ) ( 1.2 NAME 'c' SUP name SINGLE-VALUE ) ( 1.1 NAME 'd' SUP 1.2 ) }
objectClasses { ( 1.3 NAME 'e' SUP top MUST a ) ( 1.4 NAME 'f' SUP ( e $ top ) AUXILIARY MAY ( b $ c ) ) }
END
cat >corpus/parse_str_fuzz/forms <<'END'
# a comment
ldapSyntaxes: ( 1.5 DESC 'any text; (it) is here' )
matchingRules=( 1.6 NAME 'g' OBSOLETE SYNTAX '1.5' )
XANattributeTypes{( 1.7 DBNAME 'h' ACCESS-CLASS sensitive LENGTH 9 EQUALITY 2 ORDERING APPROX REVERSE
ENCRYPT AES-256 RETURN-VALUE type-only SECURE-CONNECTION-REQUIRED NONMATCHABLE )}
attributeTypes{( 1.7 NAME 'i' EQUALITY caseIgnoreMatch SYNTAX '1.3.6.1.4.1.1466.115.121.1.15{8}' )}
END
cat >corpus/parse_str_fuzz/named-later <<'END'
attributeTypes { ( 1.8 SUP name ) ( 1.8 NAME 'j' SUP name ) }
END

for file in core.at core.oc x509.sx config.at; do
    head -n 12 $schema/V3.$file >corpus/token_fuzz/$file
done
printf "a;b_c-d 1 1.2.3 'cn' 'a b' (){}\$=: # end\n\t'x\ny'" >corpus/token_fuzz/kinds

readers=("'cn'" "( cn \$ 'sn' \$ 2.5.4.1 )" "' 1.2.3 '" "64 )" "'any text'" "( 'a b' '1.2' )" "cn-x;y" "'cn'"
         "( 'a' 'B' 'A' )")
for i in "${!readers[@]}"; do
    printf '%s%s' "$i" "${readers[$i]}" >"corpus/stream_fuzz/$i"
done
printf '1( )' >corpus/stream_fuzz/empty-list

times=(20240229123456Z 20231231233000.5-0100 00010101000000,1234567+0001 20240701120000 2402291234Z 491231233000-0030
       5001010000+9999)
for i in "${!times[@]}"; do
    printf '%s' "${times[$i]}" >"corpus/time_fuzz/$i"
done

number=0
while IFS= read -r dn; do
    number=$((number + 1))
    printf '%s' "$dn" >"corpus/dn_normalize_esc_fuzz/$number"
    printf '%s' "$dn" >"corpus/dn_plain_fuzz/$number"
done <<'END'
CN=Bob Smith , c=Acme ; commonName=us
x=B+cn=a, 2.3=\#c, oid.1.1="d,\"e\"" ;exact=F
sn=b + cn=a\,b + commonName="c" , name=#0403414243
1.1=a+1.1=b+1.1=c,1.1=d
cn=\ a\ ,cn=a\20  ,cn=" a ",c=\C3\A9
cn=,x=\\ ,c="\<\=\>;+"
xan-kerberosname=abc,name=#41 ,cn=a\b
a.b@c.d
END

cat >corpus/cfg_fuzz/server <<'END'
cn=Schemas; CN = configuration
(xan-vrndIncludeSchema=/etc/V3.\2A)
# A comment
 that goes on
dn: cn=XAN Directory, cn=Schemas, cn=Configuration
xan-vrndIncludeSchema: /etc/V3.*
XAN-vrndIncludeSchema: /etc/schema/a path so long
  that it goes on in the next line
description:: w6TDtsO8

dn: cn=Configuration
objectClass: top
xan-vrndAdminPW: {AES256}9f0uKcqR

dn: cn=Schemas, cn=Configuration
END
cat >corpus/cfg_fuzz/names <<'END'
o=b
cn=*
dn:: Y249YQ==
sn:

dn: cn="y,o=b" + sn=\2C\" ; o=b
cn::  IHgKeQ==
cn:< file
END
printf '%b' '\nobjectclass=*\nDN: cn=a\r\ncn:  x \r\n  y\r\n\r\ndn: cn = A\r\n' >corpus/cfg_fuzz/twice
