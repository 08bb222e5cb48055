#include "renderer/dof/shape_kernels.h"

#include <algorithm>
#include <cmath>
#include <new>

#include "renderer/scene/dof_model.h"
#include "u_memory.h"

std::shared_ptr<const ShapeKernelArray> BuildShapeKernels(const SY_CameraDOFDesc& dof) {
    if (dof.irisShape < 3) return nullptr;
    const double maxRadius = SY_DOFModel(dof).maxRadius;
    try {
        auto array =
            std::allocate_shared<ShapeKernelArray>(SY_AccountedAllocator<ShapeKernelArray>());
        array->count = static_cast<int32_t>(8 * maxRadius);
        array->step = array->count ? 1.0f / static_cast<float>(array->count) : 0.0f;
        array->kernelList.reserve(static_cast<size_t>(array->count) + 1);
        for (int32_t i = 0; i <= array->count; ++i) {
            double t = array->count ? static_cast<double>(i) / array->count : 0.0;
            array->kernelList.push_back(std::allocate_shared<const ShapeKernel>(
                SY_AccountedAllocator<ShapeKernel>(), static_cast<int32_t>(dof.irisShape),
                dof.irisRoundness, t * maxRadius, dof.irisAspect, SY_DOFXScale(dof),
                dof.irisRotation, dof.diffractionFringe));
        }
        return array;
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;  // a kernel's rows could not be had
    }
}
