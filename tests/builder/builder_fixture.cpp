#include "builder_fixture.h"

namespace builder_test {

std::string E(int line, const std::string& text) {
    return "E Line number " + std::to_string(line) + ": " + text + "\n";
}

std::string W(int line, const std::string& text) {
    return "W Line number " + std::to_string(line) + ": " + text + "\n";
}

HX_DESIGN* design_named(HX_LIBRARY* library, const char* name) {
    HX_DESIGN* found = library ? library->find_design(name) : nullptr;
    EXPECT_NE(found, nullptr) << name;
    return found;
}

HX_BLOCK* block_named(HX_DESIGN* design, const std::string& hiername, bool physical) {
    HX_BLOCK* found = nullptr;
    UT_BLIST_ITER<HX_BLOCK>* blocks = design->create_block_iter();
    while (HX_BLOCK* block = blocks->l_next()) {
        if (block->is_physical() == physical && hiername == block->get_hiername()) {
            found = block;
            break;
        }
    }
    design->delete_block_iter(blocks);
    EXPECT_NE(found, nullptr) << hiername;
    return found;
}

HX_BLOCK* child(const HX_BLOCK* parent, size_t index) {
    HX_BLOCK* found = nullptr;
    UT_BLIST_ITER<HX_BLOCK>* children = parent->create_child_iter();
    for (size_t i = 0; i <= index; ++i)
        found = children->l_next();
    parent->delete_child_iter(children);
    return found;
}

HX_NETWORK* net_named(HX_DESIGN* design, const std::string& name) {
    HX_NETWORK* found = nullptr;
    UT_BLISTS_ITER<HX_NETWORK>* nets = design->create_network_iter();
    while (HX_NETWORK* net = nets->l_next()) {
        const char* net_name = net->get_name();
        if (net_name != nullptr && name == net_name) {
            found = net;
            break;
        }
    }
    design->delete_network_iter(nets);
    return found;
}

std::string text_prop(const HX_OBJECT* object, const char* name) {
    const HX_PROPERTY* prop = object ? object->find_prop(name) : nullptr;
    if (prop == nullptr) return "<none>";
    return prop->get_text() ? prop->get_text() : "<no text>";
}

std::string prop_names(const HX_OBJECT* object) {
    std::string names;
    UT_BLISTS_ITER<HX_PROPERTY>* props = object->create_prop_iter();
    while (const HX_PROPERTY* prop = props ? props->l_next() : nullptr)
        names += std::string(prop->get_name()) + " ";
    if (props) object->delete_prop_iter(props);
    return names;
}

int prop_kind(const HX_OBJECT* object, const char* name) {
    const HX_PROPERTY* prop = object ? object->find_prop(name) : nullptr;
    return prop ? prop->get_kind() : -1;
}

namespace {

bool carries_merge_record(const HX_NETWORK& net) {
    for (const char* name : {"VX_MERGEDTO", "VX_MERGEDFROM", "VX_JOINED"})
        if (net.find_prop(name) != nullptr) return true;
    return false;
}

bool design_has_merge_records(const HX_DESIGN& design) {
    bool found = false;
    UT_BLISTS_ITER<HX_NETWORK>* nets = design.create_network_iter();
    while (HX_NETWORK* net = nets->l_next())
        found = found || carries_merge_record(*net);
    design.delete_network_iter(nets);
    return found;
}

}  // namespace

bool has_merge_records(HX_LIBRARY* library) {
    bool found = false;
    UT_BLIST_ITER<HX_LIBLINK>* links = library->create_liblink_iter();
    while (HX_LIBLINK* link = links->l_next())
        found = found || design_has_merge_records(*link->get_design());
    library->delete_liblink_iter(links);
    return found;
}

VX_STATUS BuilderTest::read(const std::string& text, uint8_t is_design, uint8_t make_physroot,
                            uint8_t nograft) {
    ScratchDir::write_file(input, text);
    return vrx.vrx_read(input.c_str(), is_design, make_physroot, nograft);
}

std::vector<std::string> BuilderTest::reports() const {
    std::vector<std::string> out;
    for (const CapturedMsg& m : capture.messages()) {
        if (m.file != "../s/vrx") continue;
        if (m.level == PORT_MSG_ERROR) out.push_back("E " + m.text);
        if (m.level == PORT_MSG_WARNING) out.push_back("W " + m.text);
    }
    return out;
}

std::vector<std::string> BuilderTest::own_texts(Port_MsgLevel level) const {
    std::vector<std::string> out;
    for (const CapturedMsg& m : capture.messages()) {
        if (m.level == level && m.module == "Quorra" && m.file != "../s/vrx") out.push_back(m.text);
    }
    return out;
}

}  // namespace builder_test
