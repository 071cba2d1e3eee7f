// The answers of the scripted appliance libraries: a text file named by VESK_SCRIPT, read afresh
// for every call, so that a test can change it while the tool runs. Per line a name and its values,
// separated by blanks; "-" stands for an empty text or a null pointer.
//
//   enum RESULT                      of VESKSpaceInfoEnum (0 where the line is missing)
//   space DEVICE REFERENCE UUID      one space each; REFERENCE - : missing, UUID - : cannot be read
//   config RESULT SSD                of VESKFlashCacheConfigTmpGet; the record is set above 0
//   stat RESULT STATE PIN [set]      of VESKFlashCacheStatGet; "set": set the record on failure too
//   cache RESULT PATH                of VESKFlashcacheGetCachePath
//   device RESULT PATH               of FileSystemDevice::GetDevicePath
//   create RESULT                    of FileSystemDeviceCreater::Create; 0: null
//   mapping RESULT [EXTENT...]       of GetMappingByInode, one line per call, the last for the
//   rest;
//                                    EXTENT is FILE_START:SECTORS:DEVICE_START:FLAG
//
// Every call is written as a line to the file VESK_SCRIPT.calls.
//
// Thread rule: no state; the calls' file is appended to with single writes.
#pragma once

#include <string>
#include <vector>

using ScriptLine = std::vector<std::string>; // the values behind the name

// All lines with this name, in order.
std::vector<ScriptLine> ScriptLines(const std::string &name);

// The first line with this name, or an empty one.
ScriptLine ScriptFirst(const std::string &name);

// A value as a number; `fallback` where the line is too short.
int ScriptNumber(const ScriptLine &line, size_t index, int fallback);

// A value as a text; empty where the line is too short or it is "-".
std::string ScriptText(const ScriptLine &line, size_t index);

// Records a call.
void ScriptCall(const std::string &text);
