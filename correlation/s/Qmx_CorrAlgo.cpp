#include "Qmx_CorrAlgo.h"

#include <cstdint>
#include <unordered_map>

#include "Qmx_CorrContainer.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrExplicitRelationship.h"
#include "Qmx_CorrImplicitRelationship.h"
#include "Qmx_CorrItem.h"
#include "Qmx_CorrManagedImplicitRelationship.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrAlgo";
constexpr const char* kRevision = "1";
constexpr const char* kCategory = "CORR_ALGO";

using Item = const Qmx_CorrItem*;
using ItemList = std::vector<Item>;

// A set of objects by address, without an allocation per member: every search asks it once per
// step, and most searches are short.
class AddressSet {
public:
    AddressSet() : m_slots(kInitialSlots, nullptr), m_count(0) {}

    bool Contains(const void* address) const { return m_slots[Find(address)] == address; }

    // False when `address` was a member already.
    bool Insert(const void* address) {
        std::size_t slot = Find(address);
        if (m_slots[slot] == address) return false;
        if (2 * (m_count + 1) > m_slots.size()) {
            Grow();
            slot = Find(address);
        }
        m_slots[slot] = address;
        ++m_count;
        return true;
    }

private:
    static constexpr std::size_t kInitialSlots = 64;  // a power of two

    // The slot holding `address`, or the empty slot where it would go.
    std::size_t Find(const void* address) const {
        const std::size_t mask = m_slots.size() - 1;
        std::uint64_t hash = reinterpret_cast<std::uintptr_t>(address);
        hash = (hash ^ (hash >> 29)) * 0xBF58476D1CE4E5B9ULL;
        std::size_t slot = static_cast<std::size_t>(hash >> 32) & mask;
        while (m_slots[slot] != nullptr && m_slots[slot] != address) slot = (slot + 1) & mask;
        return slot;
    }

    void Grow() {
        std::vector<const void*> old(2 * m_slots.size(), nullptr);
        old.swap(m_slots);
        for (const void* address : old) {
            if (address) m_slots[Find(address)] = address;
        }
    }

    std::vector<const void*> m_slots;
    std::size_t m_count;
};

// One relationship to follow from an item: an explicit relationship of the item itself or an
// implicit one of a container above it. The gatherer knows which it found.
struct Step {
    const Qmx_CorrExplicitRelationship* explicitRel;
    const Qmx_CorrImplicitRelationship* implicitRel;
};
using StepList = std::vector<Step>;

// The implicit relationships of an item's nearest container that has any on `Side`, filtered.
template <typename Side>
void GatherImplicit(Item item, StepList& steps) {
    for (const Qmx_CorrContainer* container = item->GetParent(); container;
         container = container->GetParent()) {
        const std::vector<Qmx_CorrImplicitRelationship*>& found =
            Side::ContainerRelationships(container);
        if (found.empty()) continue;
        for (const Qmx_CorrImplicitRelationship* rel : found) {
            if (Side::Keeps(rel->GetDirection())) steps.push_back(Step{nullptr, rel});
        }
        return;
    }
}

template <typename Side>
void Gather(Item item, StepList& steps) {
    QMX_CORR_TRACE(kCategory, 10,
                   "Following all " << Side::kWord << " relationships on item '"
                                    << item->GetAbsoluteName() << "'");
    const auto relationships = Side::ItemRelationships(item);
    if (!relationships.empty()) {
        QMX_CORR_TRACE(kCategory, 10,
                       "Item has " << relationships.size() << " " << Side::kWord
                                   << " relationships to follow.");
        for (const Qmx_CorrExplicitRelationship* rel : relationships) {
            steps.push_back(Step{rel, nullptr});
        }
        return;
    }
    QMX_CORR_TRACE(kCategory, 10,
                   "No " << Side::kWord << " relationships on item so looking for " << Side::kWord
                         << " implicit relationships on its container.");
    GatherImplicit<Side>(item, steps);
}

// Sources: incoming relationships, leading to their source items.
struct Sources {
    static constexpr const char* kWord = "incoming";
    static constexpr const char* kItemsWord = "source";

    static Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> ItemRelationships(
        Item item) {
        return item->GetIncomingRelationships();
    }
    static const std::vector<Qmx_CorrImplicitRelationship*>& ContainerRelationships(
        const Qmx_CorrContainer* container) {
        return container->GetIncomingRelationships();
    }
    static bool Keeps(Qmx_CorrImplicitRelationship::DIRECTION direction) {
        return direction != Qmx_CorrImplicitRelationship::DIR_SRC_TO_DST;
    }
    static Qmx_SingleOptContainerT<const Qmx_CorrItem*> Ends(
        const Qmx_CorrExplicitRelationship* rel) {
        return rel->GetSrcItems();
    }
    static Item Map(const Qmx_CorrImplicitRelationship* rel, Item item) {
        return rel->GetSrcItem(item);
    }
    static Item MapWithoutCreating(Qmx_CorrManagedImplicitRelationship* rel, Item item) {
        return rel->MapToSrc(item, false);
    }
};

// Derived: outgoing relationships, leading to their destination items.
struct Derived {
    static constexpr const char* kWord = "outgoing";
    static constexpr const char* kItemsWord = "derived";

    static Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> ItemRelationships(
        Item item) {
        return item->GetOutgoingRelationships();
    }
    static const std::vector<Qmx_CorrImplicitRelationship*>& ContainerRelationships(
        const Qmx_CorrContainer* container) {
        return container->GetOutgoingRelationships();
    }
    static bool Keeps(Qmx_CorrImplicitRelationship::DIRECTION direction) {
        return direction == Qmx_CorrImplicitRelationship::DIR_SRC_TO_DST;
    }
    static Qmx_SingleOptContainerT<const Qmx_CorrItem*> Ends(
        const Qmx_CorrExplicitRelationship* rel) {
        return rel->GetDstItems();
    }
    static Item Map(const Qmx_CorrImplicitRelationship* rel, Item item) {
        return rel->GetDstItem(item);
    }
    static Item MapWithoutCreating(Qmx_CorrManagedImplicitRelationship* rel, Item item) {
        return rel->MapToDst(item, false);
    }
};

// The items `step` leads to from `item`. An implicit relationship that may create items
// creates only when `mayCreate`; only the library's own relationships can be asked not to.
template <typename Side>
void Follow(const Step& step, Item item, bool mayCreate, ItemList& targets) {
    if (step.explicitRel) {
        QMX_CORR_TRACE(kCategory, 10,
                       "Following all " << Side::kItemsWord << " items for explicit relationship "
                                        << step.explicitRel->GetName());
        for (Item end : Side::Ends(step.explicitRel)) targets.push_back(end);
        return;
    }
    QMX_CORR_TRACE(kCategory, 10,
                   "Following all " << Side::kItemsWord << " items for implicit relationship "
                                    << step.implicitRel->GetName());
    Item counterpart = nullptr;
    auto* managed =
        mayCreate ? nullptr
                  : dynamic_cast<const Qmx_CorrManagedImplicitRelationship*>(step.implicitRel);
    if (managed) {
        counterpart = Side::MapWithoutCreating(
            const_cast<Qmx_CorrManagedImplicitRelationship*>(managed), item);
    } else {
        counterpart = Side::Map(step.implicitRel, item);
    }
    if (counterpart) targets.push_back(counterpart);
}

// Acceptance policies: which items the result takes.
class InContainer {
public:
    explicit InContainer(const Qmx_CorrContainer* container) : m_container(container) {}
    bool operator()(Item item) const {
        QMX_CORR_TRACE(kCategory, 10,
                       "Checking to see if item '" << item->GetAbsoluteName()
                                                   << "' is in container '"
                                                   << m_container->GetAbsoluteName() << "'");
        return item->GetParent() == m_container;
    }

private:
    const Qmx_CorrContainer* m_container;
};

class BeneathContainer {
public:
    explicit BeneathContainer(const Qmx_CorrContainer* container) : m_container(container) {}
    bool operator()(Item item) const {
        QMX_CORR_TRACE(kCategory, 10,
                       "Checking to see if item '" << item->GetAbsoluteName()
                                                   << "' is beneath container '"
                                                   << m_container->GetAbsoluteName() << "'");
        const Qmx_CorrContainer* container = item->GetParent();
        while (container && container != m_container) container = container->GetParent();
        return container != nullptr;
    }

private:
    const Qmx_CorrContainer* m_container;
};

struct EveryItem {
    bool operator()(Item) const { return true; }
};

// Stop policies: where a path ends before the item is expanded.
struct NeverStop {
    bool operator()(Item) const { return false; }
};

class StopBeyond {
public:
    explicit StopBeyond(Item start) : m_start(start) {}
    bool operator()(Item item) const { return item != m_start; }

private:
    Item m_start;
};

// The depth-first walk. Paths are walked in the order of the relationships and of their items,
// as a walk that re-expands an item on every new path would, but each item is expanded once:
// by the time an item is met again, everything reachable from it has been met, so a second
// expansion could add nothing to the result and would only repeat itself (diamonds made that
// exponential). The walk keeps its own stack, so a long chain cannot exhaust the thread's.
template <typename Side, typename Accept, typename Stop>
class Search {
public:
    Search(Accept accept, Stop stop) : m_accept(accept), m_stop(stop), m_depth(0) {}

    ItemList Run(Item start) {
        QMX_CORR_TRACE(kCategory, 10, "Following paths from item " << start->GetAbsoluteName());
        Visit(start);
        while (m_depth > 0) Advance();
        ItemList result;
        result.reserve(m_result.size());
        for (Item item : m_result) {
            if (item != start) result.push_back(item);
        }
        return result;
    }

private:
    // An expanded item: its relationships, and the items of the one being followed.
    struct Frame {
        Item item;
        StepList steps;
        std::size_t nextStep;
        ItemList targets;
        std::size_t nextTarget;
        bool following;                               // between "{" and "}"
        const Qmx_CorrImplicitRelationship* creator;  // counted on the path, or null
    };

    void Visit(Item item) {
        if (m_accept(item) && m_inResult.Insert(item)) {
            QMX_CORR_TRACE(kCategory, 9,
                           "Item '" << item->GetAbsoluteName()
                                    << "' is an accepted destination. Adding it to the return "
                                       "set");
            m_result.push_back(item);
        }
        if (m_stop(item)) {
            QMX_CORR_TRACE(kCategory, 9,
                           "Item '" << item->GetAbsoluteName()
                                    << "' is a stopping point. Terminating search on this path");
            return;
        }
        if (!m_visited.Insert(item)) {
            QMX_CORR_TRACE(kCategory, 9,
                           "Item '" << item->GetAbsoluteName()
                                    << "' has been visited before. Terminating search on this "
                                       "path");
            return;
        }
        Frame& frame = Push(item);
        Gather<Side>(item, frame.steps);
        QMX_CORR_TRACE(kCategory, 9,
                       "Found " << frame.steps.size() << " relationships to follow for item '"
                                << item->GetAbsoluteName() << "'");
    }

    // Frames above the depth keep their lists, so a search allocates little after its start.
    Frame& Push(Item item) {
        if (m_frames.size() == m_depth) m_frames.emplace_back();
        Frame& frame = m_frames[m_depth++];
        frame.item = item;
        frame.steps.clear();
        frame.nextStep = 0;
        frame.targets.clear();
        frame.nextTarget = 0;
        frame.following = false;
        frame.creator = nullptr;
        return frame;
    }

    // One move of the walk: the next item of the relationship being followed, else the next
    // relationship, else back to the item below.
    void Advance() {
        Frame& frame = m_frames[m_depth - 1];
        if (frame.nextTarget < frame.targets.size()) {
            Visit(frame.targets[frame.nextTarget++]);  // may move m_frames
            return;
        }
        if (frame.following) EndFollowing(frame);
        if (frame.nextStep < frame.steps.size()) {
            BeginFollowing(frame, frame.steps[frame.nextStep++]);
            return;
        }
        --m_depth;
    }

    void BeginFollowing(Frame& frame, const Step& step) {
        const Qmx_CorrImplicitRelationship* creator =
            step.implicitRel && step.implicitRel->CanCreateItems() ? step.implicitRel : nullptr;
        // A relationship that creates counterparts creates only the first time a path crosses
        // it: crossing it again would create one level deeper, or one name longer, forever.
        const bool mayCreate = !creator || m_crossings[creator] == 0;
        frame.targets.clear();
        frame.nextTarget = 0;
        Follow<Side>(step, frame.item, mayCreate, frame.targets);
        QMX_CORR_TRACE(kCategory, 9,
                       "Found " << frame.targets.size()
                                << " items off of next relationship for item '"
                                << frame.item->GetAbsoluteName() << "' {");
        frame.following = true;
        frame.creator = creator;
        if (creator) ++m_crossings[creator];
    }

    void EndFollowing(Frame& frame) {
        if (frame.creator) --m_crossings[frame.creator];
        frame.creator = nullptr;
        frame.following = false;
        QMX_CORR_TRACE(kCategory, 9, "Finished tracing along relationship }");
    }

    Accept m_accept;
    Stop m_stop;
    ItemList m_result;
    AddressSet m_inResult;
    AddressSet m_visited;
    std::vector<Frame> m_frames;
    std::size_t m_depth;
    // How often the current path crosses each creating implicit relationship.
    std::unordered_map<const Qmx_CorrImplicitRelationship*, unsigned> m_crossings;
};

template <typename Side, typename Accept, typename Stop>
ItemList RunSearch(Item start, Accept accept, Stop stop) {
    return Search<Side, Accept, Stop>(accept, stop).Run(start);
}

std::vector<Qmx_CorrItem*> Mutable(const ItemList& items) {
    std::vector<Qmx_CorrItem*> result;
    result.reserve(items.size());
    for (Item item : items) result.push_back(const_cast<Qmx_CorrItem*>(item));
    return result;
}

}  // namespace

namespace Qmx_CorrAlgo {

std::vector<const Qmx_CorrItem*> FindSourcesInContainer(const Qmx_CorrItem* item,
                                                        const Qmx_CorrContainer* container) {
    if (!item || !container) return {};
    return RunSearch<Sources>(item, InContainer(container), NeverStop());
}

std::vector<Qmx_CorrItem*> FindSourcesInContainer(Qmx_CorrItem* item,
                                                  Qmx_CorrContainer* container) {
    return Mutable(FindSourcesInContainer(static_cast<const Qmx_CorrItem*>(item),
                                          static_cast<const Qmx_CorrContainer*>(container)));
}

std::vector<const Qmx_CorrItem*> FindSourcesBeneathContainer(const Qmx_CorrItem* item,
                                                             const Qmx_CorrContainer* container) {
    if (!item || !container) return {};
    return RunSearch<Sources>(item, BeneathContainer(container), NeverStop());
}

std::vector<Qmx_CorrItem*> FindSourcesBeneathContainer(Qmx_CorrItem* item,
                                                       Qmx_CorrContainer* container) {
    return Mutable(FindSourcesBeneathContainer(static_cast<const Qmx_CorrItem*>(item),
                                               static_cast<const Qmx_CorrContainer*>(container)));
}

std::vector<const Qmx_CorrItem*> FindDerivedBeneathContainer(const Qmx_CorrItem* item,
                                                             const Qmx_CorrContainer* container) {
    if (!item || !container) return {};
    return RunSearch<Derived>(item, BeneathContainer(container), NeverStop());
}

std::vector<Qmx_CorrItem*> FindDerivedBeneathContainer(Qmx_CorrItem* item,
                                                       Qmx_CorrContainer* container) {
    return Mutable(FindDerivedBeneathContainer(static_cast<const Qmx_CorrItem*>(item),
                                               static_cast<const Qmx_CorrContainer*>(container)));
}

std::vector<const Qmx_CorrItem*> GetImmediateSources(const Qmx_CorrItem* item) {
    if (!item) return {};
    return RunSearch<Sources>(item, EveryItem(), StopBeyond(item));
}

std::vector<Qmx_CorrItem*> GetImmediateSources(Qmx_CorrItem* item) {
    return Mutable(GetImmediateSources(static_cast<const Qmx_CorrItem*>(item)));
}

}  // namespace Qmx_CorrAlgo
