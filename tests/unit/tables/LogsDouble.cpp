#include "agent/zrmmain.h"
#include "logmgr/LogManager.h"
#include "monitor/UTF8Conv.h"

decltype(pTheLogManager) pTheLogManager{nullptr};
char* gSystemName = nullptr;
char* gHostName = nullptr;
std::int32_t gMaxRows = 1000;

void LogManager::beginRequest() {}
void LogManager::endRequest() {}
LogFile* LogManager::findLogObject(const char*) {
    return nullptr;
}
std::int32_t UTF8Conv::Convert_fromUTF8(char*, std::size_t, const char*, std::size_t) {
    return 0;
}
