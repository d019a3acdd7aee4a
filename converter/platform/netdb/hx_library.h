// Libraries of designs and the database environment that owns them.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "hx_design.h"
#include "hx_property.h"
#include "ut_blist_iter.h"
#include "ut_ptrfile.h"

/// A library's link to one of its designs, in creation order.
class HX_LIBLINK {
  public:
    explicit HX_LIBLINK(HX_DESIGN* design) : design_(design) {}
    HX_DESIGN* get_design() const { return design_; }

  private:
    HX_DESIGN* design_;
};

/// A named set of designs. Design names and aliases are found by key,
/// ignoring ASCII case unless the library's case-sense flag is set.
class HX_LIBRARY : public HX_OBJECT {
  public:
    HX_LIBRARY(const char* name, uint8_t casesense);
    ~HX_LIBRARY();
    HX_LIBRARY(const HX_LIBRARY&) = delete;
    HX_LIBRARY& operator=(const HX_LIBRARY&) = delete;

    const char* get_name() const { return name_ ? name_->c_str() : nullptr; }
    void set_name(const char* name);
    uint8_t get_casesense() const { return casesense_; }
    /// Changing the flag re-keys the names; false (flag unchanged) when
    /// case-folding would make two names of the library equal.
    bool set_casesense(uint8_t value);

    /// A new design; null when the name (or an alias) is taken.
    HX_DESIGN* create_design(const char* name);
    /// The design with that name or alias, or null.
    HX_DESIGN* find_design(const char* name) const;
    /// Gives the design called `name` the second name `alias`; false when the
    /// name is unknown or the alias is taken.
    bool alias_design(const char* name, const char* alias);
    /// Aliases in the order made, as (alias, design) pairs.
    const std::vector<std::pair<std::string, HX_DESIGN*>>& aliases() const { return aliases_; }
    size_t design_count() const { return links_.size(); }

    UT_BLIST_ITER<HX_LIBLINK>* create_liblink_iter() const;
    void delete_liblink_iter(UT_BLIST_ITER<HX_LIBLINK>* iter) const { delete iter; }

  private:
    std::string key_of(const char* name) const;
    bool rekey(uint8_t casesense);

    std::unique_ptr<std::string> name_;
    uint8_t casesense_;
    std::vector<HX_LIBLINK*> links_;
    std::vector<std::pair<std::string, HX_DESIGN*>> aliases_;
    std::unordered_map<std::string, HX_DESIGN*> by_key_;
};

/// The database environment: owns every library, and every design read from
/// a file. Files it reads or writes are refused or written whole; see
/// hx_file.h for the format.
class HX_ENVIRONMENT {
  public:
    HX_ENVIRONMENT() = default;
    ~HX_ENVIRONMENT();
    HX_ENVIRONMENT(const HX_ENVIRONMENT&) = delete;
    HX_ENVIRONMENT& operator=(const HX_ENVIRONMENT&) = delete;

    /// A new, empty library.
    HX_LIBRARY* create_library(const char* name, uint8_t casesense);
    /// Frees a library and its designs.
    void delete_library(HX_LIBRARY* library);

    /// The kind of the open file, or HX_FILE_UNKNOWN when it is not a
    /// database file. Reads the header only; the file is left at its start.
    HX_FILE_TYPE get_file_type(UT_PTRFILE* file);
    /// Reads a design file. The design sits in a library of its own, named
    /// after the design, that the environment owns. Null when the file is
    /// refused, with an error message naming the file and the reason unless
    /// `quiet` is set.
    HX_DESIGN* create_design(UT_PTRFILE* file, uint8_t quiet);
    /// Reads a library file; null with an error message when refused.
    HX_LIBRARY* create_library(UT_PTRFILE* file);
    /// Write a design or library file; false (with an error message) when
    /// the file cannot be written.
    bool write_design(UT_PTRFILE* file, HX_DESIGN* design);
    bool write_library(UT_PTRFILE* file, HX_LIBRARY* library);

    size_t library_count() const { return libraries_.size(); }

  private:
    HX_LIBRARY* adopt(std::unique_ptr<HX_LIBRARY> library);
    std::vector<HX_LIBRARY*> libraries_;
};

/// The process-wide database environment.
extern HX_ENVIRONMENT hx_env;
