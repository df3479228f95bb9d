#pragma once

#include <sys/types.h>

#include <hublink/report.hpp>

#include "tests/Client/RandomEvents.h"

/// The program events_in_c, which sends events through the C interface as it is told to. The destructor ends
/// it.
class EventsInCProcess {
public:
    EventsInCProcess();
    ~EventsInCProcess();
    EventsInCProcess(const EventsInCProcess&) = delete;
    EventsInCProcess& operator=(const EventsInCProcess&) = delete;

    /// The event's texts must have no zero byte: in C, a text would end there.
    hublink::Result Send(const RandomEvent& event) const;

private:
    int m_to = -1;
    int m_from = -1;
    pid_t m_process = -1;
};
