#include "tarn/Threads/AtomicStack.h"

#include <algorithm>

#include "ThreadsTestUtil.h"

namespace tarn {
namespace {

struct Node {
  void* link = nullptr;
  int id = 0;
  std::atomic<int> holders{0};  // how many threads believe they hold it
};

std::vector<int> Walk(void* top) {
  std::vector<int> ids;
  for (void* n = top; n != nullptr; n = AtomicStackNext(n))
    ids.push_back(static_cast<Node*>(n)->id);
  return ids;
}

TEST(AtomicStack, LastInFirstOutDetachAndSplice) {
  AtomicStackHead head;
  EXPECT_EQ(DequeueAtomic(&head), nullptr);
  EXPECT_EQ(DetachAtomic(&head), nullptr);
  Node n[5];
  for (int i = 0; i < 5; ++i) n[i].id = i;
  for (int i = 0; i < 3; ++i) EnqueueAtomic(&head, &n[i]);
  EXPECT_EQ(DequeueAtomic(&head), &n[2]);
  EXPECT_EQ(Walk(DetachAtomic(&head)), (std::vector<int>{1, 0}));
  EnqueueAtomic(&head, &n[1]);
  n[4].link = &n[3];  // a chain 4 -> 3 -> 2 whose tail link is garbage
  n[3].link = &n[2];
  n[2].link = &n[0];
  SpliceAtomic(&head, &n[4], &n[2]);
  SpliceAtomic(&head, DetachAtomic(&head), &n[1]);
  EXPECT_EQ(Walk(head.top), (std::vector<int>{4, 3, 2, 1}));
  EXPECT_EQ(head.generation, 9u);  // one per successful change of the head
}

// Many threads pop nodes, check that nobody else holds them, and push them
// back alone or as short chains; at the end every node is on the stack once.
TEST(AtomicStackStress, ConcurrentPushPopDetachSpliceKeepsEveryNodeOnce) {
  constexpr int kNodes = 64, kRounds = 60000;
  std::vector<Node> nodes(kNodes);
  AtomicStackHead head;
  for (int i = 0; i < kNodes; ++i) {
    nodes[static_cast<size_t>(i)].id = i;
    EnqueueAtomic(&head, &nodes[static_cast<size_t>(i)]);
  }
  std::atomic<bool> doubleHold{false};
  auto holdAndRelease = [&](const std::vector<void*>& held) {
    for (void* n : held)
      if (n && static_cast<Node*>(n)->holders++ != 0) doubleHold = true;
    for (void* n : held)
      if (n) static_cast<Node*>(n)->holders--;
  };
  test::RunThreads(4, [&](int t) {
    for (int round = 0; round < kRounds; ++round) {
      if (round % 97 == 0) {  // take everything, give it back in one splice
        void* chain = DetachAtomic(&head);
        std::vector<void*> held;
        for (void* n = chain; n != nullptr; n = AtomicStackNext(n)) held.push_back(n);
        holdAndRelease(held);
        if (chain) SpliceAtomic(&head, chain, held.back());
        continue;
      }
      auto* a = static_cast<Node*>(DequeueAtomic(&head));
      auto* b = static_cast<Node*>(DequeueAtomic(&head));
      holdAndRelease({a, b});
      if (a && b && (round + t) % 2 == 0) {
        // A chain a -> b (b's link is set by the splice); a stale popper may
        // still be reading a's link, hence the atomic store.
        std::atomic_ref<void*>(a->link).store(b, std::memory_order_relaxed);
        SpliceAtomic(&head, a, b);
      } else {
        if (b) EnqueueAtomic(&head, b);
        if (a) EnqueueAtomic(&head, a);
      }
    }
  });
  EXPECT_FALSE(doubleHold.load());
  std::vector<int> ids = Walk(head.top), all(kNodes);
  std::sort(ids.begin(), ids.end());
  std::iota(all.begin(), all.end(), 0);
  EXPECT_EQ(ids, all);
}

}  // namespace
}  // namespace tarn
