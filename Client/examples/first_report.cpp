// The shortest program that reports: one event for the local store, one for analytics.
#include <cstdio>

#include <hublink/report.hpp>

int main() {
    hublink::Reporter reporter(hublink::Module{"A100", "2.1", "Painter"});
    const hublink::Result stored = reporter.Event("B100|10001", "it's stored as it is, 100 %");
    const hublink::Result sent = reporter.Event("A100|10001", hublink::Json{R"({"clicks":3})"});
    std::printf("%s, %s\n", hublink::ToString(stored), hublink::ToString(sent));
    return stored == hublink::Result::Sent && sent == hublink::Result::Sent ? 0 : 1;
}
