#ifndef ZRM_HOST_EVENT_BATCH_H
#define ZRM_HOST_EVENT_BATCH_H

#include "host/events/Event.h"
#include "host/events/EventJson.h"
#include "host/silences/Silences.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

class Silencer;

/// Consecutive events with their texts in one block of memory. Filled by one thread; once sealed it
/// no longer changes and any thread may read it.
class EventBatch {
public:
    EventBatch() = default;
    EventBatch(const EventBatch&) = delete;
    EventBatch& operator=(const EventBatch&) = delete;

    /// Reserves memory for texts of this total size.
    void reserve(std::size_t bytes) { m_text.reserve(bytes); }

    /// Adds one event from the queue, rendered as JSON. A null silencer holds nothing back. Not
    /// after seal.
    void add(const Event& event, const EventJson& format, Silencer* silencer = nullptr);

    /// Adds a copy of one event. Not after seal.
    void add(const EventRecord& event);

    /// Builds the records. Called once.
    void seal();

    /// The events; only after seal. Valid as long as the batch.
    std::span<const EventRecord> records() const noexcept { return m_records; }

    /// How many of the events each silence holds back; only after seal.
    std::vector<SilencedEvents> silenced() const;

    std::size_t size() const noexcept { return m_records.size(); }
    bool empty() const noexcept { return m_records.empty(); }
    /// The first and the last id of a batch that is not empty.
    std::uint64_t first() const noexcept { return m_records.front().id; }
    std::uint64_t last() const noexcept { return m_records.back().id; }
    /// Total length of the texts in bytes.
    std::size_t textBytes() const noexcept { return m_text.size(); }
    /// Memory used, in bytes.
    std::size_t bytes() const noexcept {
        return m_text.capacity() + m_records.capacity() * sizeof(EventRecord);
    }

private:
    struct Piece {
        std::size_t begin = 0;
        std::size_t size = 0;
    };
    /// The offsets of one event's texts; the memory may move as it grows.
    struct Places {
        Piece situation;
        Piece severity;
        Piece text;
        Piece log;
        Piece json;
    };

    std::string_view at(const Piece& piece) const noexcept {
        return std::string_view(m_text).substr(piece.begin, piece.size);
    }
    Piece pieceFrom(std::size_t begin) const noexcept { return {begin, m_text.size() - begin}; }
    /// Consecutive events usually share these texts.
    Piece sameOr(std::string_view text, Piece Places::*which);

    std::string m_text;
    std::vector<Places> m_places;
    std::vector<EventRecord> m_records;
};

} // namespace zrm::host

#endif
