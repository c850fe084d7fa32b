#pragma once

#include <string>

#include "devserver/Journal.h"

namespace demo {

// Prints the closing summary of a run: what the server at baseUrl received,
// by kind of request, the counts the scenes noted and every file written.
// Upload files in the journal are relative to dataFolder.
void printSummary(const std::string& baseUrl, const DevServer::Journal& journal,
                  const std::string& dataFolder);

}  // namespace demo
