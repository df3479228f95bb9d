#pragma once

#include <chrono>
#include <cstdint>
#include <fstream>

#include "tests/e2e/support/Service.h"
#include "tests/support/TemporaryDirectory.h"

/// The wall clock of a service that is started after this object was made. It runs like the machine's clock,
/// but is ahead of it by a time that the test sets.
class SteppedClock {
public:
    explicit SteppedClock(Service& service) {
        StepTo(std::chrono::seconds(0));
        service.SetEnvironment("LD_PRELOAD=" SSR_STEPPED_CLOCK);
        service.SetEnvironment("SSR_STEPPED_CLOCK_FILE=" + File());
    }

    /// Sets how far the clock is ahead, from now on.
    void StepTo(std::chrono::seconds ahead) const {
        const std::int64_t seconds = ahead.count();
        // The file must never become shorter, because the service maps it.
        std::fstream file(File(), std::ios::in | std::ios::out | std::ios::binary);
        if (!file)
            file.open(File(), std::ios::out | std::ios::binary);
        file.write(reinterpret_cast<const char*>(&seconds), sizeof seconds);
    }

private:
    std::string File() const { return m_directory.Path() + "/ahead"; }

    TemporaryDirectory m_directory;
};
