// The settings of the program's heap, which is jemalloc's: it reads them by this name when the process
// starts. The library finds the name only when the program exports it.
//
// Each report is allocated on the receiving thread and freed on the storing one. The C library gives such
// memory back under a lock that the receiving thread needs for its next report, and at a high rate each waits
// there for the other. It also keeps what a backlog needed until the process ends. jemalloc does neither.

// Memory that has been free for a second goes back to the system: a backlog may have needed gigabytes, and it
// is rare. A thread of the heap's own sees to that, which sleeps while there is nothing to give back. Without
// it, memory goes back only when the program uses the heap much, and a service that gets no reports would
// keep a backlog's memory.
//
// All threads share one arena. A report's memory then serves the next report as soon as it is stored, which
// is when there is least to spare; with an arena for each thread, it came back to the receiving thread's. And
// a thread's first allocation makes no new arena: without memory for one, jemalloc 5.3 ends the process.
//
// What goes back, goes back with its addresses. Else a process with a limit of those (ulimit -v) keeps what a
// backlog needed for ever, and SQLite's own mappings find no room until a restart.
//
// What the two cost: a queue of a million items takes 134 ms to fill and empty, where it took 109 with an
// arena for each thread and addresses kept (poco_tasker_bench); that is 25 ns a report.
extern "C" {
extern __attribute__((visibility("default"))) const char* malloc_conf;
const char* malloc_conf =
    "dirty_decay_ms:1000,background_thread:true,max_background_threads:1,narenas:1,retain:false";
}
