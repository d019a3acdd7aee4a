#include "design_compare.h"

#include <algorithm>
#include <cstring>
#include <unordered_map>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"

namespace vrx_test {
namespace {

std::string quoted(const char* text) {
    return text == nullptr ? std::string("(absent)") : '"' + std::string(text) + '"';
}

template <class T, class Iter>
std::vector<T*> drain(Iter* iter) {
    std::vector<T*> out;
    if (iter == nullptr) return out;
    while (T* item = iter->l_next())
        out.push_back(item);
    return out;
}

/// Every object of one side, numbered in the database's orders, with a
/// position-based label used to compare pointers across the two sides.
class Index {
  public:
    struct DesignIndex {
        const HX_DESIGN* design = nullptr;
        std::vector<HX_BLOCK*> blocks;
        std::vector<HX_SIGNAL*> signals;
        std::vector<HX_NETWORK*> networks;
        std::vector<HX_MAPSIGNAL*> maps;
    };

    explicit Index(bool structural) : structural_(structural) {}

    void add_library(const HX_LIBRARY& library) { labels_[&library] = "library"; }

    void add_design(const HX_DESIGN& design, const std::string& prefix) {
        if (structural_) return add_design_by_place(design, prefix);
        DesignIndex& d = designs_.emplace_back();
        d.design = &design;
        labels_[&design] = prefix + "design";
        auto* blocks = design.create_block_iter();
        d.blocks = drain<HX_BLOCK>(blocks);
        design.delete_block_iter(blocks);
        auto* globals = design.create_global_iter();
        d.signals = drain<HX_SIGNAL>(globals);
        design.delete_global_iter(globals);
        for (const HX_BLOCK* block : d.blocks) {
            auto* iter = block->create_signal_iter();
            for (HX_SIGNAL* s : drain<HX_SIGNAL>(iter))
                d.signals.push_back(s);
            block->delete_signal_iter(iter);
        }
        auto* nets = design.create_network_iter();
        d.networks = drain<HX_NETWORK>(nets);
        design.delete_network_iter(nets);
        auto* maps = design.create_mapsignal_iter();
        d.maps = drain<HX_MAPSIGNAL>(maps);
        design.delete_mapsignal_iter(maps);
        label_all(d, prefix);
    }

    std::string label(const void* object) const {
        if (object == nullptr) return "null";
        auto it = labels_.find(object);
        return it == labels_.end() ? "an object outside the compared set" : it->second;
    }

    const DesignIndex& design(size_t i) const { return designs_[i]; }
    size_t design_count() const { return designs_.size(); }

  private:
    /// Labels from places and names, each list in label order.
    void add_design_by_place(const HX_DESIGN& design, const std::string& prefix) {
        DesignIndex& d = designs_.emplace_back();
        d.design = &design;
        labels_[&design] = prefix + "design";
        add_tree(d, design.get_log_root(), prefix + "logical root");
        add_tree(d, design.get_phys_root(), prefix + "physical root");
        auto* globals = design.create_global_iter();
        label_named(drain<HX_SIGNAL>(globals), prefix + "global ", d.signals);
        design.delete_global_iter(globals);
        for (const HX_BLOCK* block : d.blocks) {
            auto* iter = block->create_signal_iter();
            label_named(drain<HX_SIGNAL>(iter), labels_[block] + " signal ", d.signals);
            block->delete_signal_iter(iter);
        }
        auto* nets = design.create_network_iter();
        for (HX_NETWORK* net : drain<HX_NETWORK>(nets))
            labels_[net] = "network of " + first_member(*net);
        design.delete_network_iter(nets);
        auto* maps = design.create_mapsignal_iter();
        for (HX_MAPSIGNAL* map : drain<HX_MAPSIGNAL>(maps)) {
            labels_[map] = label(map->get_block()) + " map signal on pin " +
                           std::to_string(map->get_pin_index());
            d.maps.push_back(map);
        }
        design.delete_mapsignal_iter(maps);
        nets = design.create_network_iter();
        d.networks = drain<HX_NETWORK>(nets);
        design.delete_network_iter(nets);
        sort_by_label(d.networks);
        sort_by_label(d.maps);
    }

    /// The least label of a network's signals: which of several signals
    /// equally high is the highest follows the order of creation.
    std::string first_member(const HX_NETWORK& net) const {
        std::string least;
        auto* iter = net.create_signal_iter();
        while (HX_SIGNAL* s = iter->l_next()) {
            const std::string text = label(s);
            if (least.empty() || text < least) least = text;
        }
        net.delete_signal_iter(iter);
        return least;
    }

    /// A block and its subtree, depth first, labelled by child positions.
    void add_tree(DesignIndex& d, const HX_BLOCK* block, const std::string& path) {
        if (block == nullptr) return;
        d.blocks.push_back(const_cast<HX_BLOCK*>(block));
        labels_[block] = path;
        for (uint16_t p = 0; p < block->get_pin_count(); ++p)
            labels_[block->get_pin(p)] = path + " pin " + std::to_string(p);
        auto* children = block->create_child_iter();
        size_t position = 0;
        for (HX_BLOCK* child : drain<HX_BLOCK>(children))
            add_tree(d, child, path + "/" + std::to_string(position++));
        block->delete_child_iter(children);
    }

    /// Signals labelled by name, in name order; a repeated name gets the
    /// number of its occurrence.
    void label_named(std::vector<HX_SIGNAL*> list, const std::string& stem,
                     std::vector<HX_SIGNAL*>& out) {
        std::stable_sort(list.begin(), list.end(), [](const HX_SIGNAL* x, const HX_SIGNAL* y) {
            return quoted(x->get_name()) < quoted(y->get_name());
        });
        std::unordered_map<std::string, int> seen;
        for (HX_SIGNAL* signal : list) {
            const std::string name = quoted(signal->get_name());
            const int count = seen[name]++;
            labels_[signal] = stem + name + (count ? "#" + std::to_string(count) : "");
            out.push_back(signal);
        }
    }

    template <class T>
    void sort_by_label(std::vector<T*>& list) const {
        std::stable_sort(list.begin(), list.end(),
                         [this](const T* x, const T* y) { return label(x) < label(y); });
    }

    void label_all(const DesignIndex& d, const std::string& prefix) {
        for (size_t i = 0; i < d.blocks.size(); ++i) {
            const std::string block = prefix + "block " + std::to_string(i);
            labels_[d.blocks[i]] = block;
            for (uint16_t p = 0; p < d.blocks[i]->get_pin_count(); ++p) {
                labels_[d.blocks[i]->get_pin(p)] = block + " pin " + std::to_string(p);
            }
        }
        label_list(d.signals, prefix + "signal ");
        label_list(d.networks, prefix + "network ");
        label_list(d.maps, prefix + "map signal ");
    }

    template <class T>
    void label_list(const std::vector<T*>& list, const std::string& stem) {
        for (size_t i = 0; i < list.size(); ++i)
            labels_[list[i]] = stem + std::to_string(i);
    }

    bool structural_;
    std::vector<DesignIndex> designs_;
    std::unordered_map<const void*, std::string> labels_;
};

class Comparer {
  public:
    explicit Comparer(const CompareOptions& options)
        : options_(options), ia_(options.structural), ib_(options.structural) {}

    std::string run_designs(const HX_DESIGN& a, const HX_DESIGN& b) {
        if (a.get_library() != nullptr) ia_.add_library(*a.get_library());
        if (b.get_library() != nullptr) ib_.add_library(*b.get_library());
        ia_.add_design(a, "");
        ib_.add_design(b, "");
        design(0, "design");
        return diff_;
    }

    std::string run_libraries(const HX_LIBRARY& a, const HX_LIBRARY& b) {
        ia_.add_library(a);
        ib_.add_library(b);
        const auto da = designs_of(a);
        const auto db = options_.extra_designs ? same_named(da, b) : designs_of(b);
        if (!same("library", "name", quoted(a.get_name()), quoted(b.get_name())) ||
            !same("library", "case sense", a.get_casesense(), b.get_casesense()) ||
            !same("library", "design count", da.size(), db.size()))
            return diff_;
        if (options_.extra_designs && !same("library", "designs", names(da), names(db)))
            return diff_;
        for (size_t i = 0; i < da.size(); ++i) {
            ia_.add_design(*da[i], "design " + std::to_string(i) + " ");
            ib_.add_design(*db[i], "design " + std::to_string(i) + " ");
        }
        if (!props(a, b, "library")) return diff_;
        for (size_t i = 0; i < da.size() && diff_.empty(); ++i) {
            design(i, "design " + std::to_string(i) + " (" + quoted(da[i]->get_name()) + ")");
        }
        if (diff_.empty()) aliases(a, b);
        return diff_;
    }

  private:
    using DesignIndex = Index::DesignIndex;

    /// The designs of `library` named like those of `list`, in that order;
    /// missing ones are left out.
    static std::vector<HX_DESIGN*> same_named(const std::vector<HX_DESIGN*>& list,
                                              const HX_LIBRARY& library) {
        std::vector<HX_DESIGN*> out;
        for (const HX_DESIGN* design : list) {
            for (HX_DESIGN* candidate : designs_of(library)) {
                if (quoted(candidate->get_name()) == quoted(design->get_name())) {
                    out.push_back(candidate);
                    break;
                }
            }
        }
        return out;
    }

    static std::string names(const std::vector<HX_DESIGN*>& list) {
        std::string out;
        for (const HX_DESIGN* design : list)
            out += quoted(design->get_name()) + ",";
        return out;
    }

    static std::vector<HX_DESIGN*> designs_of(const HX_LIBRARY& library) {
        std::vector<HX_DESIGN*> out;
        auto* iter = library.create_liblink_iter();
        while (HX_LIBLINK* link = iter->l_next())
            out.push_back(link->get_design());
        library.delete_liblink_iter(iter);
        return out;
    }

    template <class T>
    bool same(const std::string& where, const char* what, const T& a, const T& b) {
        if (a == b) return true;
        if constexpr (std::is_same_v<T, std::string>) {
            diff_ = where + ": " + what + " " + a + " vs " + b;
        } else {
            diff_ = where + ": " + what + " " + std::to_string(a) + " vs " + std::to_string(b);
        }
        return false;
    }
    bool same_label(const std::string& where, const char* what, const void* a, const void* b) {
        return same(where, what, ia_.label(a), ib_.label(b));
    }

    void design(size_t i, const std::string& where) {
        const DesignIndex& a = ia_.design(i);
        const DesignIndex& b = ib_.design(i);
        if (!same(where, "name", quoted(a.design->get_name()), quoted(b.design->get_name())) ||
            !props(*a.design, *b.design, where) ||
            !same_label(where, "logical root", a.design->get_log_root(),
                        b.design->get_log_root()) ||
            !same_label(where, "physical root", a.design->get_phys_root(),
                        b.design->get_phys_root()) ||
            !same(where, "block count", a.blocks.size(), b.blocks.size()) ||
            !same(where, "signal count", a.signals.size(), b.signals.size()) ||
            !same(where, "global count", a.design->global_count(), b.design->global_count()) ||
            !same(where, "network count", a.networks.size(), b.networks.size()) ||
            !same(where, "map signal count", a.maps.size(), b.maps.size()))
            return;
        for (size_t k = 0; k < a.blocks.size() && diff_.empty(); ++k) {
            block(*a.blocks[k], *b.blocks[k], where + " block " + std::to_string(k));
        }
        for (size_t k = 0; k < a.signals.size() && diff_.empty(); ++k) {
            signal(*a.signals[k], *b.signals[k], where + " signal " + std::to_string(k));
        }
        for (size_t k = 0; k < a.networks.size() && diff_.empty(); ++k) {
            network(*a.networks[k], *b.networks[k], where + " network " + std::to_string(k));
        }
        for (size_t k = 0; k < a.maps.size() && diff_.empty(); ++k) {
            map_signal(*a.maps[k], *b.maps[k], where + " map signal " + std::to_string(k));
        }
    }

    void block(const HX_BLOCK& a, const HX_BLOCK& b, std::string where) {
        where += " (" + quoted(a.get_name()) + ")";
        if (!same(where, "name", quoted(a.get_name()), quoted(b.get_name())) ||
            !same(where, "kind flags", a.get_flags(), b.get_flags()) ||
            !same(where, "user flag", a.get_user(), b.get_user()) ||
            !same_label(where, "parent", a.get_parent(), b.get_parent()) ||
            !same_label(where, "physical parent", a.get_phys_parent(), b.get_phys_parent()) ||
            !same(where, "pin count", a.get_pin_count(), b.get_pin_count()) ||
            !primitive(a, b, where) || !props(a, b, where))
            return;
        if (!same(where, "children", labels(a.create_child_iter(), ia_),
                  labels(b.create_child_iter(), ib_)) ||
            !same(where, "signals", labels(a.create_signal_iter(), ia_, set_order()),
                  labels(b.create_signal_iter(), ib_, set_order())))
            return;
        if (a.is_physical()) {
            const auto& pa = static_cast<const HX_BASEPHYSBLOCK&>(a);
            const auto& pb = static_cast<const HX_BASEPHYSBLOCK&>(b);
            if (!same(where, "logical children",
                      labels(pa.create_log_child_iter(), ia_, set_order()),
                      labels(pb.create_log_child_iter(), ib_, set_order())))
                return;
        }
        for (uint16_t i = 0; i < a.get_pin_count() && diff_.empty(); ++i) {
            pin(*a.get_pin(i), *b.get_pin(i), where + " pin " + std::to_string(i));
        }
    }

    bool primitive(const HX_BLOCK& a, const HX_BLOCK& b, const std::string& where) {
        const HX_PRIMITIVE* pa = a.get_primitive();
        const HX_PRIMITIVE* pb = b.get_primitive();
        if (pa == nullptr || pb == nullptr) return true;
        return same(where, "primitive type", pa->get_type(), pb->get_type()) &&
               same(where, "width", pa->get_width(), pb->get_width());
    }

    /// Whether lists in creation order are compared as sets.
    bool set_order() const { return options_.structural; }

    /// Labels joined, sorted first when `as_set`.
    static std::string joined_labels(std::vector<std::string> list, bool as_set) {
        if (as_set) std::sort(list.begin(), list.end());
        std::string out = "[";
        for (const std::string& item : list)
            out += item + ",";
        return out + "]";
    }

    /// Labels of the items an iterator gives, joined; releases the iterator.
    template <class Iter>
    static std::string labels(Iter* iter, const Index& index, bool as_set = false) {
        std::vector<std::string> list;
        while (auto* item = iter->l_next())
            list.push_back(index.label(item));
        delete iter;
        return joined_labels(std::move(list), as_set);
    }

    void pin(const HX_PIN& a, const HX_PIN& b, const std::string& where) {
        if (!same(where, "name", quoted(a.get_name()), quoted(b.get_name())) ||
            !same(where, "direction", a.get_dir(), b.get_dir()) ||
            !same(where, "map inversion", a.get_mapinv(), b.get_mapinv()) ||
            !same(where, "role", a.get_role(), b.get_role()) ||
            !same(where, "inversion", a.get_inverted(), b.get_inverted()) ||
            !same_label(where, "outer signal", a.get_outer_signal(), b.get_outer_signal()) ||
            !same_label(where, "inner signal", a.get_inner_signal(), b.get_inner_signal()) ||
            !same_label(where, "map signal", a.get_map_signal(), b.get_map_signal()))
            return;
        props(a, b, where);
    }

    template <class Owner>
    std::string conns(const Owner& owner, const Index& index) {
        std::vector<std::string> list;
        auto* iter = owner.create_conn_iter();
        while (HX_CONN* conn = iter->l_next())
            list.push_back(index.label(conn->get_pin()));
        owner.delete_conn_iter(iter);
        return joined_labels(std::move(list), set_order());
    }

    void signal(const HX_SIGNAL& a, const HX_SIGNAL& b, const std::string& where) {
        if (!same(where, "name", quoted(a.get_name()), quoted(b.get_name())) ||
            !same(where, "global", a.is_global(), b.is_global()) ||
            !same_label(where, "block", a.get_block(), b.get_block()) ||
            !same_label(where, "network", a.get_network(), b.get_network()) ||
            !same(where, "connections", conns(a, ia_), conns(b, ib_)))
            return;
        props(a, b, where);
    }

    static std::vector<std::string> members(const HX_NETWORK& net, const Index& index) {
        std::vector<std::string> out;
        auto* iter = net.create_signal_iter();
        while (HX_SIGNAL* s = iter->l_next())
            out.push_back(index.label(s));
        net.delete_signal_iter(iter);
        std::sort(out.begin(), out.end());
        return out;
    }

    static std::string joined(const std::vector<std::string>& list) {
        std::string out;
        for (const std::string& item : list)
            out += item + ",";
        return out;
    }

    void network(const HX_NETWORK& a, const HX_NETWORK& b, const std::string& where) {
        const HX_DESIGN* db =
            b.get_highest_signal() ? b.get_highest_signal()->get_design() : nullptr;
        if ((!options_.structural && !same(where, "tag", a.get_tag(), b.get_tag())) ||
            !highest_signal(a, b, where) ||
            !same(where, "members", joined(members(a, ia_)), joined(members(b, ib_))) ||
            !same(where, "network found by tag", ib_.label(&b),
                  ib_.label(hx_find_net_tag(db, b.get_tag()))))
            return;
        props(a, b, where);
    }

    /// The highest signal and the name it gives the network. By place, of
    /// several signals equally high the first made is the highest: then the
    /// two need only be equally high, and the names differ with them.
    bool highest_signal(const HX_NETWORK& a, const HX_NETWORK& b, const std::string& where) {
        const HX_SIGNAL* ha = a.get_highest_signal();
        const HX_SIGNAL* hb = b.get_highest_signal();
        if (options_.structural && ia_.label(ha) != ib_.label(hb))
            return same(where, "highest signal's level", level(ha), level(hb));
        return same_label(where, "highest signal", ha, hb) &&
               same(where, "name", quoted(a.get_name()), quoted(b.get_name()));
    }

    static long level(const HX_SIGNAL* signal) {
        if (signal == nullptr) return -2;
        const HX_BLOCK* block = signal->get_block();
        return block == nullptr ? -1 : long(block->get_depth());
    }

    void map_signal(const HX_MAPSIGNAL& a, const HX_MAPSIGNAL& b, const std::string& where) {
        if (!same(where, "name", quoted(a.get_name()), quoted(b.get_name())) ||
            !same_label(where, "block", a.get_block(), b.get_block()) ||
            !same(where, "pin", a.get_pin_index(), b.get_pin_index()) ||
            !same(where, "connections", conns(a, ia_), conns(b, ib_)))
            return;
        props(a, b, where);
    }

    void aliases(const HX_LIBRARY& a, const HX_LIBRARY& b) {
        const auto& la = a.aliases();
        const auto& lb = b.aliases();
        if (!same("library", "alias count", la.size(), lb.size())) return;
        for (size_t i = 0; i < la.size(); ++i) {
            const std::string where = "library alias " + std::to_string(i);
            if (!same(where, "text", la[i].first, lb[i].first) ||
                !same_label(where, "design", la[i].second, lb[i].second) ||
                !same_label(where, "design found", la[i].second,
                            b.find_design(lb[i].first.c_str())))
                return;
        }
    }

    static std::vector<HX_PROPERTY*> prop_list(const HX_OBJECT& object) {
        auto* iter = object.create_prop_iter();
        auto out = drain<HX_PROPERTY>(iter);
        object.delete_prop_iter(iter);
        return out;
    }

    bool props(const HX_OBJECT& a, const HX_OBJECT& b, const std::string& where) {
        const auto pa = prop_list(a);
        const auto pb = prop_list(b);
        if (!same(where, "property count", pa.size(), pb.size())) return false;
        for (size_t i = 0; i < pa.size(); ++i) {
            if (!prop(*pa[i], *pb[i], where + " property " + std::to_string(i))) return false;
        }
        return true;
    }

    bool prop(const HX_PROPERTY& a, const HX_PROPERTY& b, std::string where) {
        where += " (" + std::string(a.get_name()) + ")";
        if (!same(where, "name", std::string(a.get_name()), std::string(b.get_name())) ||
            !same(where, "kind", int{a.get_kind()}, int{b.get_kind()}))
            return false;
        return same(where, "value", value(a, ia_), value(b, ib_));
    }

    static std::string value(const HX_PROPERTY& p, const Index& index) {
        HX_PROP_PINREF_DATA r;
        HX_PROP_TIMING_DATA t;
        switch (p.get_kind()) {
            case HX_PROP_INT:
                return std::to_string(p.get_int());
            case HX_PROP_FLOAT: {
                const double f = p.get_float();
                uint64_t bits;
                std::memcpy(&bits, &f, sizeof bits);
                return std::to_string(f) + "/" + std::to_string(bits);
            }
            case HX_PROP_STRING:
            case HX_PROP_PARAM:
            case HX_PROP_TIMINGSTR:
                return quoted(p.get_text());
            case HX_PROP_OBJECT:
                return index.label(p.get_object());
            case HX_PROP_TIMING:
                p.get_timing(t);
                return std::to_string(t.min) + ":" + std::to_string(t.max) + "/" +
                       std::to_string(t.unit);
            case HX_PROP_PINREF:
                p.get_pinref(r);
                return std::to_string(r.min) + ":" + std::to_string(r.max) + "/" +
                       std::to_string(r.unit) + " pin " + std::to_string(r.pin) + " edge " +
                       std::to_string(r.edge) + " inv " + std::to_string(r.inverted);
            default:
                return "flag";
        }
    }

    CompareOptions options_;
    Index ia_, ib_;
    std::string diff_;
};

}  // namespace

std::string compare_designs(const HX_DESIGN& a, const HX_DESIGN& b, const CompareOptions& options) {
    return Comparer(options).run_designs(a, b);
}

std::string compare_libraries(const HX_LIBRARY& a, const HX_LIBRARY& b,
                              const CompareOptions& options) {
    return Comparer(options).run_libraries(a, b);
}

}  // namespace vrx_test
