#pragma once

/// Has allocations of the calling thread fail while this object lives: by operator new, and by the C library
/// where no sanitizer has a heap of its own. A program that uses it links FailingMemory.cpp. One at a time on
/// a thread.
class FailingMemory {
public:
    static constexpr int ALL = 1'000'000'000;

    /// The allocation with number `first` fails, counted from 1, and so many in all from there on.
    explicit FailingMemory(int first, int count = 1);
    ~FailingMemory();
    FailingMemory(const FailingMemory&) = delete;
    FailingMemory& operator=(const FailingMemory&) = delete;

    /// Whether allocations of the C library fail, too: SQLite's, for one.
    static const bool FAILS_IN_C;

    /// How many have failed.
    static int Failed();
};
