#include "TaskPool.h"

#include <boost/make_shared.hpp>

#include "ChaosServer.h"
#include "network/NetworkManager.h"
#include "network/NetworkTaskBasicRetryPolicy.h"

namespace {

enum Policy {
    DefaultPolicy,
    SingleAttempt,
    FewQuickRetries,
    EndlessRetries,
    RetriesWithTimeout,
    PolicyCount
};

Network::NetworkManager* manager() {
    return Network::NetworkManager::getInstance();
}

}  // namespace

TaskPool::TaskPool(InvariantReport& report)
    : report(report), url(boost::make_shared<std::string>()), slots(kSlots), holders(kSlots) {}

TaskPool::~TaskPool() {
    releaseAll();
}

void TaskPool::setHost(const std::string& host) {
    *url = host + ChaosServer::kTaskPath;
}

void TaskPool::submit(ByteScript& script) {
    const int slot = script.pick(kSlots);
    ChaosTask::Settings settings;
    settings.priority = script.pick(4);
    settings.byParts = script.chance(2);
    settings.ready = !script.chance(6);
    settings.reentry = static_cast<ChaosTask::Reentry>(script.pick(ChaosTask::ReentryCount));
    settings.url = url;
    const int policy = script.pick(PolicyCount);
    const bool held = script.chance(3);
    if (!slots[slot]) {
        submitInto(slot, settings, policy, held);
    }
}

void TaskPool::submitInto(int slot, const ChaosTask::Settings& settings, int policy, bool held) {
    boost::shared_ptr<ChaosTask> task = boost::make_shared<ChaosTask>(
        settings, [this](ChaosTask& which, ChaosTask::Reentry reentry) { onReentry(which, reentry); },
        report);
    slots[slot] = task;
    holders[slot].reset();
    if (held) {
        submitThroughHolder(slot, task, policy);
        return;
    }
    switch (policy) {
        case SingleAttempt:
            manager()->submit(task, boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(500, 1, false));
            break;
        case FewQuickRetries:
            manager()->submit(task, boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(200, 3, false));
            break;
        case EndlessRetries:
            manager()->submit(task,
                              boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(1000, -1, false));
            break;
        case RetriesWithTimeout:
            manager()->submit(task, boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(700, 4, true));
            break;
        default:
            manager()->submit(task);
            break;
    }
}

void TaskPool::submitThroughHolder(int slot, const boost::shared_ptr<ChaosTask>& task, int policy) {
    holders[slot].reset(new Network::NetworkTaskHolder());
    Network::NetworkTaskHolder* holder = holders[slot].get();
    task->setFinalHook([holder] { holder->onFinished(); });
    switch (policy) {
        case SingleAttempt:
            holder->submitNoRetries(task);
            break;
        case EndlessRetries:
            holder->submitInfRetries(task);
            break;
        case RetriesWithTimeout:
            holder->submit(task, boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(700, 4, true));
            break;
        default:
            holder->submit(task);
            break;
    }
}

void TaskPool::cancel(ByteScript& script) {
    cancelSlot(script.pick(kSlots));
}

void TaskPool::cancelSlot(int slot) {
    boost::shared_ptr<ChaosTask> task = slots[slot];
    if (!task || task->isCancelled()) {
        return;
    }
    task->markCancelled();
    if (!holders[slot]) {
        manager()->cancel(task);
    } else if (holders[slot]->isWorking()) {
        holders[slot]->cancel();
    }
}

void TaskPool::release(ByteScript& script) {
    const int slot = script.pick(kSlots);
    cancelSlot(slot);
    slots[slot].reset();
    holders[slot].reset();
}

void TaskPool::makeReady(ByteScript& script) {
    const int slot = script.pick(kSlots);
    if (slots[slot]) {
        slots[slot]->setReady(true);
    }
}

void TaskPool::readyAll() {
    for (const boost::shared_ptr<ChaosTask>& task : slots) {
        if (task) {
            task->setReady(true);
        }
    }
}

int TaskPool::unfinishedCount() const {
    int count = 0;
    for (const boost::shared_ptr<ChaosTask>& task : slots) {
        if (task && !task->isCancelled() && !task->hasFinished()) {
            ++count;
        }
    }
    return count;
}

void TaskPool::releaseAll() {
    for (int slot = 0; slot < kSlots; ++slot) {
        cancelSlot(slot);
        slots[slot].reset();
        holders[slot].reset();
    }
}

std::size_t TaskPool::bufferedBytes() const {
    std::size_t total = 0;
    for (const boost::shared_ptr<ChaosTask>& task : slots) {
        total += task ? task->bufferedBytes() : 0;
    }
    return total;
}

void TaskPool::onReentry(ChaosTask& task, ChaosTask::Reentry reentry) {
    const int slot = slotOf(task);
    if (slot < 0) {
        return;
    }
    switch (reentry) {
        case ChaosTask::CancelOnResponse:
        case ChaosTask::CancelOnBytes:
        case ChaosTask::CancelOnRetry:
            cancelSlot(slot);
            break;
        case ChaosTask::ReleaseOnFinish:
            cancelSlot(slot);
            slots[slot].reset();
            break;
        case ChaosTask::SubmitOnFinish: {
            // A finished task frees its slot for the follow-up it asks for.
            slots[slot].reset();
            ChaosTask::Settings followUp;
            followUp.url = url;
            submitInto(slot, followUp, SingleAttempt, false);
            break;
        }
        default:
            break;
    }
}

int TaskPool::slotOf(const ChaosTask& task) const {
    for (int slot = 0; slot < kSlots; ++slot) {
        if (slots[slot].get() == &task) {
            return slot;
        }
    }
    return -1;
}
