// Merge records become network references once a whole file is read: each
// MERGEDTO, MERGEDFROM or JOINED names a net that may be declared after it.
#include <algorithm>
#include <string>
#include <vector>

#include "port_msg.h"
#include "vx_builder_internal.h"

namespace {

struct MergeKind {
    const char* record;  // what the reader stores while reading
    const char* result;  // the integer property it becomes
};

constexpr MergeKind kMergeKinds[] = {
    {"VX_MERGEDTO", "MERGEDTO"},
    {"VX_MERGEDFROM", "MERGEDFROM"},
    {"VX_JOINED", "JOINED"},
};

const MergeKind* merge_kind_of(const HX_PROPERTY* prop) {
    for (const MergeKind& kind : kMergeKinds) {
        if (vx_is(prop->get_name(), kind.record)) return &kind;
    }
    return nullptr;
}

// A merge names a net of the logical hierarchy or a global one.
bool merge_target(const HX_NETWORK* net, int32_t) {
    const HX_SIGNAL* highest = net->get_highest_signal();
    if (highest == nullptr) return false;
    const HX_BLOCK* block = highest->get_block();
    return block == nullptr || !block->is_physical();
}

}  // namespace

// Every design that received merge records since they were last resolved,
// not only the current one: a file may hold several designs, and no record
// may reach a database file.
void VRX::resolve_merge_props() {
    if (!lookups) return;
    std::vector<HX_DESIGN*> pending;
    pending.swap(lookups->merge_pending);
    lookups->merge_pending_set.clear();
    for (HX_DESIGN* target : pending)
        resolve_design_merges(target);
}

// A design grafted while its merge records wait would hand the copy names
// of its own nets, which mean nothing in the target. Its records are
// resolved first: the copy takes the source as it stands, references and all.
void VRX::resolve_before_graft(HX_DESIGN* source) {
    if (!lookups || lookups->merge_pending_set.erase(source) == 0) return;
    std::vector<HX_DESIGN*>& pending = lookups->merge_pending;
    pending.erase(std::find(pending.begin(), pending.end(), source));
    resolve_design_merges(source);
}

void VRX::resolve_design_merges(HX_DESIGN* target) {
    std::vector<HX_PROPERTY*> records;
    for (std::size_t slot = 0; slot < target->network_slots(); ++slot) {
        HX_NETWORK* net = target->network_at(slot);
        if (net == nullptr || net->get_props() == nullptr) continue;
        records.clear();
        for (HX_PROPERTY* prop : net->get_props()->items()) {
            if (prop != nullptr && merge_kind_of(prop) != nullptr) records.push_back(prop);
        }
        for (HX_PROPERTY* record : records) {
            const MergeKind* kind = merge_kind_of(record);
            const char* wanted = vx_text(record->get_text());
            const HX_NETWORK* other = lookups->nets.find(target, wanted, merge_target, 0);
            if (other != nullptr) {
                net->create_prop(kind->result, static_cast<int32_t>(other->get_tag()));
            } else {
                const std::string text =
                    UT_STR::Format("Net %s in %s property on net %s not found\n", wanted,
                                   kind->result, vx_text(net->get_name()));
                Port_MsgManData::createObject("Quorra", "basvxprops", __LINE__, "$Revision: 1.2 $")
                    .issueWarning("%s", text.c_str());
            }
            net->delete_prop(record);
        }
    }
}
