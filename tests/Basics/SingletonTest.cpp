#include "tarn/Basics/Singleton.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace {

using tarn::SingletonConstructor;
using tarn::SingletonManager;

// A constructor object in a private registry that logs what the manager asks.
class LoggingConstructor final : public SingletonConstructor {
 public:
  LoggingConstructor(SingletonManager& m, std::string name, std::string& log)
      : SingletonConstructor(m), fName(std::move(name)), fLog(log) {}
  void ConstructSingleton() override { fLog += "c" + fName; }
  void DestroySingleton() noexcept override { fLog += "d" + fName; }
  void Register() { RegisterForDestruction(); }

 private:
  std::string fName;
  std::string& fLog;
};

TEST(SingletonManager, ConstructsLastRegisteredFirstAndOnlyOnce) {
  std::string log;
  SingletonManager m;
  EXPECT_EQ(m.GetState(), SingletonManager::kIdle);
  LoggingConstructor a(m, "A", log), b(m, "B", log), c(m, "C", log);
  m.ConstructAll();
  EXPECT_EQ(log, "cCcBcA");
  EXPECT_EQ(m.GetState(), SingletonManager::kConstructed);
  m.ConstructAll();
  EXPECT_EQ(log, "cCcBcA");
  LoggingConstructor d(m, "D", log);  // registered after the list was consumed
  EXPECT_EQ(log, "cCcBcA");
  m.ConstructAll();
  EXPECT_EQ(log, "cCcBcAcD");
}

TEST(SingletonManager, DestroysInReverseOrderOfRegistrationAndSkipsUnregistered) {
  std::string log;
  auto m = std::make_unique<SingletonManager>();
  LoggingConstructor a(*m, "A", log), b(*m, "B", log), never(*m, "N", log), c(*m, "C", log);
  a.Register();
  c.Register();
  b.Register();
  m->DestroyAll();
  EXPECT_EQ(m->GetState(), SingletonManager::kDestroying);
  EXPECT_EQ(log, "dBdCdA");
  m->DestroyAll();  // list consumed: nothing twice
  EXPECT_EQ(log, "dBdCdA");
  a.Register();
  m.reset();  // the manager's destruction destroys what is still registered
  EXPECT_EQ(log, "dBdCdAdA");
}

std::string gOrder;

struct First {
  First() { gOrder += "+1"; }
  ~First() { gOrder += "-1"; }
  int value = 11;
};
struct Second {
  Second() { gOrder += "+2"; }
  ~Second() { gOrder += "-2"; }
};

class PrivateCtor {
  friend class tarn::Singleton<PrivateCtor>;
  PrivateCtor() = default;

 public:
  int calls = 0;
};

TEST(Singleton, CreatedOnFirstUseOnceAndSameInstanceEverywhere) {
  EXPECT_EQ(tarn::Singleton<First>::InstanceIfExists(), nullptr);
  First& f = tarn::Singleton<First>::Instance();
  EXPECT_EQ(&f, &tarn::Singleton<First>::Instance());
  EXPECT_EQ(&f, tarn::Singleton<First>::InstanceIfExists());
  EXPECT_EQ(f.value, 11);
  EXPECT_EQ(gOrder, "+1");
  (void)tarn::Singleton<Second>::Instance();
  EXPECT_EQ(gOrder, "+1+2");
  tarn::Singleton<PrivateCtor>::Instance().calls++;
  EXPECT_EQ(tarn::Singleton<PrivateCtor>::Instance().calls, 1);
}

struct Contended {
  Contended() { ++constructions; }
  static inline std::atomic<int> constructions{0};
};

TEST(Singleton, ConcurrentFirstUseBuildsOneInstance) {
  std::vector<std::thread> threads;
  std::vector<Contended*> seen(8);
  for (int i = 0; i < 8; ++i)
    threads.emplace_back([&seen, i] { seen[i] = &tarn::Singleton<Contended>::Instance(); });
  for (auto& t : threads) t.join();
  EXPECT_EQ(Contended::constructions.load(), 1);
  for (Contended* p : seen) EXPECT_EQ(p, seen[0]);
}

struct BuiltByConstructAll {
  BuiltByConstructAll() { built = true; }
  static inline bool built = false;
};

// Referencing Instance() anywhere registers the singleton at start-up, so
// ConstructAll of the process-wide manager builds it before first use.
[[maybe_unused]] BuiltByConstructAll& (*gKeep)() = &tarn::Singleton<BuiltByConstructAll>::Instance;

TEST(Singleton, ProcessManagerConstructAllBuildsRegisteredSingletons) {
  EXPECT_FALSE(BuiltByConstructAll::built);
  SingletonManager::Instance().ConstructAll();
  EXPECT_TRUE(BuiltByConstructAll::built);
  EXPECT_NE(tarn::Singleton<BuiltByConstructAll>::InstanceIfExists(), nullptr);
}

}  // namespace
