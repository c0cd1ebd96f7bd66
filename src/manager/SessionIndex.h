// Finds a live session by category and name without asking every session of the table: each
// session is filed under every name it answers to. The answer is the one a scan of the table in
// order would give: the first session, in table order, whose category fits and whose HasName
// accepts the name. Sessions that cannot list their names are scanned as before.
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <mutex>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "com/Interfaces.h"
#include "sessions/SessionBase.h"

namespace sm {

class SessionIndex {
public:
    // The table's entries, in table order. Entries are only ever appended at the end or removed,
    // so the indexed sessions are always the front of the table.
    template <class Table>
    void CatchUp(const Table& table) {
        RefileRenamed();
        for (std::size_t position = entries.size(); position < table.size(); ++position)
            Add(table[position].session, *table[position].base);
    }

    // The session a table scan would find, or nullptr. Call CatchUp first, under the table lock.
    IInstrSession* Find(std::string_view category, std::string_view name) const;

    // The session left the table.
    void Remove(SessionBase& session);

    // The session's names changed; it is filed again at the next CatchUp. Takes no table lock.
    void NoteRenamed(SessionBase& session);

    std::size_t Size() const { return entries.size(); }

private:
    struct Slot {
        std::uint64_t order;  // table order: later sessions have larger numbers
        IInstrSession* session;
        SessionBase* base;
    };
    struct Entry {
        Slot slot;
        bool listed;
        std::vector<std::string> keys;
    };

    void Add(IInstrSession* session, SessionBase& base);
    void File(Entry& entry);
    void Unfile(const Entry& entry);
    void RefileRenamed();
    static bool Matches(const Slot& slot, std::string_view category, std::string_view name);
    static void InsertInOrder(std::vector<Slot>& slots, const Slot& slot);
    static void EraseSession(std::vector<Slot>& slots, const SessionBase* base);

    // Looked up by views, so that a lookup lowers its name into a buffer of its own.
    struct KeyHash {
        using is_transparent = void;
        std::size_t operator()(std::string_view key) const { return std::hash<std::string_view>{}(key); }
    };

    std::unordered_map<std::string, std::vector<Slot>, KeyHash, std::equal_to<>> byName;  // lower-case name -> sessions, in order
    std::vector<Slot> unlisted;                                  // sessions scanned on every lookup
    std::unordered_map<const SessionBase*, Entry> entries;
    std::uint64_t nextOrder = 0;

    // Renames arrive under the session's own lock, not the table lock: a leaf lock guards the list.
    std::mutex renamedMutex;
    std::vector<SessionBase*> renamed;
    std::atomic<bool> anyRenamed{false};  // lets a lookup skip the leaf lock when nothing was renamed
};

}  // namespace sm
