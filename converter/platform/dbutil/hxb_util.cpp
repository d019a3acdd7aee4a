#include "hxb_util.h"

#include <charconv>
#include <cmath>
#include <string_view>
#include <vector>

#include "pm_device.h"
#include "port_msg.h"
#include "ut_str.h"

namespace {

constexpr const char* kModule = "Hxb";
constexpr const char* kRevision = "$Revision: 1.0 $";

enum class NumResult { Ok, Syntax, Range };

// from_chars takes a minus sign but no plus sign; accept either, once.
bool strip_plus(std::string_view& text) {
    const bool plus = !text.empty() && text.front() == '+';
    if (plus) text.remove_prefix(1);
    return !text.empty() && text.front() != '+' && !(plus && text.front() == '-');
}

// Plain decimal with an optional sign; the unset marker is out of range, so a
// parsed number can never read back as "unset".
NumResult parse_int32(std::string_view text, int32_t& out) {
    if (!strip_plus(text)) return NumResult::Syntax;
    int64_t value = 0;
    const auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (ec == std::errc::result_out_of_range) return NumResult::Range;
    if (ec != std::errc() || end != text.data() + text.size()) return NumResult::Syntax;
    if (value <= HX_TIME_UNSET || value > INT32_MAX) return NumResult::Range;
    out = static_cast<int32_t>(value);
    return NumResult::Ok;
}

NumResult parse_double(std::string_view text, double& out) {
    if (!strip_plus(text)) return NumResult::Syntax;
    double value = 0.0;
    const auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (ec == std::errc::result_out_of_range) return NumResult::Range;
    if (ec != std::errc() || end != text.data() + text.size()) return NumResult::Syntax;
    if (!std::isfinite(value)) return NumResult::Syntax;  // "inf", "nan"
    out = value;
    return NumResult::Ok;
}

bool equals_nocase(std::string_view a, std::string_view b) {
    if (a.size() != b.size()) return false;
    for (size_t i = 0; i < a.size(); ++i) {
        const auto lower = [](char c) { return (c >= 'A' && c <= 'Z') ? char(c - 'A' + 'a') : c; };
        if (lower(a[i]) != lower(b[i])) return false;
    }
    return true;
}

constexpr const char* kUnitNames[] = {"ps", "ns", "us"};

bool parse_unit(std::string_view text, int32_t& unit) {
    if (text.empty()) {
        unit = HX_UNIT_NONE;
        return true;
    }
    for (int32_t i = 0; i < 3; ++i) {
        if (equals_nocase(text, kUnitNames[i])) {
            unit = i;
            return true;
        }
    }
    return false;
}

bool is_digit(char c) {
    return c >= '0' && c <= '9';
}

// An optional number; an empty text leaves the field unset.
NumResult parse_time_number(std::string_view text, int32_t& out) {
    if (text.empty()) return NumResult::Ok;
    return parse_int32(text, out);
}

// MIN:MAXUNIT
NumResult parse_timing(std::string_view text, HX_PROP_TIMING_DATA& record) {
    const size_t colon = text.find(':');
    if (colon == std::string_view::npos) return NumResult::Syntax;
    const std::string_view min_text = text.substr(0, colon);
    std::string_view rest = text.substr(colon + 1);
    size_t digits = 0;
    if (digits < rest.size() && (rest[digits] == '-' || rest[digits] == '+')) ++digits;
    while (digits < rest.size() && is_digit(rest[digits]))
        ++digits;
    const std::string_view max_text = rest.substr(0, digits);
    HX_PROP_TIMING_DATA parsed;
    if (!parse_unit(rest.substr(digits), parsed.unit)) return NumResult::Syntax;
    const NumResult min_result = parse_time_number(min_text, parsed.min);
    if (min_result != NumResult::Ok) return min_result;
    const NumResult max_result = parse_time_number(max_text, parsed.max);
    if (max_result != NumResult::Ok) return max_result;
    record = parsed;
    return NumResult::Ok;
}

std::vector<std::string_view> split_commas(std::string_view text) {
    std::vector<std::string_view> fields;
    size_t start = 0;
    for (;;) {
        const size_t comma = text.find(',', start);
        fields.push_back(text.substr(start, comma - start));
        if (comma == std::string_view::npos) return fields;
        start = comma + 1;
    }
}

// The fields after the pin name: [R|F][,TIMING][,INV], each optional, in this order.
NumResult parse_pinref_tail(const std::vector<std::string_view>& fields,
                            HX_PROP_PINREF_DATA& record) {
    size_t i = 1;
    if (i < fields.size() && (equals_nocase(fields[i], "R") || equals_nocase(fields[i], "F"))) {
        record.edge = equals_nocase(fields[i], "R") ? HX_EDGE_RISING : HX_EDGE_FALLING;
        ++i;
    }
    if (i < fields.size() && fields[i].find(':') != std::string_view::npos) {
        HX_PROP_TIMING_DATA timing;
        const NumResult result = parse_timing(fields[i], timing);
        if (result != NumResult::Ok) return result;
        record.min = timing.min;
        record.max = timing.max;
        record.unit = timing.unit;
        ++i;
    }
    if (i < fields.size() && equals_nocase(fields[i], "INV")) {
        record.inverted = 1;
        ++i;
    }
    return i == fields.size() ? NumResult::Ok : NumResult::Syntax;
}

std::string bad_value(const char* name, const char* value, NumResult result, const char* form) {
    if (result == NumResult::Range)
        return UT_STR::Format("property %s: '%s' is out of range", name, value);
    return UT_STR::Format("property %s: '%s' is not %s", name, value, form);
}

std::unique_ptr<HX_PROPERTY> parse_int_prop(const char* name, const char* value,
                                            std::string& message) {
    int32_t number = 0;
    const NumResult result = parse_int32(value, number);
    if (result == NumResult::Ok) return HX_PROPERTY::make_int(name, number);
    message = bad_value(name, value, result, "an integer");
    return nullptr;
}

std::unique_ptr<HX_PROPERTY> parse_float_prop(const char* name, const char* value,
                                              std::string& message) {
    double number = 0.0;
    const NumResult result = parse_double(value, number);
    if (result == NumResult::Ok) return HX_PROPERTY::make_float(name, number);
    message = bad_value(name, value, result, "a number");
    return nullptr;
}

std::unique_ptr<HX_PROPERTY> parse_timing_prop(const char* name, const char* value,
                                               std::string& message) {
    HX_PROP_TIMING_DATA record;
    const NumResult result = parse_timing(value, record);
    if (result == NumResult::Ok) return HX_PROPERTY::make_timing(name, record);
    message = bad_value(name, value, result, "a timing of the form MIN:MAXUNIT");
    return nullptr;
}

std::unique_ptr<HX_PROPERTY> parse_pinref_prop(const char* name, const char* value,
                                               std::string& message, const HX_BLOCK* block) {
    const std::vector<std::string_view> fields = split_commas(value);
    HX_PROP_PINREF_DATA record;
    NumResult result = fields[0].empty() ? NumResult::Syntax : parse_pinref_tail(fields, record);
    if (result != NumResult::Ok) {
        message = bad_value(name, value, result,
                            "a pin reference of the form PIN[,R|F][,MIN:MAXUNIT][,INV]");
        return nullptr;
    }
    const std::string pin_name(fields[0]);
    if (block == nullptr) {
        message =
            UT_STR::Format("property %s: pin '%s' named outside a block", name, pin_name.c_str());
        return nullptr;
    }
    record.pin = Hxb_Util::find_pin(block, pin_name.c_str(), 0);
    if (record.pin == HX_NO_INDEX) {
        const char* block_name = block->get_name();
        message = UT_STR::Format("property %s: no pin '%s' on block '%s'", name, pin_name.c_str(),
                                 block_name ? block_name : "");
        return nullptr;
    }
    return HX_PROPERTY::make_pinref(name, record);
}

std::unique_ptr<HX_PROPERTY> parse_flag_prop(const char* name, const char* value,
                                             std::string& message) {
    if (*value != '\0')
        message = UT_STR::Format("property %s is a flag: value '%s' ignored", name, value);
    return HX_PROPERTY::make_flag(name);
}

std::unique_ptr<HX_PROPERTY> parse_predefined(const char* name, HX_PROP_TYPE kind,
                                              const char* value, std::string& message,
                                              const HX_BLOCK* block) {
    switch (kind) {
        case HX_PROP_FLAG:
            return parse_flag_prop(name, value, message);
        case HX_PROP_INT:
            return parse_int_prop(name, value, message);
        case HX_PROP_FLOAT:
            return parse_float_prop(name, value, message);
        case HX_PROP_TIMING:
            return parse_timing_prop(name, value, message);
        case HX_PROP_PINREF:
            return parse_pinref_prop(name, value, message, block);
        case HX_PROP_STRING:
        case HX_PROP_PARAM:
        case HX_PROP_TIMINGSTR:
            return HX_PROPERTY::make_text(name, kind, value);
        case HX_PROP_OBJECT:
            break;
    }
    message = UT_STR::Format("property %s: a value of this kind cannot be given as text", name);
    return nullptr;
}

std::unique_ptr<HX_PROPERTY> parse_free(const char* name, const char* value) {
    if (*value == '\0') return HX_PROPERTY::make_flag(name);
    if (*value == '@') return HX_PROPERTY::make_text(name, HX_PROP_PARAM, value + 1);
    return HX_PROPERTY::make_text(name, HX_PROP_STRING, value);
}

}  // namespace

std::unique_ptr<HX_PROPERTY> Hxb_Util::parse_prop(const char* name, const char* value,
                                                  std::string& message, HX_BLOCK* block) {
    if (name == nullptr || *name == '\0') {
        message = "property without a name";
        return nullptr;
    }
    if (value == nullptr) value = "";
    HX_PROP_TYPE kind = HX_PROP_STRING;
    if (HX_PROPERTY::get_type(name, kind))
        return parse_predefined(name, kind, value, message, block);
    return parse_free(name, value);
}

uint16_t Hxb_Util::find_pin(const HX_BLOCK* block, const char* name, uint8_t ignore_case) {
    if (block == nullptr || name == nullptr) return HX_NO_INDEX;
    return block->find_pin(name, ignore_case);
}

HX_SIGNAL* Hxb_Util::find_global_sig(const HX_DESIGN* design, const char* name) {
    if (design == nullptr || name == nullptr) return nullptr;
    return design->find_global_signal(name);
}

const char* Hxb_Util::get_string_prop(const HX_OBJECT* object, const char* name) {
    if (object == nullptr || name == nullptr) return nullptr;
    const HX_PROPERTY* prop = object->find_prop(name);
    if (prop == nullptr || prop->get_kind() != HX_PROP_STRING) return nullptr;
    return prop->get_text();
}

bool Hxb_Util::set_physical_prop(HX_BLOCK* block, const PM_PIC* pic) {
    if (block == nullptr || pic == nullptr || block->is_physical()) return false;
    return block->create_prop("PHYSICAL", pic->get_device(), 1) != nullptr;
}

namespace {

std::string pin_label(uint16_t index, const HX_BLOCK* block) {
    const HX_PIN* pin = block ? block->get_pin(index) : nullptr;
    if (pin != nullptr && pin->get_name() != nullptr && *pin->get_name() != '\0')
        return pin->get_name();
    if (pin == nullptr) {
        const char* block_name = block ? block->get_name() : nullptr;
        PORT_MSG(kModule, kRevision)
            .issueWarning("pin reference to pin %u, which block '%s' does not have",
                          unsigned(index), block_name ? block_name : "");
    }
    return UT_STR::Format("**UNDEFINED.%u**", unsigned(index));
}

bool timing_is_set(const HX_PROP_PINREF_DATA& record) {
    return record.min != HX_TIME_UNSET || record.max != HX_TIME_UNSET ||
           record.unit != HX_UNIT_NONE;
}

}  // namespace

std::string Hxb_Util::form_pinref(const HX_PROP_PINREF_DATA& record, const HX_BLOCK* block) {
    std::string text = pin_label(record.pin, block);
    if (record.edge == HX_EDGE_RISING) text += ",R";
    if (record.edge == HX_EDGE_FALLING) text += ",F";
    if (timing_is_set(record)) {
        text += ',';
        text += form_timing({record.min, record.max, record.unit});
    }
    if (record.inverted != 0) text += ",INV";
    return text;
}

std::string Hxb_Util::form_timing(const HX_PROP_TIMING_DATA& record) {
    std::string text;
    if (record.min != HX_TIME_UNSET) text += std::to_string(record.min);
    text += ':';
    if (record.max != HX_TIME_UNSET) text += std::to_string(record.max);
    if (record.unit >= 0 && record.unit < 3) text += kUnitNames[record.unit];
    return text;
}

std::string Hxb_Util::form_timingstr(const HX_PROPERTY* prop) {
    const char* text = prop ? prop->get_text() : nullptr;
    return text ? text : "";
}
