#pragma once

#include <boost/shared_ptr.hpp>
#include <memory>
#include <string>
#include <vector>

#include "ByteScript.h"
#include "ChaosTask.h"
#include "InvariantReport.h"
#include "network/NetworkTaskHolder.h"

// The scenario's own network tasks, in a fixed number of slots: submitted
// with every priority and retry policy, directly or through a
// NetworkTaskHolder, cancelled, released (cancelled and dropped, or the holder
// destroyed), made ready, and re-entered from their own callbacks. Main thread
// only.
class TaskPool {
public:
    static const int kSlots = 12;

    explicit TaskPool(InvariantReport& report);
    ~TaskPool();

    // The host every task asks from its next attempt on, "http://.../" with a final slash.
    void setHost(const std::string& value);

    // Each reads its slot and settings from the script.
    void submit(ByteScript& script);
    void cancel(ByteScript& script);
    void release(ByteScript& script);
    void makeReady(ByteScript& script);

    void readyAll();
    // Tasks held, not cancelled, and not finished yet.
    int unfinishedCount() const;
    // Cancels and drops every task.
    void releaseAll();
    std::size_t bufferedBytes() const;

private:
    TaskPool(const TaskPool&) = delete;
    TaskPool& operator=(const TaskPool&) = delete;

    void submitInto(int slot, const ChaosTask::Settings& settings, int policy, bool held);
    void submitThroughHolder(int slot, const boost::shared_ptr<ChaosTask>& task, int policy);
    void cancelSlot(int slot);
    void onReentry(ChaosTask& task, ChaosTask::Reentry reentry);
    int slotOf(const ChaosTask& task) const;

    InvariantReport& report;
    // Shared with the tasks, which read it at each attempt.
    boost::shared_ptr<std::string> url;
    std::vector<boost::shared_ptr<ChaosTask> > slots;
    // The holder of a slot's task when it was submitted through one.
    std::vector<std::unique_ptr<Network::NetworkTaskHolder> > holders;
};
