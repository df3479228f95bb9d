#pragma once

/// While this object exists, some allocations of the calling thread fail: those by operator new, and those by
/// the C library unless a sanitizer has a heap of its own. A program that uses it links FailingMemory.cpp. A
/// thread may have one such object at a time.
class FailingMemory {
public:
    static constexpr int ALL = 1'000'000'000;

    /// `count` allocations fail, beginning with the one with number `first`, counted from 1.
    explicit FailingMemory(int first, int count = 1);
    ~FailingMemory();
    FailingMemory(const FailingMemory&) = delete;
    FailingMemory& operator=(const FailingMemory&) = delete;

    /// Whether allocations of the C library fail, too, such as SQLite's.
    static const bool FAILS_IN_C;

    /// How many allocations have failed.
    static int Failed();
};
