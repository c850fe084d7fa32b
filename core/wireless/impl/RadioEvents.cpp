#include "wireless/impl/RadioEvents.h"

namespace Wireless {

void postAnswerWithoutData(KDint32 type, void* requester) {
    KDEvent* event = kdCreateEvent();
    event->type = type;
    event->timestamp = kdGetTimeUST();
    event->userptr = requester;
    kdPostEvent(event);
}

void releaseRecord(const KDEvent* event) {
    if (event->data.recordzvr.release != nullptr) {
        event->data.recordzvr.release(event);
    }
}

}  // namespace Wireless
