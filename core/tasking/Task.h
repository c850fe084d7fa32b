#pragma once

#include <boost/shared_ptr.hpp>

namespace Tasking {

class TaskManagerImpl;

// A piece of background work, always handled through a shared pointer.
// run() is called on a manager's worker thread, onFinished() afterwards on the
// thread that owns the manager; the task's state belongs to the manager that
// holds it and is touched only under that manager's lock.
class Task {
public:
    // Where a manager keeps the task; opaque to everyone else.
    class State {
    public:
        virtual ~State() {}
    };

    virtual void run() = 0;
    // Not called for a task that was cancelled.
    virtual void onFinished() {}

    virtual ~Task() {}

private:
    friend class TaskManagerImpl;

    boost::shared_ptr<State> state;
};

}  // namespace Tasking
