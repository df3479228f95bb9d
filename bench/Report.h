#pragma once

#include <string>

/// A report as the suite sends them, of the size that the figures in docs/ are about.
inline std::string ReportOf180Bytes() {
    return R"({"eventID":"B100|10001","value":{"button":"save","page":"editor","count":3,"ratio":1.5,)"
           R"("text":"a text as people write it"},"createTime":1700000000123,"isDayReport":0,"pad":"01234"})";
}
