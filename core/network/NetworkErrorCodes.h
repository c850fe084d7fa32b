#pragma once

#include "network/HttpFinishCodes.h"

namespace Network {

// Finish codes a network task can receive besides HTTP statuses and the
// engine's own failure codes.

// The engine's sign that the device is offline; the manager switches offline
// mode on when a task finishes with it.
const int OFFLINE_ERROR_CODE = HTTP_OFFLINE_ERROR_CODE;
// The retry policy's overall task timeout expired.
const int TASK_TIMEOUT_ERROR_CODE = -1073741826;

}  // namespace Network
