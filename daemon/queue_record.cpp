// One queue line judged straight from its text, and the same judgement through the JSON library.
#include "daemon/queue_record.h"

#include <cstdint>
#include <cstring>

#include <json/value.h>

#include "config/json_io.h"
#include "config/json_token.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

// One member of the top-level object, as the text has it; the last of several with one name wins,
// as in the JSON library.
struct MemberText {
    bool present = false;
    JsonToken token = JsonToken::kNull;
    const char *begin = nullptr;
    const char *end = nullptr;
    bool escaped = false;
};

// Collects "event", "path" and "path_old" of the top-level object while the grammar is checked.
class RecordMembers {
public:
    void Key(int depth, const char *begin, const char *end, bool escaped)
    {
        if (depth != 1) {
            return;
        }
        std::string_view name(begin, static_cast<size_t>(end - begin));
        if (escaped) {
            DecodeJsonString(begin, end, m_name);
            name = m_name;
        }
        m_current = name == "event" ? &m_event : name == "path" ? &m_path : name == "path_old" ? &m_pathOld : nullptr;
    }

    void Value(int depth, JsonToken token, const char *begin, const char *end, bool escaped)
    {
        m_needsLibrary = m_needsLibrary || FILEINDEX::NeedsJsonLibrary(token, begin, end);
        if (depth == 0) {
            m_isObject = token == JsonToken::kObject;
        } else if (depth == 1 && m_current != nullptr) {
            *m_current = MemberText{true, token, begin, end, escaped};
        }
    }

    bool NeedsJsonLibrary() const { return m_needsLibrary; }

    // The record the members make; false when they make none.
    bool Fill(QueueRecord &record) const
    {
        if (!m_isObject || !m_event.present || !ReadEvent(record.event) ||
            !ReadString(m_path, record.decodedPath, record.path)) {
            return false;
        }
        if (record.event != kEventMove || !ReadString(m_pathOld, record.decodedPathOld, record.pathOld)) {
            record.pathOld = std::string_view();
        }
        return true;
    }

private:
    // What the JSON library converts to an unsigned integer: an integer from 0 to 4294967295 (-0
    // included), true, false and null.
    bool ReadEvent(unsigned &event) const
    {
        int64_t value = 0;
        switch (m_event.token) {
        case JsonToken::kNumber:
            if (!ReadPlainJsonInteger(m_event.begin, m_event.end, value) || value < 0 || value > 0xFFFFFFFFLL) {
                return false;
            }
            event = static_cast<unsigned>(value);
            return true;
        case JsonToken::kTrue:
            event = 1;
            return true;
        case JsonToken::kFalse:
        case JsonToken::kNull:
            event = 0;
            return true;
        default:
            return false;
        }
    }

    // The string's bytes: the text itself, or when it has escapes their decoding into decoded.
    static bool ReadString(const MemberText &member, std::string &decoded, std::string_view &out)
    {
        if (!member.present || member.token != JsonToken::kString) {
            return false;
        }
        if (member.escaped) {
            DecodeJsonString(member.begin, member.end, decoded);
            out = decoded;
        } else {
            out = std::string_view(member.begin, static_cast<size_t>(member.end - member.begin));
        }
        return true;
    }

    bool m_needsLibrary = false;
    std::string m_name;
    bool m_isObject = false;
    MemberText m_event;
    MemberText m_path;
    MemberText m_pathOld;
    MemberText *m_current = nullptr;
};

constexpr size_t kNone = std::string_view::npos;

// Whether line holds text at pos, compared as a run of bytes of the text's fixed length.
template <size_t N>
bool HasAt(std::string_view line, size_t pos, const char (&text)[N])
{
    return line.size() >= pos + N - 1 && std::memcmp(line.data() + pos, text, N - 1) == 0;
}

bool HasAt(std::string_view line, size_t pos, char c)
{
    return pos < line.size() && line[pos] == c;
}

// The end of a string's plain bytes that starts at begin: the position of its closing quote, or
// kNone when a backslash, a control character or the end of the line comes first.
size_t PlainStringEnd(std::string_view line, size_t begin)
{
    const char *const end = line.data() + line.size();
    const char *const stop = SkipPlainStringBytes(line.data() + begin, end);
    return stop != end && *stop == '"' ? static_cast<size_t>(stop - line.data()) : kNone;
}

// The "data" the library writes into its records, starting at pos: null, or an object of
// booleans under plain names ({} included), without white space. The position after it; kNone for
// any other value.
size_t SkipWrittenData(std::string_view line, size_t pos)
{
    if (HasAt(line, pos, "null")) {
        return pos + 4;
    }
    if (!HasAt(line, pos, '{')) {
        return kNone;
    }
    if (HasAt(line, ++pos, '}')) {
        return pos + 1;
    }
    for (;;) {
        const size_t nameEnd = HasAt(line, pos, '"') ? PlainStringEnd(line, pos + 1) : kNone;
        if (nameEnd == kNone || !HasAt(line, nameEnd + 1, ':')) {
            return kNone;
        }
        pos = nameEnd + 2;
        if (HasAt(line, pos, "true")) {
            pos += 4;
        } else if (HasAt(line, pos, "false")) {
            pos += 5;
        } else {
            return kNone;
        }
        if (HasAt(line, pos, '}')) {
            return pos + 1;
        }
        if (!HasAt(line, pos++, ',')) {
            return kNone;
        }
    }
}

// The shapes the writers give their lines, with no white space, no escape and no control
// character, and N a plain integer up to 4294967295: a file event's {"event":N,"path":"P"}, with
// ,"path_old":"Q" before the brace for a move, and the library's own {"data":D,"event":N,"path":"P"}
// (SkipWrittenData). Judged without the grammar walk, with the walk's very result. False for any
// other line, which may still be a record.
bool ParseWrittenShape(std::string_view line, QueueRecord &record)
{
    static const char kEvent[] = "{\"event\":";
    static const char kData[] = "{\"data\":";
    static const char kEventAfterData[] = ",\"event\":";
    static const char kPath[] = ",\"path\":\"";
    static const char kPathOld[] = ",\"path_old\":\"";
    size_t pos = 0;
    if (HasAt(line, 0, kEvent)) {
        pos = sizeof(kEvent) - 1;
    } else if (HasAt(line, 0, kData)) {
        pos = SkipWrittenData(line, sizeof(kData) - 1);
        if (pos == kNone || !HasAt(line, pos, kEventAfterData)) {
            return false;
        }
        pos += sizeof(kEventAfterData) - 1;
    } else {
        return false;
    }
    const size_t digits = pos;
    uint64_t event = 0;
    for (; pos < line.size() && line[pos] >= '0' && line[pos] <= '9' && pos - digits < 11; ++pos) {
        event = event * 10 + static_cast<uint64_t>(line[pos] - '0');
    }
    const size_t count = pos - digits;
    if (count == 0 || count > 10 || (count > 1 && line[digits] == '0') || event > 0xFFFFFFFFULL ||
        !HasAt(line, pos, kPath)) {
        return false;
    }
    const size_t path = pos + sizeof(kPath) - 1;
    const size_t pathEnd = PlainStringEnd(line, path);
    if (pathEnd == kNone) {
        return false;
    }
    pos = pathEnd + 1;
    size_t pathOld = pos;
    size_t pathOldEnd = pos;
    if (HasAt(line, pos, kPathOld)) {
        pathOld = pos + sizeof(kPathOld) - 1;
        pathOldEnd = PlainStringEnd(line, pathOld);
        if (pathOldEnd == kNone) {
            return false;
        }
        pos = pathOldEnd + 1;
    }
    if (pos + 1 != line.size() || line[pos] != '}') {
        return false;
    }
    record.event = static_cast<unsigned>(event);
    record.path = line.substr(path, pathEnd - path);
    record.pathOld = line.substr(pathOld, record.event == kEventMove ? pathOldEnd - pathOld : 0);
    return true;
}

}  // namespace

bool ParseQueueRecord(std::string_view line, QueueRecord &record)
{
    if (ParseWrittenShape(line, record)) {
        return true;
    }
    RecordMembers members;
    if (!ScanJsonText(line.data(), line.size(), members)) {
        return false;  // fromString refuses what the grammar refuses
    }
    if (members.NeedsJsonLibrary()) {
        return ParseQueueRecordAsJsonValue(line, record);
    }
    return members.Fill(record);
}

bool MakeQueueRecordLine(long long event, const std::string &path, const Json::Value &data, std::string &line)
{
    Json::Value record(Json::objectValue);
    record["event"] = Json::Int64(event);
    record["path"] = path;
    record["data"] = data;
    if (!ReadsBackAsWritten(record)) {
        return false;
    }
    line = toString(record);
    QueueRecord read;
    if (!ParseQueueRecord(line, read)) {
        return false;
    }
    line += '\n';
    return true;
}

bool ParseQueueRecordAsJsonValue(std::string_view line, QueueRecord &record)
{
    Json::Value value;
    if (!fromString(value, std::string(line)) || !value.isObject()) {
        return false;
    }
    const auto member = [&value](const char *key) { return value.find(key, key + strlen(key)); };
    const Json::Value *event = member("event");
    const Json::Value *path = member("path");
    if (event == nullptr || path == nullptr || !event->isConvertibleTo(Json::uintValue) || !path->isString()) {
        return false;
    }
    record.event = event->asUInt();
    record.decodedPath = path->asString();
    record.path = record.decodedPath;
    const Json::Value *pathOld = record.event == kEventMove ? member("path_old") : nullptr;
    record.decodedPathOld = pathOld != nullptr && pathOld->isString() ? pathOld->asString() : std::string();
    record.pathOld = record.decodedPathOld;
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
