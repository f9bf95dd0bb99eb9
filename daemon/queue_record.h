// One line of a share's event queue file as the library reads it: {"event": kind, "path": path,
// ...}, with "path_old" added by moves. The event queue's reindex search and the progress report
// judge every line here, so that both skip exactly the same lines; and the line the library
// appends is made here, and only when these readers read it back as written.
#ifndef FILEINDEX_DAEMON_QUEUE_RECORD_H
#define FILEINDEX_DAEMON_QUEUE_RECORD_H

#include <string>
#include <string_view>

#include <json/value.h>

namespace VEXO {
namespace FILEINDEX {

// Event kinds the library reads or queues itself; the notification daemon writes others too.
constexpr unsigned kEventMove = 0x100;
constexpr unsigned kEventReindex = 0x10000;
constexpr unsigned kEventFolderSettingChanged = 0x20000;

// A record as read from one line. path and pathOld view the line's own bytes where its text holds
// them as they are, and the record's decoded copies where it has escapes: they hold as long as both
// the line and the record do, and a record is therefore never copied.
struct QueueRecord {
    QueueRecord() = default;
    QueueRecord(const QueueRecord &) = delete;
    QueueRecord &operator=(const QueueRecord &) = delete;

    unsigned event = 0;
    std::string_view path;
    std::string_view pathOld;  // "path_old" of a move when it is a string; empty otherwise
    std::string decodedPath;     // the bytes path views when its text has escapes
    std::string decodedPathOld;  // the same for pathOld
};

// True when line is one JSON object (fromString) with an "event" the JSON library can convert to an
// unsigned integer and a string "path"; record is then filled. False for anything else (a line
// being appended, a foreign record), record unspecified. Reads the members straight from the
// text, and the shapes the writers give their lines without even walking the grammar: a file
// event's {"event":N,"path":"P"} (plus "path_old" for a move) and the library's own
// {"data":D,"event":N,"path":"P"} with D null or an object of booleans. Hands the rare line whose
// judgement needs the JSON library to ParseQueueRecordAsJsonValue.
bool ParseQueueRecord(std::string_view line, QueueRecord &record);

// The same judgement made on the line's Json::Value.
bool ParseQueueRecordAsJsonValue(std::string_view line, QueueRecord &record);

// The line AddCustomEvent appends: the text of {"event": event, "path": path, "data": data} and a
// newline. False, with line unspecified, when the library's readers would not read it back as
// written: an event ParseQueueRecord skips (below 0 or above 4294967295), or data that JSON text
// cannot carry (ReadsBackAsWritten of json_io.h).
bool MakeQueueRecordLine(long long event, const std::string &path, const Json::Value &data, std::string &line);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
