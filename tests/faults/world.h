// What the runs begin with and leave behind: configuration file, bitmap file, message queue.
#pragma once

#include <json/value.h>
#include <string>
#include <vector>

namespace vesk {
// The known beginning: the document and the bitmap below, no queue; with messages a queue that
// holds them: 'a' pins file a, 'c' file c, 'u' unpins file b, 'r' reloads, 'g' reloads a volume
// that is not there.
void WorldReset(const char *config, const std::vector<char> &messages);

std::string WorldDocument(); // the configuration file that WorldReset writes
std::string WorldBitmap();   // the bitmap file that it writes
size_t WorldMessages();      // the messages that it has sent
int WorldMessagesLeft();     // those that are still on the queue

// Sends a request to pin files, paths joined by ";": true, or false when the queue is full and
// it must not wait. Needs a queue, which WorldAwaitQueue waits for.
bool WorldSendPin(const std::string &paths, bool waiting);
void WorldAwaitQueue();
// The same for the message that begins, or ends, the volume's pending state.
bool WorldSendPending(bool isPending);

long WorldRecords(const char *config); // pinned files of /volume1 in the document

// Nothing is queued, neither as a message nor in the document, and the next request will get the
// number `next`. While a service runs this also tells that all that was sent before is carried out.
bool WorldIsIdle(const char *config, long next);
long WorldNextNumber(const char *config); // the number that the next request will get

// What is wrong with a document: it must be one, and every queued number must have its request and
// the reverse. Empty: nothing, also where there is no document.
std::string WorldComplaint(const std::string &document);

// The document of a text; false where it is none.
bool WorldParse(const std::string &text, Json::Value &root);

// The file's content; empty where there is none. And writing it whole.
std::string WorldRead(const std::string &path);
void WorldWrite(const std::string &path, const std::string &content);

// Whether anything but the file is in its folder, beside the runs' own output.
bool WorldLeftovers(const std::string &path);
} // namespace vesk
