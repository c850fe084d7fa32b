#pragma once

#include <filesystem>
#include <string>

#include "devserver/Journal.h"

namespace demo {

// Prints the closing summary of a run: what the server at baseUrl received,
// by kind of request, the counts the scenes noted and every file written.
// Lists the files the server wrote in dataFolder since the given time.
void printSummary(const std::string& baseUrl, const DevServer::Journal& journal,
                  const std::string& dataFolder, std::filesystem::file_time_type since);

}  // namespace demo
