#pragma once

#include <KD/kd.h>

namespace Wireless {

// Posts to the calling thread an answer of the given type, for requester,
// that carries no data: no record, a zero success flag. A radio query the
// platform refuses is answered this way, so its requester hears back once
// like any other and nobody waits for an answer that never comes.
void postAnswerWithoutData(KDint32 type, void* requester);

// Hands the event's record back to the platform, if it carries one.
void releaseRecord(const KDEvent* event);

}  // namespace Wireless
