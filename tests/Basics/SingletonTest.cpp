#include "tarn/Basics/Singleton.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace tarn;

// A constructor object in a private registry that logs what the manager asks.
struct LoggingConstructor final : SingletonConstructor {
  LoggingConstructor(SingletonManager& m, std::string name, std::string& log)
      : SingletonConstructor(m), fName(std::move(name)), fLog(log) {}
  void ConstructSingleton() override { fLog += "c" + fName; }
  void DestroySingleton() noexcept override { fLog += "d" + fName; }
  void Register() { RegisterForDestruction(); }
  std::string fName;
  std::string& fLog;
};

// Construction runs last registered first, once; destruction runs in reverse
// order of registration, skips the unregistered and happens once.
TEST(SingletonManager, ConstructionAndDestructionOrder) {
  std::string log;
  auto m = std::make_unique<SingletonManager>();
  EXPECT_EQ(m->GetState(), SingletonManager::kIdle);
  LoggingConstructor a(*m, "A", log), b(*m, "B", log), never(*m, "N", log), c(*m, "C", log);
  m->ConstructAll();
  m->ConstructAll();  // the list is consumed
  EXPECT_EQ(m->GetState(), SingletonManager::kConstructed);
  LoggingConstructor d(*m, "D", log);  // registered after the list was consumed
  EXPECT_EQ(log, "cCcNcBcA");
  m->ConstructAll();
  EXPECT_EQ(log, "cCcNcBcAcD");
  for (LoggingConstructor* r : {&a, &c, &b}) r->Register();
  m->DestroyAll();
  m->DestroyAll();
  EXPECT_EQ(m->GetState(), SingletonManager::kDestroying);
  EXPECT_EQ(log, "cCcNcBcAcDdBdCdA");
  a.Register();
  m.reset();  // the manager's destruction destroys what is still registered
  EXPECT_EQ(log, "cCcNcBcAcDdBdCdAdA");
}

// Built once, on first use, even when first used by many threads at once; a
// private constructor is enough when the singleton is a friend.
class Contended {
  friend class tarn::Singleton<Contended>;
  Contended() { ++constructions; }

 public:
  static inline std::atomic<int> constructions{0};
};

TEST(Singleton, ConcurrentFirstUseBuildsOneInstance) {
  EXPECT_EQ(Singleton<Contended>::InstanceIfExists(), nullptr);
  std::vector<std::thread> threads;
  std::vector<Contended*> seen(8);
  for (int i = 0; i < 8; ++i)
    threads.emplace_back([&seen, i] { seen[i] = &Singleton<Contended>::Instance(); });
  for (auto& t : threads) t.join();
  EXPECT_EQ(Contended::constructions.load(), 1);
  for (Contended* p : seen)
    EXPECT_TRUE(p == &Singleton<Contended>::Instance() &&
                p == Singleton<Contended>::InstanceIfExists());
}

struct BuiltByConstructAll {
  BuiltByConstructAll() { built = true; }
  static inline bool built = false;
};

// Referencing Instance() anywhere registers the singleton at start-up, so
// ConstructAll of the process-wide manager builds it before first use.
[[maybe_unused]] BuiltByConstructAll& (*gKeep)() = &Singleton<BuiltByConstructAll>::Instance;

TEST(Singleton, ProcessManagerConstructAllBuildsRegisteredSingletons) {
  EXPECT_FALSE(BuiltByConstructAll::built);
  SingletonManager::Instance().ConstructAll();
  EXPECT_TRUE(BuiltByConstructAll::built && Singleton<BuiltByConstructAll>::InstanceIfExists());
}

}  // namespace
