#include <cstdint>

#include "renderer/mbuffer/group_resolve.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/region_resolve.h"

namespace {

// Records meet where their planes over the pixel square cross.
template <class F>
class SquareGeometry {
public:
    static bool Cross(const F& a, const F& b) {
        return SY_CrossInside(SY_DifferenceAtCorners(SY_PlaneOf(a), SY_PlaneOf(b)));
    }
    static float ShareInFront(const F& a, const F& b) {
        return SY_ShareInFront(SY_DifferenceAtCorners(SY_PlaneOf(a), SY_PlaneOf(b)));
    }
    void ResolveRun(F* const* run, int32_t count, const PF_LinearBlendingTables* tables,
                    typename F::Pixel* pixel) {
        regions_.Resolve(run, count, tables, pixel);
    }

private:
    SY_RegionResolver<F> regions_;
};

}  // namespace

template <class P>
void SY_MBufferAAX<P>::Resolve(SY_ProgressAbort* progress,
                               const PF_LinearBlendingTables* blendTables, PF_World& destination) {
    SY_ResolveSplitting<SquareGeometry<Record>>(*this, progress, blendTables, destination);
}

template class SY_MBufferAAX<PF_Pixel8>;
template class SY_MBufferAAX<PF_Pixel16>;
template class SY_MBufferAAX<PF_PixelFloat>;
