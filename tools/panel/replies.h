// How the panel answers: JSON documents, error objects, and the small page shown to a person who
// came without the token.
#ifndef FILEINDEX_PANEL_REPLIES_H
#define FILEINDEX_PANEL_REPLIES_H

#include <string>

#include <httplib.h>
#include <json/value.h>

#include "failure.h"

namespace fileindex_panel {

// 200 (or status) with the document as compact JSON.
void Send(httplib::Response &response, const Json::Value &document, int status = 200);

// status with the error object, code and name null: a request the panel refuses itself, before any
// library call.
void Refuse(httplib::Response &response, int status, const std::string &message);

// The error object of a failure ({"error": {"code", "name", "message"}}, as fileindexctl gives it):
// 503 with Retry-After for a lock that stayed busy, 400 for a request that is wrong in itself
// (kInvalid), 422 for any other.
void SendFailure(httplib::Response &response, const fileindex_tool::Failure &failure);

// status with a small HTML page that says what is wrong and what to do.
void RefusePage(httplib::Response &response, int status, const std::string &sentence);

}  // namespace fileindex_panel

#endif
