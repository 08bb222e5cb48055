#include "renderer/mbuffer/fragment_pool.h"

#include "renderer/scene/messages.h"
#include "u_memory.h"

namespace {

void*& LinkWord(void* block) {
    return *static_cast<void**>(block);
}

}  // namespace

SY_FragmentPool::SY_FragmentPool(SY_AllocationLock* shared)
    : currentBlock(this),
      allocName(SY_LookupString(SY_Message::kFragments)),
      lock(shared ? shared : &ownLock) {}

SY_FragmentPool::~SY_FragmentPool() {
    SY_AllocationLockScope scope(lock);
    for (void* block = firstBlock; block;) {
        void* next = LinkWord(block);
        U_FreePtr(block);
        U_AccountAllocationEx(kSY_FragmentBlockBytes, 0);
        block = next;
    }
}

void SY_FragmentPool::ChainBlock() {
    void* block;
    {
        SY_AllocationLockScope scope(lock);
        block = U_AllocatePtr(allocTag, allocName, kSY_FragmentBlockBytes);
        LinkWord(currentBlock) = block;
    }
    if (!block) throw kU_ErrOutOfMemory;
    U_AccountAllocationEx(kSY_FragmentBlockBytes, 1);
    currentBlock = block;
    LinkWord(block) = nullptr;
    nextFree = static_cast<char*>(block) + sizeof(void*);
    bytesLeft = kSY_FragmentRecordBytes;
}
