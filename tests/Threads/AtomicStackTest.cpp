#include "tarn/Threads/AtomicStack.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <thread>
#include <vector>

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

TEST(AtomicStack, PopOfEmptyIsNullAndOrderIsLastInFirstOut) {
  AtomicStackHead head;
  EXPECT_EQ(reinterpret_cast<uintptr_t>(&head) % 16, 0u);
  EXPECT_EQ(DequeueAtomic(&head), nullptr);
  EXPECT_EQ(DetachAtomic(&head), nullptr);
  EXPECT_EQ(head.generation, 0u);

  Node a, b, c;
  a.id = 1, b.id = 2, c.id = 3;
  EnqueueAtomic(&head, &a);
  EnqueueAtomic(&head, &b);
  EnqueueAtomic(&head, &c);
  EXPECT_EQ(head.generation, 3u);
  EXPECT_EQ(DequeueAtomic(&head), &c);
  EXPECT_EQ(DequeueAtomic(&head), &b);
  EXPECT_EQ(DequeueAtomic(&head), &a);
  EXPECT_EQ(DequeueAtomic(&head), nullptr);
  EXPECT_EQ(head.generation, 6u);
}

TEST(AtomicStack, DetachTakesTheWholeChain) {
  AtomicStackHead head;
  Node a, b, c;
  a.id = 1, b.id = 2, c.id = 3;
  EnqueueAtomic(&head, &a);
  EnqueueAtomic(&head, &b);
  EnqueueAtomic(&head, &c);
  void* chain = DetachAtomic(&head);
  EXPECT_EQ(Walk(chain), (std::vector<int>{3, 2, 1}));
  EXPECT_EQ(head.top, nullptr);
  EXPECT_EQ(DequeueAtomic(&head), nullptr);
}

TEST(AtomicStack, SplicePushesAChainAboveTheOldTop) {
  AtomicStackHead head;
  Node n[5];
  for (int i = 0; i < 5; ++i) n[i].id = i;
  EnqueueAtomic(&head, &n[0]);
  // A ready-made chain 4 -> 3 -> 2 whose tail link is garbage.
  n[4].link = &n[3];
  n[3].link = &n[2];
  n[2].link = &n[1];
  SpliceAtomic(&head, &n[4], &n[2]);
  EXPECT_EQ(Walk(head.top), (std::vector<int>{4, 3, 2, 0}));
  EXPECT_EQ(head.generation, 2u);
  // Splicing a detached chain back restores it.
  void* all = DetachAtomic(&head);
  SpliceAtomic(&head, all, &n[0]);
  EXPECT_EQ(Walk(head.top), (std::vector<int>{4, 3, 2, 0}));
}

// Many threads pop nodes, check that nobody else holds them, and push them
// back alone or as short chains; at the end every node is on the stack once.
TEST(AtomicStackStress, ConcurrentPushPopDetachSpliceKeepsEveryNodeOnce) {
  constexpr int kNodes = 64;
  constexpr int kThreads = 4;
  constexpr int kRounds = 60000;
  std::vector<Node> nodes(kNodes);
  AtomicStackHead head;
  for (int i = 0; i < kNodes; ++i) {
    nodes[static_cast<size_t>(i)].id = i;
    EnqueueAtomic(&head, &nodes[static_cast<size_t>(i)]);
  }
  std::atomic<bool> doubleHold{false};
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&, t] {
      for (int round = 0; round < kRounds; ++round) {
        if (round % 97 == 0) {
          // Take everything, then give it back in one splice.
          void* chain = DetachAtomic(&head);
          if (chain == nullptr) continue;
          void* last = chain;
          for (void* n = chain; n != nullptr; n = AtomicStackNext(n)) {
            if (static_cast<Node*>(n)->holders.fetch_add(1) != 0) doubleHold = true;
            last = n;
          }
          for (void* n = chain; n != nullptr; n = AtomicStackNext(n))
            static_cast<Node*>(n)->holders.fetch_sub(1);
          SpliceAtomic(&head, chain, last);
          continue;
        }
        auto* a = static_cast<Node*>(DequeueAtomic(&head));
        auto* b = static_cast<Node*>(DequeueAtomic(&head));
        for (Node* n : {a, b})
          if (n && n->holders.fetch_add(1) != 0) doubleHold = true;
        for (Node* n : {a, b})
          if (n) n->holders.fetch_sub(1);
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
  }
  for (auto& th : threads) th.join();
  EXPECT_FALSE(doubleHold.load());
  std::vector<int> ids = Walk(head.top);
  std::sort(ids.begin(), ids.end());
  std::vector<int> all(kNodes);
  for (int i = 0; i < kNodes; ++i) all[static_cast<size_t>(i)] = i;
  EXPECT_EQ(ids, all);
}

}  // namespace
}  // namespace tarn
