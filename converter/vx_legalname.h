// The text that stands for a name in a written netlist (what vrx_legal gives).
//
// The writer names millions of pins and signals; most names go out exactly as
// the database holds them. A token therefore refers to the database's text
// when it can and keeps a text of its own only when it had to change it
// (quotes, an invented OBJ_$ name). The caller owns the token; the text it
// refers to must outlive it, which holds for every database name while the
// writer runs.
#pragma once

#include <string>
#include <string_view>

class VX_LEGALNAME {
  public:
    VX_LEGALNAME() = default;
    /// A token that is the given text unchanged (not copied).
    static VX_LEGALNAME refer(std::string_view text) {
        VX_LEGALNAME t;
        t.ref_ = text;
        return t;
    }
    /// A token with a text of its own.
    static VX_LEGALNAME own(std::string text) {
        VX_LEGALNAME t;
        t.text_ = std::move(text);
        t.owned_ = true;
        return t;
    }

    /// Makes the token independent of the text it refers to, for texts that
    /// are overwritten before the token's last use (hierarchical names).
    VX_LEGALNAME& keep() {
        if (!owned_) {
            text_ = ref_;
            owned_ = true;
        }
        return *this;
    }

    /// The text, NUL-terminated.
    const char* c_str() const { return owned_ ? text_.c_str() : ref_.data(); }
    std::string_view view() const { return owned_ ? std::string_view(text_) : ref_; }

  private:
    std::string_view ref_ = "";  // NUL-terminated: a database name or a literal
    std::string text_;
    bool owned_ = false;
};
