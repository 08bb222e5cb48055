// The area-sampling table of a world: built once, on the first area sample, by whichever
// thread gets there first.
#include <cmath>
#include <memory>
#include <mutex>
#include <new>

#include "pf_bit_depth.h"
#include "pf_sampling.h"
#include "u_memory.h"

namespace {

// Builders of different worlds need not wait for each other; a few locks spread them out.
std::mutex& BuildLockFor(const PF_World& world) {
    static std::mutex locks[16];
    return locks[(reinterpret_cast<uintptr_t>(&world) >> 6) % 16];
}

// One texel's contribution in the table's units.
PF_Uint4 CellOf(const PF_Pixel8& p) {
    uint32_t a = p.alpha;
    return PF_Uint4{a, a * p.red, a * p.green, a * p.blue};
}

PF_AreaSum64 CellOf(const PF_Pixel16& p) {
    uint64_t a = p.alpha;
    return {a, a * p.red, a * p.green, a * p.blue};
}

// Sums must stay finite for every box: a texel that is not contributes nothing.
PF_PixelDouble CellOf(const PF_PixelFloat& p) {
    auto finite = [](float v) { return std::isfinite(v) ? double(v) : 0.0; };
    double a = finite(p.alpha);
    return {a, a * finite(p.red), a * finite(p.green), a * finite(p.blue)};
}

void Add(PF_Uint4& sum, const PF_Uint4& cell) {
    sum += cell;
}
void Add(PF_AreaSum64& sum, const PF_AreaSum64& cell) {
    sum = {sum.alpha + cell.alpha, sum.red + cell.red, sum.green + cell.green,
           sum.blue + cell.blue};
}
void Add(PF_PixelDouble& sum, const PF_PixelDouble& cell) {
    sum = {sum.alpha + cell.alpha, sum.red + cell.red, sum.green + cell.green,
           sum.blue + cell.blue};
}

template <class P>
void Fill(const PF_World& world, PF_AreaTable& table) {
    using Cell = decltype(CellOf(P{}));
    auto* cells = static_cast<Cell*>(table.cells);
    ptrdiff_t stride = table.Stride();
    for (ptrdiff_t x = 0; x < stride; ++x)
        cells[x] = Cell{};
    for (int32_t y = 0; y < table.height; ++y) {
        const P* texels = world.Row<P>(y);
        const Cell* above = cells + y * stride;
        Cell* row = cells + (y + 1) * stride;
        Cell running{};
        row[0] = Cell{};
        for (int32_t x = 0; x < table.width; ++x) {
            Add(running, CellOf(texels[x]));
            row[x + 1] = above[x + 1];
            Add(row[x + 1], running);
        }
    }
}

template <class P>
std::unique_ptr<PF_AreaTable> Build(const PF_World& world) {
    using Cell = decltype(CellOf(P{}));
    auto table = std::make_unique<PF_AreaTable>();
    table->width = world.width;
    table->height = world.height;
    table->bytes = sizeof(Cell) * static_cast<size_t>(table->Stride()) *
                   (static_cast<size_t>(world.height) + 1);
    table->cells = U_AllocatePtr(0, "area table", table->bytes);
    if (!table->cells) throw std::bad_alloc();
    U_AccountAllocationEx(table->bytes, 1);
    Fill<P>(world, *table);
    return table;
}

}  // namespace

const PF_AreaTable& PF_BuildAreaTable(const PF_World& world, int16_t bitDepth) {
    std::lock_guard<std::mutex> lock(BuildLockFor(world));
    std::atomic<const PF_AreaTable*>& slot = world.samplingTables.area;
    if (const PF_AreaTable* built = slot.load(std::memory_order_acquire)) return *built;
    std::unique_ptr<PF_AreaTable> table =
        PF_DispatchBitDepth(bitDepth, [&]<class P>() { return Build<P>(world); });
    slot.store(table.get(), std::memory_order_release);
    return *table.release();
}

void PF_WorldSamplingTables::Free() noexcept {
    if (const PF_AreaTable* table = area.exchange(nullptr)) {
        U_AccountAllocationEx(table->bytes, 0);
        U_FreePtr(table->cells);
        delete table;
    }
}
