// Request bodies and parameters read strictly: JSON, paths with their bytes, folder settings, counts.
#include "requests.h"

#include <memory>

#include <json/reader.h>

#include "path_encoding.h"

namespace fileindex_panel {

namespace {

const char *const kMedia[] = {"document", "audio", "video", "photo"};

bool IsMedium(const std::string &name)
{
    for (const char *medium : kMedia) {
        if (name == medium) {
            return true;
        }
    }
    return false;
}

std::string Position(Json::ArrayIndex index)
{
    return "element " + std::to_string(index);
}

}  // namespace

bool ParseBody(const std::string &body, Json::Value &value, std::string &problem)
{
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    builder["stackLimit"] = 64;
    std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    std::string errors;
    if (body.empty() || !reader->parse(body.data(), body.data() + body.size(), &value, &errors)) {
        problem = "the body is not JSON" + (errors.empty() ? std::string() : ": " + errors.substr(0, 200));
        while (!problem.empty() && problem.back() == '\n') {
            problem.pop_back();
        }
        return false;
    }
    return true;
}

bool ReadPath(const Json::Value &element, std::string &path, std::string &problem)
{
    if (element.isString()) {
        path = element.asString();
    } else if (element.isObject() && element.isMember("path_bytes")) {
        const Json::Value &bytes = element["path_bytes"];
        if (!bytes.isString() || !fileindex_tool::PercentDecode(bytes.asString(), path)) {
            problem = "\"path_bytes\" must be a string of the path's bytes, percent-encoded";
            return false;
        }
    } else if (element.isObject() && element["path"].isString()) {
        path = element["path"].asString();
    } else {
        problem = "a path must be a string, or an object with a string \"path\" or \"path_bytes\"";
        return false;
    }
    if (path.empty() || path[0] != '/' || path.find('\0') != std::string::npos) {
        problem = "a path must begin with \"/\" (/<share>/<folder>) and hold no NUL byte";
        return false;
    }
    return true;
}

bool ReadPaths(const Json::Value &body, std::vector<std::string> &paths, std::string &problem)
{
    if (!body.isArray() || body.empty() || body.size() > kMaxRequestElements) {
        problem = "the body must be an array of 1 to " + std::to_string(kMaxRequestElements) + " paths";
        return false;
    }
    for (Json::ArrayIndex i = 0; i < body.size(); ++i) {
        std::string path;
        if (!ReadPath(body[i], path, problem)) {
            problem = Position(i) + ": " + problem;
            return false;
        }
        paths.push_back(path);
    }
    return true;
}

bool ReadFolderSettings(const Json::Value &body, Json::Value &settings, std::vector<std::string> &paths,
                        std::string &problem)
{
    if (!body.isArray() || body.empty() || body.size() > kMaxRequestElements) {
        problem = "the body must be an array of 1 to " + std::to_string(kMaxRequestElements) + " folder settings";
        return false;
    }
    settings = Json::Value(Json::arrayValue);
    for (Json::ArrayIndex i = 0; i < body.size(); ++i) {
        const Json::Value &element = body[i];
        std::string path;
        if (!element.isObject() || !ReadPath(element, path, problem)) {
            problem = Position(i) + ": " +
                      (element.isObject() ? problem : "a folder setting must be an object with \"path\"");
            return false;
        }
        Json::Value setting;
        for (const std::string &name : element.getMemberNames()) {
            const Json::Value &member = element[name];
            if (name == "path" || name == "path_bytes") {
                continue;
            }
            const bool fits = name == "name" ? member.isString() : IsMedium(name) && member.isBool();
            if (!fits) {
                problem = Position(i) + ": " +
                          (name == "name" || IsMedium(name)
                               ? "\"" + name + "\" must be " + (name == "name" ? "a string" : "true or false")
                               : "unknown member \"" + name + "\" (a folder setting has path, name, document, "
                                                               "audio, video, photo)");
                return false;
            }
            setting[name] = member;
        }
        setting["path"] = path;
        settings.append(setting);
        paths.push_back(path);
    }
    return true;
}

bool ReadCount(const std::string &text, unsigned long fallback, unsigned long max, unsigned long &count)
{
    if (text.empty()) {
        count = fallback;
        return true;
    }
    if (text.size() > 9 || text.find_first_not_of("0123456789") != std::string::npos) {
        return false;
    }
    count = std::stoul(text);
    return count <= max;
}

}  // namespace fileindex_panel
