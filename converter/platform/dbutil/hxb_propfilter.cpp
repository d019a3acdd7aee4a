#include "hxb_propfilter.h"

#include <cstdio>
#include <string_view>
#include <utility>

#include "hx_property.h"
#include "port_msg.h"

namespace {

constexpr const char* kModule = "Hxb";
constexpr const char* kRevision = "$Revision: 1.0 $";

bool is_blank(char c) {
    return c == ' ' || c == '\t' || c == '\r' || c == '\v' || c == '\f';
}

std::string_view trim(std::string_view text) {
    while (!text.empty() && is_blank(text.front()))
        text.remove_prefix(1);
    while (!text.empty() && is_blank(text.back()))
        text.remove_suffix(1);
    return text;
}

// The whole file, or false when it cannot be opened or read.
bool read_file(const char* path, std::string& content) {
    std::FILE* file = path ? std::fopen(path, "rb") : nullptr;
    if (file == nullptr) return false;
    char buffer[4096];
    size_t got = 0;
    while ((got = std::fread(buffer, 1, sizeof buffer, file)) > 0)
        content.append(buffer, got);
    const bool ok = std::ferror(file) == 0;
    std::fclose(file);
    return ok;
}

// Checks one side of a rule; sets `prefix` when it ends in "*".
const char* check_name(std::string_view name, bool& prefix) {
    if (name.empty()) return "a name is missing";
    prefix = name.back() == '*';
    if (prefix) name.remove_suffix(1);
    for (const char c : name) {
        if (is_blank(c)) return "a name holds a blank";
        if (c == '*') return "'*' may only end a name";
    }
    return nullptr;
}

}  // namespace

Hxb_PropFilter::Hxb_PropFilter(const char* file, Hxb_PropFiltStatus* status, PM_SPEC* /*device*/,
                               Direction direction)
    : direction_(direction) {
    status_ = read(file);
    if (status_ != HXB_PROPFILT_READ) rules_.clear();
    if (status != nullptr) *status = status_;
}

Hxb_PropFilter::~Hxb_PropFilter() = default;

Hxb_PropFiltStatus Hxb_PropFilter::read(const char* file) {
    std::string content;
    if (!read_file(file, content)) return HXB_PROPFILT_CANNOT_OPEN;
    size_t start = 0;
    for (int line_number = 1; start <= content.size(); ++line_number) {
        size_t end = content.find('\n', start);
        if (end == std::string::npos) end = content.size();
        const std::string line = content.substr(start, end - start);
        start = end + 1;
        Rule rule;
        bool is_rule = false;
        const char* reason = nullptr;
        if (!parse_line(line, rule, is_rule, reason)) {
            PORT_MSG(kModule, kRevision)
                .issueError("property filter file '%s', line %d: %s: '%s'", file, line_number,
                            reason, std::string(trim(line)).c_str());
            return HXB_PROPFILT_MALFORMED;
        }
        if (is_rule) rules_.push_back(std::move(rule));
    }
    return HXB_PROPFILT_READ;
}

bool Hxb_PropFilter::parse_line(const std::string& line, Rule& rule, bool& is_rule,
                                const char*& reason) {
    if (line.find('\0') != std::string::npos) {
        reason = "the line holds a NUL byte";
        return false;
    }
    std::string_view text = trim(std::string_view(line).substr(0, line.find('#')));
    is_rule = !text.empty();
    if (!is_rule) return true;
    const size_t equals = text.find('=');
    if (equals != std::string_view::npos && text.find('=', equals + 1) != std::string_view::npos) {
        reason = "more than one '='";
        return false;
    }
    const std::string_view from = trim(text.substr(0, equals));
    reason = check_name(from, rule.prefix);
    if (reason != nullptr) return false;
    rule.drop = equals == std::string_view::npos;
    rule.from = from.substr(0, from.size() - (rule.prefix ? 1 : 0));
    if (rule.drop) return true;

    const std::string_view to = trim(text.substr(equals + 1));
    bool to_prefix = false;
    reason = check_name(to, to_prefix);
    if (reason == nullptr && to_prefix != rule.prefix)
        reason = "a prefix can only be renamed to a prefix";
    if (reason != nullptr) return false;
    rule.to = to.substr(0, to.size() - (to_prefix ? 1 : 0));
    if (direction_ == INTO_DATABASE) std::swap(rule.from, rule.to);
    return true;
}

const Hxb_PropFilter::Rule* Hxb_PropFilter::match(std::string_view name) const {
    for (const Rule& rule : rules_) {
        if (rule.prefix ? name.starts_with(rule.from) : name == rule.from) return &rule;
    }
    return nullptr;
}

bool Hxb_PropFilter::map_prop(const HX_PROPERTY* prop, const HX_PROPERTY*& out) {
    out = nullptr;
    if (prop == nullptr) return false;
    const std::string_view name = prop->get_name();
    const Rule* rule = match(name);
    if (rule == nullptr) {
        out = prop;
    } else if (!rule->drop) {
        const std::string new_name = rule->to + std::string(name.substr(rule->from.size()));
        renamed_ = prop->clone(new_name.c_str());
        out = renamed_.get();
    }
    return out != nullptr;
}
