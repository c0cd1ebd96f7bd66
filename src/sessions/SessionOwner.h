// What a session needs of the manager that made it, without knowing the manager's class: the
// table lock its final release takes, removal from the table, and the counted reference it holds.
#pragma once

#include <unknwn.h>

namespace sm {

class SessionBase;

class SessionOwner {
public:
    virtual void LockTable() = 0;
    virtual void UnlockTable() = 0;
    virtual void RemoveSession(SessionBase& session) = 0;
    // The owner's identity, for the counted reference each session keeps on it.
    virtual IUnknown* OwnerIdentity() = 0;
    // The session's name or category changed: what the owner derived from them is out of date.
    // Called with the session's own lock held, never the table lock; must not block.
    virtual void SessionNamesChanged(SessionBase&) {}

protected:
    ~SessionOwner() = default;
};

}  // namespace sm
