// The emulation's fault rules of faults.json, read and matched against each call.
#include "faults.h"

#include <map>
#include <mutex>
#include <string>
#include <vector>

#include <json/value.h>

#include "error_state_internal.h"
#include "state_dir.h"

namespace VEXO {
namespace EMULATION {
namespace {

struct FaultRule {
    std::optional<std::string> match;
    std::optional<int> result;
    std::optional<int> error;
    std::string file = "emulation";
    int line = 0;
    int after = 0;  // matching calls that go through before the rule applies
};

struct FaultTable {
    std::map<std::string, std::vector<FaultRule>> rules;
    Json::Value source;  // the file's content, to tell a changed file from one read again
};

// Matching calls gone through per rule ("after"), counted since faults.json last changed content.
struct PassedCalls {
    Json::Value countedFor;
    std::map<std::pair<std::string, size_t>, int> passed;  // by operation and rule position
};

bool IntOf(const Json::Value &value, int &out)
{
    if (value.isBool()) {
        out = value.asBool() ? 1 : 0;
        return true;
    }
    if ((value.type() == Json::intValue || value.type() == Json::uintValue) && value.isInt()) {
        out = value.asInt();
        return true;
    }
    return false;
}

// A rule with a member of the wrong type is left out, as if it were not there.
bool ParseRule(const Json::Value &json, FaultRule &rule)
{
    if (!json.isObject()) {
        return false;
    }
    if (json.isMember("match")) {
        if (!json["match"].isString()) {
            return false;
        }
        rule.match = json["match"].asString();
    }
    int number = 0;
    if (json.isMember("result")) {
        if (!IntOf(json["result"], number)) {
            return false;
        }
        rule.result = number;
    }
    if (json.isMember("error")) {
        if (!IntOf(json["error"], number)) {
            return false;
        }
        rule.error = number;
    }
    if (json.isMember("file")) {
        if (!json["file"].isString()) {
            return false;
        }
        rule.file = json["file"].asString();
    }
    if (json.isMember("line")) {
        if (!IntOf(json["line"], rule.line)) {
            return false;
        }
    }
    if (json.isMember("after")) {
        if (!IntOf(json["after"], rule.after)) {
            return false;
        }
    }
    return true;
}

bool ParseFaults(const Json::Value &json, FaultTable &table)
{
    if (!json.isObject()) {
        return json.isNull();
    }
    table.source = json;
    for (const std::string &op : json.getMemberNames()) {
        const Json::Value &rules = json[op];
        std::vector<FaultRule> &parsed = table.rules[op];
        if (rules.isArray()) {
            for (const Json::Value &rule : rules) {
                FaultRule one;
                if (ParseRule(rule, one)) {
                    parsed.push_back(std::move(one));
                }
            }
        } else {
            FaultRule one;
            if (ParseRule(rules, one)) {
                parsed.push_back(std::move(one));
            }
        }
    }
    return true;
}

const FaultRule *FindRule(const FaultTable &table, const char *op, const char *matchText, bool needsResult,
                         PassedCalls &calls)
{
    const auto found = table.rules.find(op);
    if (found == table.rules.end()) {
        return nullptr;
    }
    for (size_t index = 0; index < found->second.size(); ++index) {
        const FaultRule &rule = found->second[index];
        if (needsResult && !rule.result) {
            continue;
        }
        if (rule.match && (matchText == nullptr || *rule.match != matchText)) {
            continue;
        }
        int &passed = calls.passed[{found->first, index}];
        if (passed < rule.after) {
            ++passed;
            continue;
        }
        return &rule;
    }
    return nullptr;
}

// Applies the first rule that matches: sets its error, if it names one, and returns it.
const FaultRule *ApplyRule(const char *op, const char *matchText, bool needsResult,
                           std::shared_ptr<const FaultTable> &holder)
{
    static CachedStateFile<FaultTable> faults("faults.json", ParseFaults);
    holder = faults.Get();
    if (holder == nullptr) {
        return nullptr;  // a faults.json that does not parse forces nothing
    }
    static std::mutex mutex;
    static PassedCalls calls;
    std::lock_guard<std::mutex> lock(mutex);
    if (calls.countedFor != holder->source) {
        calls.countedFor = holder->source;
        calls.passed.clear();
    }
    const FaultRule *rule = FindRule(*holder, op, matchText, needsResult, calls);
    if (rule != nullptr && rule->error) {
        SetPlatformError(*rule->error, rule->file.c_str(), rule->line);
    }
    return rule;
}

}  // namespace

std::optional<int> ForcedResult(const char *op, const char *matchText)
{
    std::shared_ptr<const FaultTable> holder;
    const FaultRule *rule = ApplyRule(op, matchText, true, holder);
    return rule != nullptr ? rule->result : std::nullopt;
}

bool ForcedFailure(const char *op, const char *matchText)
{
    std::shared_ptr<const FaultTable> holder;
    return ApplyRule(op, matchText, false, holder) != nullptr;
}

}  // namespace EMULATION
}  // namespace VEXO
