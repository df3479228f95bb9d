// The sanitizers' options in all our programs, so that they need not be set in an environment variable. The
// sanitizers' runtimes are shared libraries and look these functions up, so the functions must be visible.
#define OPTIONS extern "C" __attribute__((visibility("default")))

OPTIONS const char* __asan_default_options() {
    // A refused allocation gives a null pointer, and so std::bad_alloc, as without the sanitizer. The
    // sanitizer does not track the thread-local variables of a library that was opened at run time: the leak
    // checker guesses their size from the bytes before them, and crashed where these bytes were something
    // else ("Tracer caught signal 11").
    return "detect_stack_use_after_return=1:allocator_may_return_null=1:intercept_tls_get_addr=0";
}

OPTIONS const char* __ubsan_default_options() {
    return "print_stacktrace=1";
}

OPTIONS const char* __tsan_default_options() {
    // Our only signal handler, the crash handler, calls unsafe functions on purpose: the process is lost
    // anyway, and a trace may still succeed.
    return "report_signal_unsafe=0:second_deadlock_stack=1:allocator_may_return_null=1";
}

OPTIONS const char* __tsan_default_suppressions() {
    // The receiver's stop flag is a plain bool on purpose: one thread sets it once, the loop reads it once in
    // each pass, and the join that follows orders everything else. Its only write is in this function, so the
    // suppression hides nothing else.
    //
    // The store finds SQLite's descriptor of the database: it asks for each descriptor number which file that
    // is. Other threads open and close their descriptors meanwhile. That can change an answer and does no
    // other harm, because the function only asks.
    //
    // A thread of POCO signals its end and then releases the object by which it signalled, while another
    // thread may already destroy that object. POCO is not compiled with the sanitizer, so the sanitizer does
    // not see what orders the two.
    return "race:UDPServer::StopSelf\n"
           "race:OrvekSqlite::file::OtherUsers::IsOurFile\n"
           "race:Poco::EventImpl::~EventImpl\n"
           "race:Poco::ThreadImpl::ThreadData::~ThreadData\n";
}
