// JSON answers, error objects with their HTTP status, and the page for a visitor without the token.
#include "replies.h"

#include <json/writer.h>

#include "library_calls.h"

namespace fileindex_panel {

namespace {

// Without comment handling: requests are parsed without comments, so no document the panel writes
// carries any, and the writer is spared looking for them at every value.
std::string CompactJson(const Json::Value &document)
{
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    builder["commentStyle"] = "None";
    return Json::writeString(builder, document);
}

// Text for an HTML element: the characters that mean something in markup are escaped.
std::string HtmlText(const std::string &text)
{
    std::string html;
    for (char c : text) {
        switch (c) {
        case '&': html += "&amp;"; break;
        case '<': html += "&lt;"; break;
        case '>': html += "&gt;"; break;
        case '"': html += "&quot;"; break;
        default: html += c;
        }
    }
    return html;
}

}  // namespace

void Send(httplib::Response &response, const Json::Value &document, int status)
{
    response.status = status;
    response.set_content(CompactJson(document), "application/json");
}

void Refuse(httplib::Response &response, int status, const std::string &message)
{
    using fileindex_tool::Failure;
    Send(response,
         fileindex_tool::ErrorObject(
             fileindex_tool::ToolFailure(fileindex_tool::FailureKind::kInvalid, Failure::kNoCode, message)),
         status);
}

void SendFailure(httplib::Response &response, const fileindex_tool::Failure &failure)
{
    using fileindex_tool::FailureKind;
    int status = 422;
    if (failure.kind == FailureKind::kBusy) {
        status = 503;
        response.set_header("Retry-After", std::to_string(kBusyRetryAfterSeconds));
    } else if (failure.kind == FailureKind::kInvalid) {
        status = 400;
    }
    Send(response, fileindex_tool::ErrorObject(failure), status);
}

void RefusePage(httplib::Response &response, int status, const std::string &sentence)
{
    response.status = status;
    response.set_content("<!DOCTYPE html>\n<html lang=\"en\"><head><meta charset=\"utf-8\">"
                         "<title>File index panel</title></head><body><h1>File index panel</h1><p>" +
                             HtmlText(sentence) +
                             " Open the address that fileindex-panel printed when it started: it carries the "
                             "token, which the panel then keeps in a cookie for this browser.</p></body></html>\n",
                         "text/html; charset=utf-8");
}

}  // namespace fileindex_panel
