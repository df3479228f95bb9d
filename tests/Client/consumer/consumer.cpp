#include <cstdio>

#include <hublink/report.hpp>

int main() {
    hublink::Reporter reporter(hublink::Module{"A100"});
    std::puts(hublink::ToString(reporter.Event("A100|1")));
}
