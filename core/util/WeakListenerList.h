#pragma once

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <list>
#include <vector>

namespace Util {

// Listeners registered by weak reference, in order of registration. Entries
// whose owner is gone are pruned at the next notification. Single thread: the
// one that owns the list.
template <class Listener>
class WeakListenerList {
public:
    void add(const boost::weak_ptr<Listener>& listener) { entries.push_back(listener); }

    // Unlinks the first entry that refers to listener; false when none does.
    bool remove(const Listener* listener) {
        for (typename Entries::iterator it = entries.begin(); it != entries.end(); ++it) {
            boost::shared_ptr<Listener> locked = it->lock();
            if (locked.get() == listener) {
                entries.erase(it);
                return true;
            }
        }
        return false;
    }

    // Calls notify(listener) for every live listener. Works on a snapshot, so
    // listeners added or removed meanwhile do not change this pass, and one
    // destroyed by an earlier listener is skipped.
    template <class Notify>
    void notifyAll(Notify notify) {
        prune();
        std::vector<boost::weak_ptr<Listener> > snapshot(entries.begin(), entries.end());
        for (size_t i = 0; i < snapshot.size(); ++i) {
            boost::shared_ptr<Listener> locked = snapshot[i].lock();
            if (locked) {
                notify(*locked);
            }
        }
    }

    // Entries, including those that expired since the last notification.
    size_t size() const { return entries.size(); }

private:
    typedef std::list<boost::weak_ptr<Listener> > Entries;

    void prune() {
        for (typename Entries::iterator it = entries.begin(); it != entries.end();) {
            if (it->expired()) {
                it = entries.erase(it);
            } else {
                ++it;
            }
        }
    }

    Entries entries;
};

}  // namespace Util
