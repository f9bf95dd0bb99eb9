// The paged listing and its records' computed information ("status", "is_valid"), answered within
// a call's context (status/call_context.h): a listing passes one context for its whole page, and
// Folder's own operations give each call one that keeps nothing.
#ifndef FILEINDEX_FOLDER_LISTING_H
#define FILEINDEX_FOLDER_LISTING_H

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"
#include "status/call_context.h"

namespace VEXO {
namespace FILEINDEX {

// Folder::asJson(additional) and the two forms of Folder::GetAdditional, in context.
Json::Value RecordWithAdditional(const Folder &folder, const Json::Value &additional, CallContext &context);
bool GetAdditional(const Folder &folder, Json::Value &out, const std::string &key, CallContext &context);
bool GetAdditional(const Folder &folder, Json::Value &out, const Json::Value &keys, CallContext &context);

// Folders::List(out, offset, limit, sort_by, sort_direction, additional) of the folders given in path
// order, the page's records made in context, whose queue readings are set to the page's folders.
void ListPage(std::vector<Folder> folders, Json::Value &out, unsigned long offset, unsigned long limit,
              const std::string &sort_by, const std::string &sort_direction, const Json::Value &additional,
              CallContext &context);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
