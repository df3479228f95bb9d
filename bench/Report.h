#pragma once

#include <string>

/// A report as the suite sends it. The figures in docs/ are measured with this size.
inline std::string ReportOf180Bytes() {
    return R"({"eventID":"B100|10001","value":{"button":"save","page":"editor","count":3,"ratio":1.5,)"
           R"("text":"a text as people write it"},"createTime":1700000000123,"isDayReport":0,"pad":"01234"})";
}
