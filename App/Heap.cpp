// The settings of the program's heap, jemalloc. jemalloc looks for a variable of this name when the process
// starts. It finds the variable only when the program exports it.
//
// Why jemalloc: each report is allocated on the receiving thread and freed on the storing thread. To free it,
// the C library takes a lock that the receiving thread needs for its next report, so at a high rate the two
// threads wait for each other. The C library also keeps the memory of a backlog until the process ends.
// jemalloc does neither.

// Memory that has been free for a second goes back to the system: a backlog may have needed gigabytes, and
// backlogs are rare. A background thread of jemalloc does this; it sleeps while there is nothing to give
// back. Without this thread, memory goes back only while the program uses the heap much, and a service that
// gets no reports would keep the memory of a backlog.
//
// All threads share one arena, so the memory of a stored report can serve any thread at once, also when
// memory is short. With an arena for each thread, that memory went back to the receiving thread's arena,
// where only that thread could use it. A second reason: with one arena, the first allocation of a new thread
// does not make an arena. When there is no memory for a new arena, jemalloc 5.3 ends the process.
//
// retain:false gives the addresses back together with the memory. Otherwise a process with a limit on its
// address space (ulimit -v) keeps the addresses of a backlog for ever, and SQLite finds no room to map its
// files until a restart.
//
// One arena and retain:false cost 25 ns a report: a queue of a million items takes 134 ms to fill and empty,
// instead of 109 ms with an arena for each thread and with addresses kept (poco_tasker_bench).
extern "C" {
extern __attribute__((visibility("default"))) const char* malloc_conf;
const char* malloc_conf =
    "dirty_decay_ms:1000,background_thread:true,max_background_threads:1,narenas:1,retain:false";
}
