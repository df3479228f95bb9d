// What the sanitizers are told in every program of ours, so that no environment variable has to be
// remembered. Their runtimes are shared libraries and look the functions up, so they must be visible.
#define OPTIONS extern "C" __attribute__((visibility("default")))

OPTIONS const char* __asan_default_options() {
    // A refused allocation is a null pointer, and so std::bad_alloc, as without the sanitizer. The
    // thread-local variables of a library that was opened at run time are left alone: the leak checker
    // guesses the size of their memory from what stands before it, and crashed where that was something else
    // ("Tracer caught signal 11").
    return "detect_stack_use_after_return=1:allocator_may_return_null=1:intercept_tls_get_addr=0";
}

OPTIONS const char* __ubsan_default_options() {
    return "print_stacktrace=1";
}

OPTIONS const char* __tsan_default_options() {
    // The one signal handler, the crash handler, does what no handler may, on purpose: the process is lost
    // anyway, and the trace is worth trying.
    return "report_signal_unsafe=0:second_deadlock_stack=1:allocator_may_return_null=1";
}

OPTIONS const char* __tsan_default_suppressions() {
    // The receiver's stop flag is a plain bool on purpose: one thread sets it once, the loop reads it once a
    // pass, and the join that follows orders the rest. The only write is in this function, so nothing else is
    // hidden.
    // The store looks for SQLite's descriptor of the database by asking of each number which file it is.
    // Other threads open and close theirs meanwhile, which changes the answer and nothing else: the function
    // only asks. A thread of POCO tells that it has ended, and then lets go of what it told that with. Its
    // object may be destroyed right then. POCO is not compiled with the sanitizer, so what orders the two is
    // not seen.
    return "race:UDPServer::StopSelf\n"
           "race:OrvekSqlite::file::OtherUsers::IsOurFile\n"
           "race:Poco::EventImpl::~EventImpl\n"
           "race:Poco::ThreadImpl::ThreadData::~ThreadData\n";
}
