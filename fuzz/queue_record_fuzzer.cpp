// One line of a share's event queue, as every scan of a queue judges it. Whatever the line holds,
// the reader answers without crashing or throwing, and exactly as the JSON library's reading of the
// line does; and so it does for the line of the library's own shape with the input as its "data",
// a shape the reader takes straight from its bytes. A line it accepts says the same when written
// again as a record, by hand and by the library's own record writer, and the same line cut short
// anywhere, as a writer stopped mid-append leaves it, is never taken for a record.
#include <cstdlib>
#include <string>

#include "config/json_io.h"
#include "daemon/queue_record.h"

using namespace VEXO::FILEINDEX;

namespace {

bool SameRecord(const QueueRecord &a, const QueueRecord &b)
{
    return a.event == b.event && a.path == b.path && a.pathOld == b.pathOld;
}

// Whether the reader takes line for a record (into record), after checking that the JSON library's
// reading says the same, with the same record.
bool ReadAlike(const std::string &line, QueueRecord &record)
{
    QueueRecord throughLibrary;
    const bool accepted = ParseQueueRecord(line, record);
    if (accepted != ParseQueueRecordAsJsonValue(line, throughLibrary) || (accepted && !SameRecord(record, throughLibrary))) {
        abort();
    }
    return accepted;
}

std::string Rewritten(const QueueRecord &record)
{
    Json::Value value(Json::objectValue);
    value["event"] = record.event;
    value["path"] = std::string(record.path);
    value["path_old"] = std::string(record.pathOld);
    return toString(value);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    const std::string line(reinterpret_cast<const char *>(data), size);
    QueueRecord asData;
    ReadAlike("{\"data\":" + line + ",\"event\":131072,\"path\":\"/volume1/photo\"}", asData);
    QueueRecord record;
    if (!ReadAlike(line, record)) {
        return 0;
    }
    QueueRecord again;
    if (!ParseQueueRecord(Rewritten(record), again) || !SameRecord(record, again)) {
        abort();
    }
    // What the library appends for the record, with the line's own data, is a line it reads back.
    Json::Value value;
    fromString(value, line);
    std::string appended;
    QueueRecord appendedBack;
    if (!MakeQueueRecordLine(record.event, std::string(record.path), value["data"], appended) ||
        !ParseQueueRecord(appended, appendedBack) || appendedBack.event != record.event ||
        appendedBack.path != record.path) {
        abort();
    }
    // Cuts spread over the line, the last one just before its closing brace.
    const size_t end = line.find_last_not_of(" \t\r\n");
    const size_t step = end / 64 + 1;
    for (size_t cut = end % step; cut <= end; cut += step) {
        QueueRecord torn;
        if (ParseQueueRecord(line.substr(0, cut), torn)) {
            abort();
        }
    }
    return 0;
}
