// A property filter: rules, read from a text file, that leave properties out
// or rename them as they pass between the database and another form.
//
// File format, one rule a line; "#" starts a comment that runs to the line's
// end; blank lines and blanks around names and "=" are ignored:
//   NAME        leave the property NAME out
//   NAME=NEW    pass the property NAME under the name NEW
//   PRE*        a name ending in "*" matches every name beginning with PRE
//   PRE*=NEW*   renames by prefix: PRE_x passes as NEW_x
// A rename involving a prefix needs "*" on both sides, so every rule can be
// applied either way round and never gives two properties one name. Names
// are compared exactly (case counts) and hold no blanks, "=" or "#"; "*" only
// ends one. The first rule that matches decides; a property that no rule
// matches passes unchanged.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

class HX_PROPERTY;
class PM_SPEC;

enum Hxb_PropFiltStatus : int {
    HXB_PROPFILT_NOT_READ = 0,
    HXB_PROPFILT_CANNOT_OPEN = 1,  // the file cannot be opened or read
    HXB_PROPFILT_MALFORMED = 2,    // a line is not a rule (reported at error level)
    HXB_PROPFILT_READ = 3,         // read in full
};

class Hxb_PropFilter {
  public:
    /// Which way properties pass. FROM_DATABASE (leaving the database, as when
    /// writing text) matches a rule's left-hand name and passes the property
    /// under the right-hand one; INTO_DATABASE applies rename rules the other
    /// way round, so one file undoes on reading what it did on writing.
    /// Leave-out rules act the same in both directions.
    enum Direction : int {
        INTO_DATABASE = 0,
        FROM_DATABASE = 1,
    };

    /// Reads the rules of `file` and sets `*status` (when given). A filter
    /// whose file was not read in full has no rules and passes everything.
    /// `device`, the device the properties belong to, may be null; the rules do
    /// not depend on it.
    Hxb_PropFilter(const char* file, Hxb_PropFiltStatus* status, PM_SPEC* device,
                   Direction direction);
    ~Hxb_PropFilter();
    Hxb_PropFilter(const Hxb_PropFilter&) = delete;
    Hxb_PropFilter& operator=(const Hxb_PropFilter&) = delete;

    /// Sets `out` to the property to use in place of `prop`: `prop` itself,
    /// a renamed copy, or null when it is left out. Returns `out != null`.
    /// A renamed copy belongs to the filter and stays valid until the next
    /// map_prop call or the filter's end.
    bool map_prop(const HX_PROPERTY* prop, const HX_PROPERTY*& out);

    Hxb_PropFiltStatus status() const { return status_; }
    size_t rule_count() const { return rules_.size(); }

  private:
    struct Rule {
        std::string from;  // the name matched, without "*"
        std::string to;    // new name or prefix, without "*"; empty: leave out
        bool prefix;
        bool drop;
    };

    Hxb_PropFiltStatus read(const char* file);
    bool parse_line(const std::string& line, Rule& rule, bool& is_rule, const char*& reason);
    const Rule* match(std::string_view name) const;

    Direction direction_;
    Hxb_PropFiltStatus status_ = HXB_PROPFILT_NOT_READ;
    std::vector<Rule> rules_;
    std::unique_ptr<HX_PROPERTY> renamed_;
};
