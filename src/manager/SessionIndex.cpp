#include "manager/SessionIndex.h"

#include <algorithm>

#include "framework/MultiByte.h"
#include "sources/SessionName.h"

namespace sm {

// HasName compares ignoring case; names that compare equal lower to the same key.
namespace {
std::string Key(std::string_view name) { return multibyte::ToLower(name); }
}  // namespace

// Name and category are read under the session's lock (table lock first, then the session's): another
// thread may be renaming it. The category compared is the one the session was created with (an IVI
// session shows its class too).
bool SessionIndex::Matches(const Slot& slot, std::string_view category, std::string_view name) {
    CriticalSectionGuard sessionGuard(slot.base->objectLock);
    if (!IsAnyCategory(category) && !SameCategory(category, slot.base->Category().View())) return false;
    return slot.base->HasName(name);
}

IInstrSession* SessionIndex::Find(std::string_view category, std::string_view name) const {
    // Short names are lowered on the stack: the lookup of a hit allocates nothing.
    char shortKey[128];
    std::string longKey;
    std::string_view key;
    if (name.size() <= sizeof shortKey) {
        std::copy(name.begin(), name.end(), shortKey);
        multibyte::LowerInPlace(shortKey, name.size());
        key = std::string_view(shortKey, name.size());
    } else {
        longKey = Key(name);
        key = longKey;
    }
    const Slot* best = nullptr;
    if (auto found = byName.find(key); found != byName.end()) {
        for (const Slot& slot : found->second) {
            if (!Matches(slot, category, name)) continue;
            best = &slot;
            break;
        }
    }
    for (const Slot& slot : unlisted) {
        if (best && slot.order > best->order) break;
        if (!Matches(slot, category, name)) continue;
        best = &slot;
        break;
    }
    return best ? best->session : nullptr;
}

void SessionIndex::Add(IInstrSession* session, SessionBase& base) {
    Entry& entry = entries[&base];
    entry.slot = Slot{nextOrder++, session, &base};
    File(entry);
}

void SessionIndex::File(Entry& entry) {
    StringVector names;
    {
        CriticalSectionGuard sessionGuard(entry.slot.base->objectLock);
        entry.listed = entry.slot.base->ListNames(names);
    }
    entry.keys.clear();
    if (!entry.listed) {
        InsertInOrder(unlisted, entry.slot);
        return;
    }
    for (const auto& name : names) {
        std::string key = Key(name.View());
        if (std::find(entry.keys.begin(), entry.keys.end(), key) != entry.keys.end()) continue;
        InsertInOrder(byName[key], entry.slot);
        entry.keys.push_back(std::move(key));
    }
}

void SessionIndex::Unfile(const Entry& entry) {
    if (!entry.listed) {
        EraseSession(unlisted, entry.slot.base);
        return;
    }
    for (const auto& key : entry.keys) {
        auto found = byName.find(key);
        if (found == byName.end()) continue;
        EraseSession(found->second, entry.slot.base);
        if (found->second.empty()) byName.erase(found);
    }
}

void SessionIndex::Remove(SessionBase& session) {
    {
        std::lock_guard<std::mutex> guard(renamedMutex);
        renamed.erase(std::remove(renamed.begin(), renamed.end(), &session), renamed.end());
    }
    auto found = entries.find(&session);
    if (found == entries.end()) return;
    Unfile(found->second);
    entries.erase(found);
}

void SessionIndex::NoteRenamed(SessionBase& session) {
    std::lock_guard<std::mutex> guard(renamedMutex);
    if (std::find(renamed.begin(), renamed.end(), &session) == renamed.end()) renamed.push_back(&session);
    anyRenamed.store(true, std::memory_order_release);
}

// Sessions not indexed yet are filed with their current names when CatchUp reaches them.
void SessionIndex::RefileRenamed() {
    if (!anyRenamed.load(std::memory_order_acquire)) return;
    std::vector<SessionBase*> pending;
    {
        std::lock_guard<std::mutex> guard(renamedMutex);
        anyRenamed.store(false, std::memory_order_relaxed);
        if (renamed.empty()) return;
        pending.swap(renamed);
    }
    for (SessionBase* session : pending) {
        auto found = entries.find(session);
        if (found == entries.end()) continue;
        Unfile(found->second);
        File(found->second);
    }
}

void SessionIndex::InsertInOrder(std::vector<Slot>& slots, const Slot& slot) {
    auto position = std::upper_bound(slots.begin(), slots.end(), slot.order,
                                     [](std::uint64_t order, const Slot& other) { return order < other.order; });
    slots.insert(position, slot);
}

void SessionIndex::EraseSession(std::vector<Slot>& slots, const SessionBase* base) {
    slots.erase(std::remove_if(slots.begin(), slots.end(), [&](const Slot& slot) { return slot.base == base; }),
                slots.end());
}

}  // namespace sm
