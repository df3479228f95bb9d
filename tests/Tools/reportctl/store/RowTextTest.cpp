#include "Tools/reportctl/store/RowText.h"

#include <gtest/gtest.h>

namespace {

using reportctl::store::AppendCsv;
using reportctl::store::AppendJsonLine;
using reportctl::store::ReportRow;

ReportRow Row() {
    return {.id = 7,
            .at = "2023-11-14T22:13:20.123Z",
            .event = "B100|10001",
            .module = "B100",
            .action = "10001",
            .value = "hello",
            .isJson = false,
            .openid = "u1",
            .suiteVersion = "5.1.0.2",
            .createTime = "1700000000123"};
}

ReportRow RowWithValue(ReportRow::Text value, bool isJson = false) {
    auto row = Row();
    row.value = value;
    row.isJson = isJson;
    return row;
}

std::string Csv(const ReportRow& row) {
    std::string line;
    AppendCsv(line, row);
    return line;
}

std::string Json(const ReportRow& row) {
    std::string line;
    AppendJsonLine(line, row);
    return line;
}

std::string CsvOfValue(ReportRow::Text value) {
    const auto line = Csv(RowWithValue(value));
    const std::string before = "7,2023-11-14T22:13:20.123Z,B100|10001,B100,10001,";
    const std::string after = ",u1,5.1.0.2,1700000000123\n";
    EXPECT_EQ(line.substr(0, before.size()), before);
    return line.substr(before.size(), line.size() - before.size() - after.size());
}

TEST(CsvRow, HasTheFieldsOfTheHeaderInItsOrder) {
    EXPECT_EQ(reportctl::store::CSV_HEADER,
              "id,at,event,module,action,value,openid,suite_version,create_time\n");
    EXPECT_EQ(Csv(Row()),
              "7,2023-11-14T22:13:20.123Z,B100|10001,B100,10001,hello,u1,5.1.0.2,1700000000123\n");
}

TEST(CsvRow, QuotesAFieldThatHasACommaAQuoteOrALinesEnd) {
    EXPECT_EQ(CsvOfValue("a,b"), "\"a,b\"");
    EXPECT_EQ(CsvOfValue("say \"hi\""), "\"say \"\"hi\"\"\"");
    EXPECT_EQ(CsvOfValue("two\nlines"), "\"two\nlines\"");
    EXPECT_EQ(CsvOfValue("two\rlines"), "\"two\rlines\"");
    EXPECT_EQ(CsvOfValue(" =1+1; 'x' "), " =1+1; 'x' ");
}

TEST(CsvRow, TellsNullAndTheEmptyTextApart) {
    EXPECT_EQ(CsvOfValue(std::nullopt), "");
    EXPECT_EQ(CsvOfValue(""), "\"\"");
}

TEST(CsvRow, ReplacesWhatIsNoUtf8) {
    EXPECT_EQ(CsvOfValue("\xc3\xa4\xff"), "\xc3\xa4\xef\xbf\xbd");
}

TEST(JsonRow, HasTheNamesOfTheHeader) {
    EXPECT_EQ(Json(Row()), R"({"id":7,"at":"2023-11-14T22:13:20.123Z","event":"B100|10001","module":"B100",)"
                           R"("action":"10001","value":"hello","openid":"u1","suite_version":"5.1.0.2",)"
                           R"("create_time":"1700000000123"})"
                           "\n");
}

TEST(JsonRow, HasAnObjectOrAnArrayAsSuch) {
    EXPECT_NE(Json(RowWithValue(R"({"page":"start"})", true)).find(R"("value":{"page":"start"},)"),
              std::string::npos);
    EXPECT_NE(Json(RowWithValue(R"([1,"a"])", true)).find(R"("value":[1,"a"],)"), std::string::npos);
    EXPECT_NE(Json(RowWithValue(R"({"page":"start"})")).find(R"("value":"{\"page\":\"start\"}",)"),
              std::string::npos);
}

TEST(JsonRow, StaysOnOneLine) {
    const auto line = Json(RowWithValue("{\n\"a\":\r\n1}", true));
    EXPECT_EQ(line.find('\n'), line.size() - 1);
    EXPECT_NE(line.find("\"value\":{ \"a\":  1},"), std::string::npos);
    EXPECT_NE(Json(RowWithValue("two\nlines")).find(R"("value":"two\nlines")"), std::string::npos);
}

TEST(JsonRow, HasNullForWhatIsNotThere) {
    ReportRow row;
    row.id = -1;
    EXPECT_EQ(Json(row), R"({"id":-1,"at":null,"event":null,"module":null,"action":null,"value":null,)"
                         R"("openid":null,"suite_version":null,"create_time":null})"
                         "\n");
}

TEST(JsonRow, ReplacesWhatIsNoUtf8) {
    EXPECT_NE(Json(RowWithValue("\xff")).find("\"value\":\"\xef\xbf\xbd\""), std::string::npos);
    EXPECT_NE(Json(RowWithValue("{\"a\":\"\xff\"}", true)).find("{\"a\":\"\xef\xbf\xbd\"}"),
              std::string::npos);
}

} // namespace
