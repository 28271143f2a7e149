// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>

#include "core/Json.h"
#include "core/PropertyList.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;

/// Texts that careless writers cut, trim, double or confuse with markup.
KSArray awkwardTexts() {
    return {"",           " ",          "  two  ", "\t\n\r\n end", "<b>&amp;</b>",
            "]]>",        "\"quoted\"", "\\back",  "\x01\x1f",     "ünïcode \xf0\x9f\x8e\x88",
            "2024-06-15", "true",       "&#65;",   "-->"};
}

KSDictionary everyKind() {
    return {{"no", false},
            {"yes", true},
            {"least", std::numeric_limits<std::int64_t>::min()},
            {"most", std::numeric_limits<std::int64_t>::max()},
            {"third", 1.0 / 3},
            {"tiny", 5e-324},
            {"huge", -1.7976931348623157e308},
            {"whole", 5.0},
            {"texts", awkwardTexts()},
            {"", "an empty key"},
            {"a <key> & \"more\"", KSDictionary{}},
            {"nested", KSDictionary{{"empty", KSArray{}}, {"deep", KSArray{KSArray{KSArray{1}}}}}}};
}

TEST(Json, ReadsBackWhatItWrites) {
    auto values = everyKind();
    values["null"] = KSValue();
    const auto text = jsonText(values);
    ASSERT_TRUE(text);
    EXPECT_EQ(parseJson(*text), KSValue(values)) << *text;

    const KSDictionary flattened{{"bytes", KSValue::Bytes{0, 255}},
                                 {"date", KSDate{1.5}},
                                 {"nul", std::string("a\0b", 3)},
                                 {"uuid", *KSUUID::parse("00112233-4455-6677-8899-aabbccddeeff")}};
    EXPECT_EQ(parseJson(jsonText(flattened).value_or("")),
              KSValue(KSDictionary{{"bytes", KSArray{0, 255}},
                                   {"date", 1.5},
                                   {"nul", std::string("a\0b", 3)},
                                   {"uuid", "00112233-4455-6677-8899-aabbccddeeff"}}));
    EXPECT_EQ(parseJson("18446744073709551615"), KSValue(18446744073709551615.0));
}

TEST(Json, RefusesWhatItCannotHold) {
    for (const auto& value : {KSValue(std::nan("")), KSValue(INFINITY), KSValue(KSDate{-INFINITY}),
                              KSValue("\xff"), KSValue(KSDictionary{{"\xc3", 1}})}) {
        EXPECT_FALSE(jsonText(KSArray{value})) << value.description();
    }
    for (const char* text : {"", "{", "[1,]", "{\"a\":1}x", "nan", "1e999", "\"\xff\"", "'a'",
                             "{\"a\":1 \"b\":2}", "[1] [2]", "// x\n1"}) {
        EXPECT_FALSE(parseJson(text)) << text;
    }
    const auto nested = [](std::size_t levels) {
        return std::string(levels, '[') + std::string(levels, ']');
    };
    EXPECT_TRUE(parseJson(nested(64)));
    EXPECT_FALSE(parseJson(nested(65)));
    EXPECT_FALSE(parseJson(nested(1000000)));
    EXPECT_FALSE(parseJson(std::string(1000000, '[')));
}

TEST(PropertyList, ReadsBackWhatItWrites) {
    auto values = everyKind();
    values["date"] = *KSValue(parseISO8601("2024-06-15T10:02:03Z")->date).asDate();
    for (std::size_t size = 0; size < 5; ++size) {
        KSValue::Bytes bytes;
        for (std::size_t i = 0; i < size; ++i) bytes.push_back(static_cast<std::uint8_t>(251 + i));
        values["bytes" + std::to_string(size)] = bytes;
    }
    const auto text = propertyListText(values);
    const auto read = parsePropertyList(text);
    ASSERT_TRUE(read) << read.error().description();
    EXPECT_EQ(*read, values) << text;
}

TEST(PropertyList, HasNoFormForNullAndPartsOfSeconds) {
    const auto read = parsePropertyList(propertyListText({{"null", KSValue()},
                                                          {"array", KSArray{KSValue(), 1}},
                                                          {"date", KSDate{-0.25}},
                                                          {"nul", std::string("a\0b", 3)}}));
    ASSERT_TRUE(read);
    EXPECT_EQ(*read,
              (KSDictionary{{"array", KSArray{1}}, {"date", KSDate{-1}}, {"nul", "a\ufffdb"}}));
}

TEST(PropertyList, ReadsListsOfOtherWriters) {
    const auto read = parsePropertyList(
        "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
        "<!DOCTYPE plist PUBLIC \"-//X//DTD PLIST 1.0//EN\" \"http://x.invalid/x.dtd\">\n"
        "<plist version=\"1.0\">\n <!-- made by hand -->\n<dict>\n\t<key>a</key>\n\t<array> "
        "</array>\n"
        "<!-- more --><key> b </key><data>\n\tAA\n\tEC </data>\n<key>c</key><string><![CDATA[<x>]]>"
        "</string><key>d</key><string>one<!-- two --> three</string><key>e</key><dict> </dict>"
        "<key>f</key><integer> 7 </integer></dict></plist>\n");
    ASSERT_TRUE(read) << read.error().description();
    EXPECT_EQ(*read, (KSDictionary{{"a", KSArray{}},
                                   {" b ", KSValue::Bytes{0, 1, 2}},
                                   {"c", "<x>"},
                                   {"d", "one three"},
                                   {"e", KSDictionary{}},
                                   {"f", 7}}));
    for (const char* text :
         {"", "<plist/>", "<plist><array/></plist>", "<plist><dict><key>a</key></dict></plist>",
          "<plist><dict><string>a</string><key>b</key></dict></plist>",
          "<plist><dict><key>a</key><integer>1x</integer></dict></plist>",
          "<plist><dict><key>a</key><date>soon</date></dict></plist>",
          "<plist><dict><key>a</key><data>*</data></dict></plist>",
          "<plist><dict><key>a</key><blob/></dict></plist>",
          "<plist><dict><key>a</key>text<true/></dict></plist>",
          "<plist><dict><key>a</key><integer>99999999999999999999</integer></dict></plist>"}) {
        EXPECT_FALSE(parsePropertyList(text)) << text;
    }
    std::string deep = "<plist><dict><key>a</key>";
    for (int i = 0; i < 100000; ++i) deep += "<array>";
    EXPECT_FALSE(parsePropertyList(deep));
    for (int i = 0; i < 100000; ++i) deep += "</array>";
    EXPECT_FALSE(parsePropertyList(deep + "</dict></plist>"));
}

TEST(PropertyList, AFileCutAnywhereIsAnErrorOrWhole) {
    const auto values = everyKind();
    const auto text = propertyListText(values);
    for (std::size_t length = 0; length < text.size(); ++length) {
        const auto read = parsePropertyList(std::string_view(text).substr(0, length));
        if (read) {
            EXPECT_EQ(*read, values) << "cut at " << length;
        } else {
            EXPECT_THAT(read.error().description(), HasSubstr("property list"));
        }
    }
}

}  // namespace
}  // namespace keepsakes
