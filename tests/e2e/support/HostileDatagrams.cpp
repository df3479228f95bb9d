#include "tests/e2e/support/HostileDatagrams.h"

#include "Common/Wire.h"

namespace Hostile {
namespace {

constexpr std::size_t LONGEST_BYTES = 65507; // the largest datagram of the protocol

std::string Repeated(const std::string& text, std::size_t count) {
    std::string repeated;
    for (; count > 0; --count)
        repeated += text;
    return repeated;
}

void Append(Datagrams& all, const Datagrams& more) {
    all.insert(all.end(), more.begin(), more.end());
}

std::string Report(const std::string& eventID, const std::string& rest = "") {
    return R"({"eventID":")" + eventID + "\"" + rest + "}";
}

std::string Control(const std::string& type, const std::string& members) {
    return R"({"msgType":")" + type + R"(","exdata":{)" + members + "}}";
}

std::string Member(const std::string& key, const std::string& text) {
    return "\"" + key + R"(":")" + text + "\"";
}

/// Announces a new module with that text in one of its fields, and sends an event of the module.
Datagrams ModuleWith(const std::string& key, const std::string& text) {
    static int s_modules = 0;
    const std::string module = "AM" + std::to_string(++s_modules);
    return {Control("init", Member("moduleID", module) + "," + Member(key, text)), Report(module + "|1")};
}

/// Numbers of columns: the largest with nine digits, a larger one, and one that no integer holds.
const std::vector<std::string> COUNTS = {"999999999", "2000000000", "99999999999999999999"};

/// Texts that may stand between the percent sign and the letter.
std::vector<std::string> DirectivePrefixes() {
    std::vector<std::string> prefixes = {"",   "1$", "9$", "0$",  "999999999$", "-",  "+",   " ",     "#",
                                         "0",  "_",  "=",  "-+#", "*",          ".*", "*.*", "1$*2$", "hh",
                                         "ll", "L",  "|",  "|1$", "|*",         "|-", "|="};
    for (const auto& count : COUNTS)
        for (const char* before : {"", ".", "1$", "1$.", "|", "|.", "|1$", "0", "_", "="})
            prefixes.push_back(before + count);
    return prefixes;
}

std::vector<std::string> DirectiveTexts() {
    constexpr std::string_view LETTERS = "diouxXeEfFgGaAcCsSpnmtTvbyz%";
    std::vector<std::string> texts;
    for (const auto& prefix : DirectivePrefixes())
        for (const char letter : LETTERS)
            texts.push_back("%" + prefix + letter + (prefix.starts_with('|') ? "|" : ""));
    for (const auto& count : COUNTS) {
        texts.push_back("%|" + count + "t|");
        texts.push_back("%|" + count + "T*|");
        texts.push_back("x%|" + count + "T%|y%|" + count + "T%|");
        texts.push_back("%" + count + "%");
    }
    for (const char* text : {"%", "%%", "%|", "%||", "%|1", "%1", "%1%", "%2%%9%", "%1%%3%", "%n", "%*d",
                             "%1T%%|9t|", "%|1T%|%|9t|"})
        texts.emplace_back(text);
    for (const char* text : {"%", "%%", "%1%", "%|9t|", "%1T%%|9t|", "%|999999999t|", "%s"})
        texts.push_back(Repeated(text, 9000 / std::string_view(text).size()));
    return texts;
}

Datagrams InEveryNumber(const std::vector<std::string>& numbers) {
    Datagrams all;
    for (const auto& number : numbers)
        for (const std::string key : {"value", "createTime", "isDayReport", "other"})
            for (const std::string id : {"B1", "A759|1"})
                all.push_back(Report(id, ",\"" + key + "\":" + number));
    return all;
}

/// A record in the log's form, of a place that the program does not have.
const std::string FORGED = "2026-11-20 10:15:30.123 ERROR [1:1] [App/Forged:1 Forged] forged";

} // namespace

Datagrams InEveryField(const std::string& text) {
    const std::string member = R"({")" + text + R"(":")" + text + "\"}";
    Datagrams all = {Report("B" + text),
                     Report("B1", R"(,"value":")" + text + "\""),
                     Report("B1", R"(,"value":)" + member),
                     Report("B1", R"(,"createTime":")" + text + "\""),
                     Report("B1", R"(,"isDayReport":")" + text + "\""),
                     Report("B1", ",\"" + text + "\":1"),
                     Report("A759|" + text),
                     Report("A759|1", R"(,"value":")" + text + "\""),
                     Report("A759|1", R"(,"value":)" + member),
                     Report("A759|1", R"(,"createTime":")" + text + "\""),
                     Report("A" + text),
                     R"({"msgType":")" + text + R"(","exdata":{}})"};
    all.push_back(Control("init", Member("moduleID", text)));
    for (const char* key : {"moduleVersion", "moduleName", "logPath", "dbPath", "openID", "hublinkVersion"}) {
        Append(all, ModuleWith(key, text));
        all.push_back(SOUND_SIGN_IN);
    }
    for (const std::string& user :
         {Member("openID", text), Member("openID", "u2") + "," + Member("hublinkVersion", text)})
        Append(all, {Control("updateOpenID", user), SOUND_SIGN_IN});
    return all;
}

Datagrams InEveryField(const std::vector<std::string>& texts) {
    Datagrams all;
    for (const auto& text : texts)
        Append(all, InEveryField(text));
    return all;
}

Datagrams Brackets() {
    Datagrams all;
    for (const std::string opening : {"[", "{", R"({"a":)", R"([{"":)", "\"", "\\"}) {
        const std::string many = Repeated(opening, Wire::MAX_BYTES);
        for (const std::string head :
             {"", R"({"eventID":)", R"({"eventID":"B1","value":)", R"({"eventID":"A759|1","value":)"})
            all.push_back((head + many).substr(0, Wire::MAX_BYTES));
        // The value is parsed a second time.
        all.push_back(Report("A759|1", R"(,"value":")" + Repeated("[", 5000) + "\""));
    }
    return all;
}

Datagrams DeepNesting() {
    Datagrams all;
    for (const std::size_t depth : {129U, 1000U, 1500U})
        for (const std::string id : {"B1", "A759|1"}) {
            const std::string arrays = Repeated("[", depth) + Repeated("]", depth);
            const std::string objects = Repeated(R"({"a":)", depth) + "1" + Repeated("}", depth);
            all.push_back(Report(id, R"(,"value":)" + arrays));
            all.push_back(Report(id, R"(,"value":)" + objects));
            all.push_back(R"({"msgType":"init","exdata":)" + objects + "}");
            all.push_back(arrays);
        }
    return all;
}

Datagrams NestingAtTheLimit() {
    const std::string objects = Repeated(R"({"a":)", 127) + "1" + Repeated("}", 127);
    return {Report("B1", R"(,"value":)" + objects), Report("A759|1", R"(,"value":)" + objects)};
}

Datagrams InvalidUtf8() {
    return InEveryField({"\xc0\xaf", "\xe0\x80\xaf", "\xf0\x80\x80\xaf", // longer forms than needed
                         "\x80", "\xbf", "a\xc3", "a\xe2\x82",           // parts of characters
                         "\xed\xa0\x80", "\xed\xbf\xbf",                 // halves of surrogate pairs
                         "\\ud800", "\\udc00x",                          // halves of surrogate pairs, escaped
                         "\xf4\x90\x80\x80", "\xf8\x88\x80\x80\x80", "\xfe", "\xff", "\xff\xfe"});
}

Datagrams ZeroCharacters() {
    return InEveryField({"\\u0000", "a\\u0000b", "\\u0000\\u0000"});
}

Datagrams HugeNumbers() {
    const std::string digits = Repeated("9", 5000);
    return InEveryNumber({digits, "-" + digits, "1" + Repeated("0", 5000) + ".5", digits + "e999999999",
                          "1e999999999", "1E+99999999999999999999", "9223372036854775808e400"});
}

Datagrams NumbersThatVanish() {
    return InEveryNumber({"1e-999999999", "-1E-99999999999999999999", "0." + Repeated("0", 5000) + "1",
                          "1." + Repeated("3", 5000)});
}

Datagrams DuplicateAndEmptyKeys() {
    return {R"({"eventID":"B1","eventID":"A759|1","value":1,"value":{},"value":[]})",
            R"({"":1,"":{"":[]},"eventID":"B1","":""})",
            "{" + Repeated(R"("eventID":"B1",)", 600) + R"("":1})",
            "{" + Repeated(R"("":"",)", 1500) + R"("eventID":"B1"})",
            R"({"eventID":"B1","value":{)" + Repeated(R"("":{},)", 1200) + R"("":1}})",
            R"({"msgType":"init","msgType":"updateOpenID","exdata":{},"exdata":[],"":"init"})"};
}

Datagrams LongestDatagrams() {
    Datagrams all;
    const std::string head = R"({"eventID":"B1","value":")";
    for (const std::string filling : {"x", "[", "%", "'", "\n", "\xff"})
        for (const std::string& before : {std::string(), head})
            all.push_back(before + Repeated(filling, LONGEST_BYTES - before.size()));
    all.push_back(std::string(LONGEST_BYTES, '\0'));
    return all;
}

Datagrams Directives() {
    Datagrams all = DirectiveTexts();
    for (const char letter : std::string_view("dsTt%")) // a quote is a flag here, and a quote in SQL, too
        all.push_back(std::string("%'") + letter);
    return all;
}

Datagrams DirectivesInReports() {
    Datagrams all;
    for (const auto& text : DirectiveTexts())
        all.push_back(Report("B" + text.substr(0, 100), R"(,"value":")" + text + "\""));
    return all;
}

Datagrams ForgedRecords() {
    Datagrams all;
    for (const std::string end : {"\n", "\r", "\r\n", "\n\n", "\x0b", "\x0c", "\x1e", "\xc2\x85",
                                  "\xe2\x80\xa8", "\xe2\x80\xa9", "\x85", "\\n"})
        for (const std::string head : {"", "x", R"({"eventID":"B1)", "%1T%"})
            all.push_back(head + end + FORGED + end);
    return all;
}

Datagrams EscapedForgedRecords() {
    return InEveryField({"\\n" + FORGED + "\\n", "\\r\\n" + FORGED, "\\u2028" + FORGED, "\\u0085" + FORGED});
}

Datagrams TerminalEscapes() {
    return InEveryField({"\\u001b[2J\\u001b[1;1H", "\\u001b]0;title\\u0007", "\\u009b31m",
                         "\\u001bP$q\\u001b\\\\", "\\b\\b\\b\\b", "\\u007f", "\\u202eright to left",
                         "\\u2066\\u2069"});
}

Datagrams Sql() {
    return InEveryField(
        {"');drop table OperLog;--",
         "');delete from OperLog;--",
         "'||(select group_concat(sql) from sqlite_master)||'",
         "'||(select value from BaseInfo)||'",
         "');attach 'attached.db' as other;--",
         "');pragma writable_schema=1;--",
         "');pragma journal_mode=delete;--",
         "'||load_extension('evil.so')||'",
         "'||(with recursive n(x) as (select 1 union all select x+1 from n) select max(x) from n)||'",
         "'||randomblob(1000000000)||'",
         "'||zeroblob(1000000000)||'",
         "'||printf('%1000000000d',1)||'",
         "'||printf('%.*c',1000000000,'x')||'",
         "'||hex(randomblob(500000000))||'",
         "'||writefile('written','x')||'",
         "');vacuum into 'copy.db';--",
         "');create trigger t after insert on OperLog begin select 1;end;--",
         "');create table Mine(a);--",
         "');begin exclusive;--",
         "','','',1,'',''),('B2','','',1,'','')--",
         "') returning (select 1)--",
         "'/*",
         "';",
         "'",
         "''' '"});
}

Datagrams SqlThatFits() {
    return {
        Report("B1','v','1',0,'x','y')--"), // the text itself gives the row's values
        Report("B1','v','1',0,'x','y');--"),
        Report("B1", R"(,"value":"'/*","createTime":"*/||'','1")"), // a comment from one field into the next
        Report("B1", R"(,"value":"''; drop table OperLog; --")"),
        Report("B1", R"(,"value":"' || 'x")"),
        Report("B1", R"(,"value":"--")"),
        Report("B1", R"(,"value":"/*")")};
}

} // namespace Hostile
