// Qmx_CorrAlgo: the lineage searches. Each is one depth-first walk from an item over the
// relationships of the graph, read only through the abstract object model, so any
// implementation of it can be searched:
//  - FindSourcesInContainer: the items the item was derived from, over any number of steps,
//    that lie directly in `container`;
//  - FindSourcesBeneathContainer: the same for items in `container` or anywhere beneath it;
//  - FindDerivedBeneathContainer: the items derived from the item, over any number of steps,
//    in or beneath `container`;
//  - GetImmediateSources: the items the item was derived from in one step.
// An item follows its own explicit relationships; an item without any follows the implicit
// relationships of its nearest container that has some (sources: every direction but
// "SRC -> DST"; derived: "SRC -> DST" only). Items outside `container` are walked through.
// Results are in the order the walk first accepted them, without duplicates and never
// holding the start item. A null item or container gives an empty result.
//
// Each item is expanded once per search, so a graph with many paths to an item costs no more
// than its size. A search may create items and containers through implicit relationships that
// allow it, but along one path each such relationship creates only the first time the path
// crosses it, so every search ends. An exception of the graph (a pool that cannot be read)
// leaves the search; what was created before it stays. Every step is traced under
// "CORR_ALGO" (levels 9 and 10). One thread at a time, and the graph must not change while a
// search runs.
#ifndef QMX_CORRALGO_H
#define QMX_CORRALGO_H
#include <vector>

#include "QmxCorrExport.h"

class Qmx_CorrContainer;
class Qmx_CorrItem;

namespace Qmx_CorrAlgo {

QMX_CORR_EXPORT std::vector<const Qmx_CorrItem*> FindSourcesInContainer(
    const Qmx_CorrItem* item, const Qmx_CorrContainer* container);
QMX_CORR_EXPORT std::vector<Qmx_CorrItem*> FindSourcesInContainer(Qmx_CorrItem* item,
                                                                  Qmx_CorrContainer* container);

QMX_CORR_EXPORT std::vector<const Qmx_CorrItem*> FindSourcesBeneathContainer(
    const Qmx_CorrItem* item, const Qmx_CorrContainer* container);
QMX_CORR_EXPORT std::vector<Qmx_CorrItem*> FindSourcesBeneathContainer(
    Qmx_CorrItem* item, Qmx_CorrContainer* container);

QMX_CORR_EXPORT std::vector<const Qmx_CorrItem*> FindDerivedBeneathContainer(
    const Qmx_CorrItem* item, const Qmx_CorrContainer* container);
QMX_CORR_EXPORT std::vector<Qmx_CorrItem*> FindDerivedBeneathContainer(
    Qmx_CorrItem* item, Qmx_CorrContainer* container);

QMX_CORR_EXPORT std::vector<const Qmx_CorrItem*> GetImmediateSources(const Qmx_CorrItem* item);
QMX_CORR_EXPORT std::vector<Qmx_CorrItem*> GetImmediateSources(Qmx_CorrItem* item);

}  // namespace Qmx_CorrAlgo

#endif
