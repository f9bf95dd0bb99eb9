// What the index makes of a path, as fileindexctl check prints it and the panel's check answers it.
#ifndef FILEINDEX_TOOL_CHECK_REPORT_H
#define FILEINDEX_TOOL_CHECK_REPORT_H

#include <string>

#include <json/value.h>

namespace fileindex_tool {

// {"path", "path_bytes", "full_path", "full_path_bytes" (both null when the share-relative path
// does not resolve), "indexed" (an indexed folder or inside one), "contains_indexed" (holds indexed
// folders), "may_be_indexed", "refusal", "refusal_text" (the rule that refuses it as a folder to
// index: IndexRefusalName and IndexRefusalText, "none" when none does), "crawler_skips",
// "skip_refusal", "skip_refusal_text" (the same for an entry the crawler meets; null when the path
// does not resolve)}. Reads folder.conf without its lock and asks the platform; takes no lock,
// writes nothing, and may set the library's last error.
Json::Value CheckReport(const std::string &path);

}  // namespace fileindex_tool

#endif
