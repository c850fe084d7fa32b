#include "tasking/TaskManager.h"

#include "tasking/impl/TaskManagerImpl.h"

namespace Tasking {

TaskManager* TaskManager::getInstance() {
    return Util::Singleton<TaskManagerImpl>::getInstance();
}

boost::shared_ptr<TaskManager> TaskManager::create() {
    return boost::shared_ptr<TaskManager>(new TaskManagerImpl());
}

}  // namespace Tasking
