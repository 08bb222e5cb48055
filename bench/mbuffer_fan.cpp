// The draft, anti-aliased and motion-blur fragment buffers over a full HD frame of eight cards
// that all cross one another (a fan through the frame's vertical centre line), each card
// covering every pixel: fragments per second added, layer after layer as the renderer draws
// them, on one thread and on all of them; pixels per second resolved; and the bytes the
// fragment storage peaks at.
//
// In the motion-blur buffer the fan moves: over the shutter (16 samples, of which the buffer
// sees the first and the last) each card travels in depth by its own amount, so the line
// where two cards cross sweeps a band a few pixels wide and every pixel of the bands is
// resolved over time. A record is one per card and pixel whatever the number of samples: the
// fragment memory grows with the area the cards sweep, not with the samples.
#include <benchmark/benchmark.h>
#include <malloc.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cmath>
#include <ctime>
#include <memory>
#include <thread>
#include <vector>

#include "pf_world.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/scene/threads.h"
#include "u_memory.h"

namespace {

constexpr int32_t kWidth = 1920;
constexpr int32_t kHeight = 1080;
constexpr int32_t kCards = 8;
constexpr double kPi = 3.14159265358979323846;
constexpr M_LRect kFrame{0, 0, kWidth, kHeight};

// Card c turns (c − 3.5) × 15° about the centre line: its key at pixel x is
// 1000 + (x + 0.5 − 960) · tan(angle), so left of the line the cards lie in one order and right
// of it in the reverse one.
float SlopeOf(int32_t card) {
    return static_cast<float>(std::tan((card - 3.5) * 15.0 * kPi / 180.0));
}

template <class P>
P ColorOf(int32_t card) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    auto c = [&](float v) { return static_cast<C>(v * kMax); };
    return {c(0.75f), c((card & 1) ? 1.0f : 0.2f), c((card & 2) ? 1.0f : 0.3f),
            c((card & 4) ? 1.0f : 0.4f)};
}

template <class P>
SY_Coverage<P> FullCoverage() {
    return static_cast<SY_Coverage<P>>(PF_PixelTraits<P>::kMax);
}

// CPU time of the calling thread: the machine is shared, so wall time says more about the
// neighbours than about the code.
int64_t ThreadCpuNs() {
    timespec t;
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &t);
    return int64_t{t.tv_sec} * 1000000000 + t.tv_nsec;
}

// Depth travel of card c over the shutter: (c − 3.5) × 2, so that neighbouring cards, whose
// slopes differ by about 0.27 near the centre line, cross up to 7 pixels from it.
float TravelOf(int32_t card) {
    return static_cast<float>((card - 3.5) * 2.0);
}

// Rows of one card, handed out one at a time to `threads` workers as the host's iterator does.
// Adds the workers' CPU time to *cpuNs. Anti-aliased records carry the card's plane, keyed by
// its smallest value over the pixel, and motion-blur records its travel too, keyed by the
// smallest value over the pixel and the shutter.
template <class B>
void DrawCard(B* buffer, int32_t card, int32_t threads, std::atomic<int64_t>* cpuNs) {
    using P = typename B::Record::Pixel;
    constexpr int32_t kGradients = B::Record::kGradients;
    const P color = ColorOf<P>(card);
    const float slope = SlopeOf(card);
    const float travel = kGradients == 3 ? TravelOf(card) : 0.0f;
    const float keyAtLeft = 1000.0f + (0.5f - kWidth / 2) * slope -
                            (kGradients >= 2 ? 0.5f * std::fabs(slope) : 0.0f) +
                            std::min(0.0f, travel);
    std::atomic<int32_t> nextRow{0};
    auto work = [&](int32_t thread) {
        const int64_t start = ThreadCpuNs();
        for (int32_t y; (y = nextRow.fetch_add(1, std::memory_order_relaxed)) < kHeight;) {
            auto** head = buffer->HeadAt(0, y);
            float key = keyAtLeft;
            for (int32_t x = 0; x < kWidth; ++x, ++head, key += slope) {
                if constexpr (kGradients == 3)
                    buffer->AddFragment(&color, FullCoverage<P>(), 2, key, slope, 0.0f, travel,
                                        head, thread);
                else if constexpr (kGradients == 2)
                    buffer->AddFragment(&color, FullCoverage<P>(), 2, key, slope, 0.0f, head,
                                        thread);
                else
                    buffer->AddFragment(&color, FullCoverage<P>(), 2, key, head, thread);
            }
        }
        cpuNs->fetch_add(ThreadCpuNs() - start);
    };
    if (threads == 1) {
        work(0);
        return;
    }
    std::vector<std::thread> workers;
    for (int32_t t = 0; t < threads; ++t)
        workers.emplace_back(work, t);
    for (auto& worker : workers)
        worker.join();
}

int32_t AllThreads() {
    return std::max(1u, std::thread::hardware_concurrency());
}

int32_t ReportAllThreads(int32_t* count) {
    *count = AllThreads();
    return 0;
}

// Pools and the allocation lock set up as a frame on `threads` workers would have them.
class FrameThreads {
public:
    explicit FrameThreads(int32_t threads) {
        // A host allocator keeps freed blocks for the next frame instead of handing the pages
        // back; without this every frame pays the kernel for 100,000 fresh pages.
        mallopt(M_TRIM_THRESHOLD, 1 << 30);
        mallopt(M_MMAP_THRESHOLD, 1 << 30);
        mallopt(M_ARENA_MAX, 1);  // per-thread arenas hand whole heaps back
        static const QNGP_IterateSuite1 suite{&ReportAllThreads, &PF_IterateGeneric_Static};
        SY_PrepareThreads(threads > 1, &suite);
    }
    ~FrameThreads() { SY_PrepareThreads(false, nullptr); }
};

template <class B>
std::unique_ptr<SY_MBuffer> EmptyBuffer() {
    using P = typename B::Record::Pixel;
    constexpr int32_t kGradients = B::Record::kGradients;
    return SY_MBuffer::New(kFrame, PF_PixelTraits<P>::kBitDepth, kGradients >= 2, kGradients == 3);
}

template <class B>
std::unique_ptr<SY_MBuffer> FilledBuffer(int32_t threads) {
    auto owner = EmptyBuffer<B>();
    std::atomic<int64_t> cpuNs{0};
    for (int32_t card = 0; card < kCards; ++card)
        DrawCard(static_cast<B*>(owner.get()), card, threads, &cpuNs);
    return owner;
}

using Clock = std::chrono::steady_clock;

// B: the buffer class. Argument: worker threads, 0 for all of them.
template <class B>
void BM_AddFragments(benchmark::State& state) {
    const int32_t threads = state.range(0) ? static_cast<int32_t>(state.range(0)) : AllThreads();
    FrameThreads frame(threads);
    FilledBuffer<B>(threads);  // the first frame also pays for fresh pages: not timed
    int64_t peakBytes = 0;
    std::atomic<int64_t> cpuNs{0};
    for (auto _ : state) {
        const int64_t before = U_AccountedBytes();
        auto owner = EmptyBuffer<B>();
        auto* buffer = static_cast<B*>(owner.get());
        const auto start = Clock::now();
        for (int32_t card = 0; card < kCards; ++card)
            DrawCard(buffer, card, threads, &cpuNs);
        state.SetIterationTime(std::chrono::duration<double>(Clock::now() - start).count());
        peakBytes = std::max(peakBytes, U_AccountedBytes() - before);
    }
    constexpr double kFragments = double(kWidth) * kHeight * kCards;
    state.counters["threads"] = threads;
    state.counters["fragments_per_s"] =
        benchmark::Counter(kFragments, benchmark::Counter::kIsIterationInvariantRate);
    state.counters["fragments_per_cpu_s"] =
        kFragments * static_cast<double>(state.iterations()) / (cpuNs.load() * 1e-9);
    state.counters["peak_fragment_MiB"] = static_cast<double>(peakBytes) / (1 << 20);
}

template <class B>
void BM_Resolve(benchmark::State& state) {
    using P = typename B::Record::Pixel;
    FrameThreads frame(1);
    std::unique_ptr<SY_MBuffer> buffer = FilledBuffer<B>(1);
    PF_WorldX<P> destination(kWidth, kHeight);
    int64_t cpuNs = 0;
    for (auto _ : state) {
        const P grey = {
            static_cast<typename PF_PixelTraits<P>::Channel>(PF_PixelTraits<P>::kMax), {}, {}, {}};
        for (int32_t y = 0; y < kHeight; ++y)
            std::fill_n(destination.Row(y), kWidth, grey);
        const auto start = Clock::now();
        const int64_t cpuStart = ThreadCpuNs();
        buffer->Resolve(nullptr, nullptr, destination);
        cpuNs += ThreadCpuNs() - cpuStart;
        state.SetIterationTime(std::chrono::duration<double>(Clock::now() - start).count());
        benchmark::DoNotOptimize(destination.At(kWidth / 2, kHeight / 2));
    }
    constexpr double kPixels = double(kWidth) * kHeight;
    state.counters["pixels_per_s"] =
        benchmark::Counter(kPixels, benchmark::Counter::kIsIterationInvariantRate);
    state.counters["pixels_per_cpu_s"] =
        kPixels * static_cast<double>(state.iterations()) / (cpuNs * 1e-9);
    state.counters["fragments_per_cpu_s"] =
        kPixels * kCards * static_cast<double>(state.iterations()) / (cpuNs * 1e-9);
}

void Threads(benchmark::internal::Benchmark* b) {
    b->Arg(1)->Arg(0)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(4);
}

void Once(benchmark::internal::Benchmark* b) {
    b->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(4);
}

}  // namespace

BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferDraftX<PF_Pixel8>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferDraftX<PF_Pixel16>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferDraftX<PF_PixelFloat>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferAAX<PF_Pixel8>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferAAX<PF_Pixel16>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferAAX<PF_PixelFloat>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferMBX<PF_Pixel8>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferMBX<PF_Pixel16>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_AddFragments, SY_MBufferMBX<PF_PixelFloat>)->Apply(Threads);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferDraftX<PF_Pixel8>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferDraftX<PF_Pixel16>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferDraftX<PF_PixelFloat>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferAAX<PF_Pixel8>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferAAX<PF_Pixel16>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferAAX<PF_PixelFloat>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferMBX<PF_Pixel8>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferMBX<PF_Pixel16>)->Apply(Once);
BENCHMARK_TEMPLATE(BM_Resolve, SY_MBufferMBX<PF_PixelFloat>)->Apply(Once);

BENCHMARK_MAIN();
