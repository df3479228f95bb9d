#include "SystemTool/IO/JsonDocument.h"

#include <limits>

#include <gtest/gtest.h>

using SystemTool::IO::JsonDocument;

namespace {

JsonDocument Parsed(const std::string& text) {
    std::string error;
    JsonDocument document;
    document.FromJson(text, error);
    EXPECT_EQ(error, "") << text;
    return document;
}

std::string ErrorOf(const std::string& text) {
    std::string error = "left from before";
    JsonDocument document = Parsed("1");
    document.FromJson(text, error);
    EXPECT_EQ(document.ToJson(), "null") << "a text that is no JSON leaves the document null";
    return error;
}

std::string Nested(int depth, char open, char close) {
    return std::string(static_cast<std::size_t>(depth), open) +
           std::string(static_cast<std::size_t>(depth), close);
}

} // namespace

TEST(JsonDocument, FillsTheDocumentAndReturnsIt) {
    std::string error = "left from before";
    JsonDocument document;
    const JsonDocument returned = document.FromJson(R"({"a":"b"})", error);
    EXPECT_EQ(error, "");
    EXPECT_EQ(document.ToJson(), R"({"a":"b"})");
    EXPECT_EQ(returned.ToJson(), R"({"a":"b"})");
}

TEST(JsonDocument, AbsentMembersAreEmptyTextAndZeroAndFalse) {
    for (const auto& absent :
         {Parsed(R"({"a":1})").GetKeyValue("b"), Parsed(R"({"b":null})").GetKeyValue("b"),
          Parsed("[1]").GetKeyValue("b"), Parsed("7").GetKeyValue("b"), JsonDocument(),
          JsonDocument().GetKeyValue("a").GetKeyValue("b")}) {
        EXPECT_EQ(absent.ToString(), "");
        EXPECT_EQ(absent.ToInt(), 0);
        EXPECT_EQ(absent.ToLongLong(), 0);
        EXPECT_FALSE(absent.IsLongLong());
        EXPECT_FALSE(absent.IsObject());
        EXPECT_EQ(absent.ToJson(), "null");
    }
}

TEST(JsonDocument, AStringsTextIsDecoded) {
    EXPECT_EQ(Parsed(R"("a\"b\\\/\n\u00e9\ud83d\ude00")").ToString(), "a\"b\\/\n\u00e9\U0001f600");
    EXPECT_EQ(Parsed(R"("a\u0000b")").ToString(), std::string("a\0b", 3));
}

TEST(JsonDocument, ANumbersTextIsThatOfJson) {
    for (const std::string text : {"0", "-7", "1.5", "0.1", "-0.25", "1700000000123", "9223372036854775807",
                                   "-9223372036854775808", "18446744073709551615"})
        EXPECT_EQ(Parsed(text).ToString(), text);
}

TEST(JsonDocument, BooleansAndContainersHaveTheirJsonAsText) {
    EXPECT_EQ(Parsed("true").ToString(), "true");
    EXPECT_EQ(Parsed("false").ToString(), "false");
    EXPECT_EQ(Parsed(R"( { "b" : [ 1 , {} , [] ] , "a" : null } )").ToString(),
              R"({"b":[1,{},[]],"a":null})");
    EXPECT_EQ(Parsed(R"([ "x" ])").ToString(), R"(["x"])");
}

TEST(JsonDocument, ToIntIsZeroForWhatIsNoIntegerInRange) {
    EXPECT_EQ(Parsed("2147483647").ToInt(), std::numeric_limits<int>::max());
    EXPECT_EQ(Parsed("-2147483648").ToInt(), std::numeric_limits<int>::min());
    for (const std::string text :
         {"2147483648", "-2147483649", "1.0", "1.5", R"("1")", "true", "[1]", R"({"a":1})"})
        EXPECT_EQ(Parsed(text).ToInt(), 0) << text;
}

TEST(JsonDocument, OnlySigned64BitIntegersAreLongLong) {
    EXPECT_TRUE(Parsed("9223372036854775807").IsLongLong());
    EXPECT_EQ(Parsed("9223372036854775807").ToLongLong(), std::numeric_limits<std::int64_t>::max());
    EXPECT_EQ(Parsed("-9223372036854775808").ToLongLong(), std::numeric_limits<std::int64_t>::min());
    for (const std::string text : {"9223372036854775808", "1.0", "1e3", R"("1")", "true"}) {
        EXPECT_FALSE(Parsed(text).IsLongLong()) << text;
        EXPECT_EQ(Parsed(text).ToLongLong(), 0) << text;
    }
}

TEST(JsonDocument, AnErrorSaysWhatIsWrongAndAtWhichByte) {
    EXPECT_EQ(ErrorOf(""), "The document is empty. At byte 0.");
    EXPECT_EQ(ErrorOf("hello"), "Invalid value. At byte 0.");
    EXPECT_EQ(ErrorOf(R"({"a":1)"), "Missing a comma or '}' after an object member. At byte 6.");
    EXPECT_EQ(ErrorOf(R"({"a":"b)"), "Missing a closing quotation mark in string. At byte 7.");
}

TEST(JsonDocument, TextBehindTheValueIsAnError) {
    EXPECT_NE(ErrorOf(R"({"a":1} x)").find("At byte 8."), std::string::npos);
    EXPECT_NE(ErrorOf(std::string("{}\0", 3)).find("At byte 2."), std::string::npos);
    EXPECT_NE(ErrorOf(std::string("{}\0{}", 5)).find("At byte 2."), std::string::npos);
    EXPECT_EQ(Parsed("{} \r\n\t").ToJson(), "{}");
}

TEST(JsonDocument, InvalidUtf8IsAnError) {
    for (const std::string bytes : {"\xff", "\xc3", "\xc0\xaf", "\xed\xa0\x80", "\xf5\x80\x80\x80", "a\x80"})
        EXPECT_NE(ErrorOf("\"" + bytes + "\""), "") << ::testing::PrintToString(bytes);
}

TEST(JsonDocument, InvalidUtf8IsAnErrorWhereverItStands) {
    for (std::size_t length = 1; length <= 24; ++length)
        for (std::size_t place = 0; place < length; ++place) {
            std::string text(length, 'a');
            text[place] = '\x80';
            EXPECT_EQ(ErrorOf("\"" + text + "\""),
                      "Invalid encoding in string. At byte " + std::to_string(place + 1) + ".");
        }
}

TEST(JsonDocument, ATextThatEndsWithinACharacterIsAnErrorOfAnyLength) {
    for (const std::size_t length : {1, 6, 7, 8, 4093, 4094, 4095, 4096, 5095, 10'239})
        for (const char lead : {'\xc3', '\xe2', '\xf1'}) {
            const std::string text = '"' + std::string(length - 1, 'a');
            EXPECT_EQ(ErrorOf(text + lead),
                      "Invalid encoding in string. At byte " + std::to_string(length) + ".");
        }
}

TEST(JsonDocument, ACopyOutlivesWhatItWasCopiedFrom) {
    JsonDocument changed;
    JsonDocument holder;
    {
        const JsonDocument source = Parsed(R"({"key":"a text of more than a few bytes"})");
        changed = source;
        changed.SetKeyValue("other", "text");
        holder.SetKeyValue("held", source);
        holder.SetKeyValue("string", source.GetKeyValue("key"));
    }
    EXPECT_EQ(changed.ToJson(), R"({"key":"a text of more than a few bytes","other":"text"})");
    EXPECT_EQ(holder.ToJson(), R"({"held":{"key":"a text of more than a few bytes"},)"
                               R"("string":"a text of more than a few bytes"})");
}

TEST(JsonDocument, HalfASurrogatePairIsAnError) {
    for (const std::string text : {R"("\ud800")", R"("\ud800x")", R"({"\udfff":1})", R"("a\udc00b")"})
        EXPECT_NE(ErrorOf(text), "") << text;
    EXPECT_EQ(ErrorOf(R"("\udc00")"), "Half a surrogate pair in string. At byte 8.");
    EXPECT_EQ(Parsed(R"("\ud7ff\ue000")").ToString(), "\ud7ff\ue000")
        << "the code points next to them are whole";
}

TEST(JsonDocument, AControlCharacterInAStringIsAnError) {
    EXPECT_NE(ErrorOf("\"a\nb\""), "");
    EXPECT_NE(ErrorOf(std::string("\"a\0b\"", 5)), "");
}

TEST(JsonDocument, APartOfAByteOrderMarkIsAnError) {
    for (const std::string text :
         {"\xef{}", "\xbb{}", "\xbf{}", "\xef\xbf{}", "\xef\xbb{}", "\xef\xbb\xbf\xef\xbb\xbf{}"})
        EXPECT_NE(ErrorOf(text), "") << ::testing::PrintToString(text);
    EXPECT_EQ(ErrorOf("\xef\xbb\xbf!"), "Invalid value. At byte 3.");
}

TEST(JsonDocument, AByteOrderMarkIsSkipped) {
    EXPECT_EQ(Parsed("\xef\xbb\xbf{}").ToJson(), "{}");
}

TEST(JsonDocument, NestingOf128LevelsIsReadAndOfOneMoreIsAnError) {
    EXPECT_EQ(Parsed(Nested(128, '[', ']')).ToJson(), Nested(128, '[', ']'));
    EXPECT_EQ(ErrorOf(Nested(129, '[', ']')).find("Nested deeper than 128 levels. At byte "), 0U);
}

TEST(JsonDocument, DepthIsNoSumOfSiblings) {
    std::string text = "[";
    for (int i = 0; i < 1000; ++i)
        text += "[],{},";
    EXPECT_EQ(Parsed(text + "0]").ToJson(), text + "0]");
}

TEST(JsonDocument, MillionsOfOpeningBracketsCostNoStack) {
    EXPECT_NE(ErrorOf(std::string(4'000'000, '[')), "");
    std::string objects;
    for (int i = 0; i < 1'000'000; ++i)
        objects += R"({"a":)";
    EXPECT_NE(ErrorOf(objects), "");
}

TEST(JsonDocument, ANumberBeyondTheRangeOfADoubleIsAnError) {
    EXPECT_NE(ErrorOf("1e400"), "");
    EXPECT_NE(ErrorOf(std::string(5000, '9')), "");
    for (const std::string text : {"10e308", "-10e308", "123e307", "17976931348623159e292"})
        EXPECT_EQ(ErrorOf("[" + text), "Number too big to be stored in double. At byte 1.");
    EXPECT_EQ(Parsed("0." + std::string(5000, '3')).ToString(), "0.3333333333333333");
}

TEST(JsonDocument, ANumberIsTheDoubleNearestToItsText) {
    const auto number = [](const std::string& text) {
        return std::strtod(Parsed(text).ToString().c_str(), nullptr);
    };
    for (const std::string text :
         {"184467440737095516155", "18446744073709551615.5", "1.84467440737095516155",
          "1844674407370955161559999", "-184467440737095516155e-20", "0.0e309", "0e-324", "1e-400", "-1e-400",
          "5e-324", "2.2250738585072011e-308", "1.7976931348623157e308", "0.000001e310", "9007199254740993",
          "9007199254740993.0", "-18446744073709551615"})
        EXPECT_EQ(number(text), std::strtod(text.c_str(), nullptr)) << text;
}

TEST(JsonDocument, ZeroIsANumberWhateverItsExponent) {
    for (const std::string text : {"0e309", "0.0e999", "0E+309", "0.000e99999999999999999999"})
        EXPECT_EQ(Parsed("[" + text + "]").ToJson(), "[0.0]") << text;
    EXPECT_EQ(Parsed("-0e400").ToJson(), "-0.0");
    EXPECT_EQ(Parsed(R"({"0e309":"0e309 \" 0e309\\","a":[1,-0.0e309,"\\"],"ü":0e309})").ToJson(),
              R"({"0e309":"0e309 \" 0e309\\","a":[1,-0.0,"\\"],"ü":0.0})");
}

TEST(JsonDocument, ANumberOfThreeHundredDigitsIsReadWhenADoubleHoldsIt) {
    EXPECT_EQ(Parsed("[17976931348623157" + std::string(292, '0') + "]").ToJson(),
              "[1.7976931348623157e308]");
    EXPECT_EQ(Parsed("[-1" + std::string(400, '0') + ".5e-400,18446744073709551615]").ToJson(),
              "[-1.0,18446744073709551615]");
}

TEST(JsonDocument, AnErrorBehindANumberThatTheParserRefusesIsToldWithItsByte) {
    EXPECT_EQ(ErrorOf("[0e309,1e309]"), "Number too big to be stored in double. At byte 7.");
    EXPECT_EQ(ErrorOf("[0e309,-0.0e400,]"), "Invalid value. At byte 16.");
    EXPECT_EQ(ErrorOf("\xef\xbb\xbf[0e309,nul]"), "Invalid value. At byte 13.");
    EXPECT_EQ(ErrorOf("[0e309.5]"), ErrorOf("[0e300.5]"));
    EXPECT_NE(ErrorOf("[0e309e5]"), "");
    EXPECT_EQ(ErrorOf("[0e309,-00000000000000000000555111512312578276]"),
              "Missing a comma or ']' after an array element. At byte 9.");
    EXPECT_EQ(ErrorOf("[0e309,-0e0e309]"), ErrorOf("[0e300,-0e0e309]"));
    EXPECT_NE(ErrorOf("[0e309,\"0e309"), "");
    EXPECT_NE(ErrorOf("[0e309,-"), "");
    EXPECT_NE(ErrorOf("[0e309,\"\\"), "");
    EXPECT_NE(ErrorOf("0e309 0e309"), "");
}

TEST(JsonDocument, OfMembersWithTheSameKeyTheFirstIsRead) {
    EXPECT_EQ(Parsed(R"({"a":1,"a":2})").GetKeyValue("a").ToInt(), 1);
}

TEST(JsonDocument, KeysAreComparedWhole) {
    const auto document = Parsed(R"({"":1,"a\u0000b":2,"a":3})");
    EXPECT_EQ(document.GetKeyValue("").ToInt(), 1);
    EXPECT_EQ(document.GetKeyValue(std::string("a\0b", 3)).ToInt(), 2);
    EXPECT_EQ(document.GetKeyValue("a").ToInt(), 3);
}

TEST(JsonDocument, AMovedFromDocumentIsStillOne) {
    JsonDocument document = Parsed(R"({"a":1})");
    const JsonDocument moved = std::move(document);
    EXPECT_EQ(document.ToJson(), R"({"a":1})");
    EXPECT_EQ(moved.ToJson(), R"({"a":1})");
}

TEST(JsonDocument, AMemberOutlivesTheDocumentItCameFrom) {
    JsonDocument member;
    {
        const auto document = Parsed(R"({"a":{"b":"a text that is too long for the string object itself"}})");
        member = document.GetKeyValue("a");
    }
    EXPECT_EQ(member.GetKeyValue("b").ToString(), "a text that is too long for the string object itself");
}

TEST(JsonDocument, SettingAMemberOfANewDocumentMakesAnObject) {
    JsonDocument document;
    document.SetKeyValue("b", std::string("1"));
    document.SetKeyValue("a", Parsed("[1,2]"));
    document.SetKeyValue("c", JsonDocument());
    EXPECT_EQ(document.ToJson(), R"({"b":"1","a":[1,2],"c":null})");
    EXPECT_TRUE(document.IsObject());
}

TEST(JsonDocument, SettingReplacesAllMembersOfThatNameInTheFirstOnesPlace) {
    JsonDocument document = Parsed(R"({"x":0,"a":1,"b":2,"a":3,"a":4,"c":5})");
    document.SetKeyValue("a", std::string("new"));
    EXPECT_EQ(document.ToJson(), R"({"x":0,"a":"new","b":2,"c":5})");
}

TEST(JsonDocument, SettingInACopyLeavesTheOriginalAlone) {
    JsonDocument original = Parsed(R"({"a":{"b":1}})");
    JsonDocument copy = original;
    JsonDocument member = original.GetKeyValue("a");
    copy.SetKeyValue("x", std::string("y"));
    member.SetKeyValue("b", std::string("z"));
    EXPECT_EQ(original.ToJson(), R"({"a":{"b":1}})");
    EXPECT_EQ(copy.ToJson(), R"({"a":{"b":1},"x":"y"})");
    EXPECT_EQ(member.ToJson(), R"({"b":"z"})");
}

TEST(JsonDocument, ATextThatIsNoUtf8IsSetWithReplacementCharacters) {
    JsonDocument document;
    document.SetKeyValue("a", std::string("x\xff\xc3(\xe2\x82y\0z\xc3\xa9", 11));
    EXPECT_EQ(document.ToJson(), "{\"a\":\"x\ufffd\ufffd(\ufffd\ufffdy\\u0000z\u00e9\"}");
    EXPECT_EQ(Parsed(document.ToJson()).ToJson(), document.ToJson());
}

TEST(JsonDocument, CanBeSetAsAMemberOfItself) {
    JsonDocument document = Parsed(R"({"a":1})");
    document.SetKeyValue("self", document);
    EXPECT_EQ(document.ToJson(), R"({"a":1,"self":{"a":1}})");
}

TEST(JsonDocument, SettingAMemberOfWhatIsNoObjectThrows) {
    for (const std::string text : {"5", R"("text")", "[1]", "true"}) {
        JsonDocument document = Parsed(text);
        EXPECT_THROW(document.SetKeyValue("a", std::string("b")), std::logic_error) << text;
        EXPECT_EQ(document.ToJson(), text);
    }
    JsonDocument null = Parsed("null");
    null.SetKeyValue("a", std::string("b"));
    EXPECT_EQ(null.ToJson(), R"({"a":"b"})");
}

TEST(JsonDocument, PrintsWhatItParsedAndParsesWhatItPrints) {
    const std::string text =
        R"({"eventID":"A100|10001","value":{"k":[1,2.5,"\u0001\"\\",true,null]},"createTime":1})";
    EXPECT_EQ(Parsed(text).ToJson(), text);
    EXPECT_EQ(Parsed(Parsed(text).ToJson()).ToJson(), text);
}

TEST(JsonDocument, BuildingDeepDocumentsCostsNoStack) {
    JsonDocument document = Parsed("[]");
    for (int i = 0; i < 2000; ++i) {
        JsonDocument outer;
        outer.SetKeyValue("a", document);
        document = outer;
    }
    EXPECT_EQ(document.ToJson().size(), 2000 * std::string(R"({"a":})").size() + 2);
}
