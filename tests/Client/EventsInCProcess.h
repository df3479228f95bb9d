#pragma once

#include <sys/types.h>

#include <hublink/report.hpp>

#include "tests/Client/RandomEvents.h"

/// The program events_in_c, which sends what it is told through the C interface. Ended by the destructor.
class EventsInCProcess {
public:
    EventsInCProcess();
    ~EventsInCProcess();
    EventsInCProcess(const EventsInCProcess&) = delete;
    EventsInCProcess& operator=(const EventsInCProcess&) = delete;

    /// The event's texts have no zero byte: in C, they would end there.
    hublink::Result Send(const RandomEvent& event) const;

private:
    int m_to = -1;
    int m_from = -1;
    pid_t m_process = -1;
};
