#pragma once

#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "Tools/reportctl/forward/Row.h"

namespace reportctl::forward {

/// A row that was sent, by which the store is known again.
struct Anchor {
    std::int64_t row = 0;
    std::string uid;
};

/// How far the store was sent.
struct Place {
    static constexpr std::int64_t BEGINNING = std::numeric_limits<std::int64_t>::min();

    std::string installation;
    std::int64_t position = BEGINNING; ///< Rows up to this one were sent, or are kept in mind.
    std::vector<Anchor> anchors;       ///< The newest first.
};

/// A part of the store, of one moment.
struct Page {
    /// The place's position, or one before it: the beginning of another store, or the last row that is still
    /// as it was sent.
    std::int64_t from = Place::BEGINNING;
    std::vector<Row> rows;
    std::optional<std::int64_t> tooLarge; ///< A row behind these that is not read for its size.
};

/// What there is to send, without its contents.
struct Extent {
    std::int64_t rows = 0;
    std::int64_t first = 0;
    std::int64_t last = 0;
};

/// Reads the store a page at a time. Each call opens the store, reads in one transaction of some
/// milliseconds, and closes it again: a store that was replaced is noticed, a writer is held up by nothing,
/// and no more than a page is in memory. Nothing in the store is changed.
///
/// Threads: one. Failure: std::runtime_error when the store is missing, SQLite::Exception for the rest.
class StoreReader {
public:
    /// A row with a text beyond `maxRowBytes` is not read.
    StoreReader(std::string path, std::size_t maxRowBytes)
        : m_path(std::move(path)), m_maxRowBytes(maxRowBytes) {}

    /// The next rows, those of `without` left out: so many, or fewer with `maxBytes` together, but at least
    /// one.
    Page Read(const Place& place, const MetrikSdk::EventKeys& without, std::size_t maxRows,
              std::size_t maxBytes) const;

    /// The row, if it is still the one with this uid.
    std::optional<Row> ReadOne(const Place& place, const Anchor& row) const;

    Extent Ahead(const Place& place) const;

private:
    std::string m_path;
    std::size_t m_maxRowBytes;
};

} // namespace reportctl::forward
