// Creation when the heap runs dry.  The unit-test binary is linked with
// malloc and free wrapped (tests/CMakeLists.txt), so a test can make the Nth
// heap allocation fail.  Every allocation each create function reaches is
// failed in turn: the function must return null with -2, give back what it
// had taken (counted here, and checked again by LeakSanitizer in the ASan
// build), and leave the heap usable for the next instance.
#include <gtest/gtest.h>

#include <cstddef>

#include "vamrnb.h"

extern "C" void *__real_malloc(size_t size);
extern "C" void __real_free(void *p);

namespace {

// Armed only around the call under test, so the rest of the binary's
// allocations pass straight through.
struct {
    bool armed = false;
    int fail_at = -1;   // index of the allocation to fail
    int calls = 0;      // allocations asked for while armed
    int live = 0;       // allocations handed out minus those freed while armed
} heap;

}  // namespace

extern "C" void *__wrap_malloc(size_t size) {
    if (!heap.armed) return __real_malloc(size);
    if (heap.calls++ == heap.fail_at) return nullptr;
    void *p = __real_malloc(size);
    if (p != nullptr) ++heap.live;
    return p;
}

extern "C" void __wrap_free(void *p) {
    if (heap.armed && p != nullptr) --heap.live;
    __real_free(p);
}

namespace {

template <class Create, class Delete>
void fail_each_allocation(const codec_config &config, Create create, Delete destroy) {
    int reached = 0;
    for (int n = 0;; ++n) {
        heap = {true, n, 0, 0};
        int32_t err = 1;
        auto *inst = create(&config, &err);
        const int calls = heap.calls, live = heap.live;
        heap.armed = false;
        if (calls <= n) {
            // Allocation n was never asked for: creation ran to the end.
            ASSERT_NE(inst, nullptr);
            EXPECT_EQ(err, AMRNB_OK);
            EXPECT_EQ(live, calls);
            destroy(inst);
            reached = calls;
            break;
        }
        EXPECT_EQ(inst, nullptr) << "allocation " << n << " failed";
        EXPECT_EQ(err, AMRNB_ERR_NO_MEMORY) << n;
        EXPECT_EQ(live, 0) << "blocks left behind when allocation " << n << " failed";
        if (inst != nullptr) destroy(inst);

        // Without an error word the failure is the same, only not reported.
        heap = {true, n, 0, 0};
        inst = create(&config, nullptr);
        heap.armed = false;
        EXPECT_EQ(inst, nullptr) << n;
        EXPECT_EQ(heap.live, 0) << n;
        if (inst != nullptr) destroy(inst);
    }
    // Both records come from the heap: the instance and its working record.
    EXPECT_EQ(reached, 2);
}

}  // namespace

TEST(AllocFailure, EncoderCreateFailsCleanlyAtEveryAllocation) {
    for (int32_t dtx : {0, 1}) {
        codec_config c{};
        c.enc.dtx = dtx;
        c.enc.mode = MR795;
        fail_each_allocation(c, vamrnbe_create, vamrnbe_delete);
    }
}

TEST(AllocFailure, DecoderCreateFailsCleanlyAtEveryAllocation) {
    codec_config c{};
    c.dec.layout = 1;
    c.dec.channels = 1;
    fail_each_allocation(c, vamrnbd_create, vamrnbd_delete);

    // A decoder created after the failures decodes: the failed attempts left
    // nothing half-initialised behind.
    vamrnb_decoder *d = vamrnbd_create(&c, nullptr);
    ASSERT_NE(d, nullptr);
    uint8_t nodata = 0x7C, pcm[320];
    bitstream_buffer in{&nodata, 0, 1};
    pcm_buffer out{};
    out.data[0] = pcm;
    frame_info info{};
    EXPECT_EQ(vamrnbd_decode(d, &in, &out, &info), AMRNB_OK);
    EXPECT_EQ(info.bytes, 1u);
    vamrnbd_delete(d);
}
