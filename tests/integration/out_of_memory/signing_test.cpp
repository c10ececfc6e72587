// SPDX-License-Identifier: Apache-2.0
// Whichever allocation fails while a message gets a token or a signature: either the call succeeds, or it reports that there is
// no memory, and the message is as it was.
#include "integration/out_of_memory/failing_heap.h"
#include "support/fixed_environment.h"
#include "support/sample_message.h"
#include "support/xml_tree.h"

#include <ssoclient/proof/sign_message.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <new>
#include <string>

namespace {

using Testing::DescribeTree;
using Testing::ParseDocument;
using Testing::SampleMessage;
using Testing::Shortage;

using Change = std::function<void(Tarvel::Xml::Document &)>;

const char CHANGED[] = "changed";
const char UNCHANGED[] = "no memory, unchanged";

/// Memory of C++ that runs out.
class Heap {
public:
  Heap(int allocations, Shortage shortage) : m_heap(allocations, shortage) {}
  void End() noexcept { m_heap.End(); }
  bool HasFailed() const noexcept { return m_heap.HasFailed(); }

private:
  Testing::FailingHeap m_heap;
};

/// Memory of OpenSSL that runs out. It does not matter to the rest of the test, so it need not end.
class ForeignMemory {
public:
  ForeignMemory(int allocations, Shortage shortage) : m_memory(allocations + 1, shortage) {}
  void End() noexcept {}
  bool HasFailed() const noexcept { return m_memory.HasFailed(); }

private:
  Testing::FailingMemory m_memory;
};

/// CHANGED, UNCHANGED, or what else happened.
template <typename Memory>
std::string OutcomeOf(const Change &change, const std::string &message, Memory &memory,
                      const Tarvel::Ref<Tarvel::Xml::Document> &document) {
  std::string outcome;
  try {
    change(*document);
    memory.End();
    return CHANGED;
  } catch (const std::bad_alloc &) {
    memory.End();
  } catch (const Tarvel::OutOfMemoryException &) {
    memory.End();
  } catch (const std::exception &failure) {
    memory.End();
    return failure.what();
  }
  const std::string before = DescribeTree(*ParseDocument(message)->GetDocumentNode());
  return DescribeTree(*document->GetDocumentNode()) == before ? UNCHANGED : "no memory, changed in part";
}

/// Changes the message with each allocation failing in turn, until none is left to fail. Counts the outcomes.
template <typename Memory>
std::map<std::string, int> Sweep(const Change &change, const std::string &message, Shortage shortage) {
  std::map<std::string, int> outcomes;
  for (int allocations = 0;; ++allocations) {
    const auto document = ParseDocument(message);
    Memory memory(allocations, shortage);
    const std::string outcome = OutcomeOf(change, message, memory, document);
    ++outcomes[outcome];
    if (!memory.HasFailed()) {
      return outcomes;
    }
  }
}

template <typename Memory>
void ExpectChangedOrUnchanged(const Change &change, int fewest) {
  const std::string security = Testing::SampleSecurity("<o:X/>");
  for (const std::string &message : {Testing::SampleEnvelope("<s:Body/>"), SampleMessage(security)}) {
    change(*ParseDocument(message)); // makes what is made once per process
    for (const Shortage shortage : {Shortage::ONCE, Shortage::FROM_THEN}) {
      std::map<std::string, int> outcomes = Sweep<Memory>(change, message, shortage);
      EXPECT_GE(outcomes[CHANGED], 1);
      EXPECT_GE(outcomes[UNCHANGED], fewest);
      outcomes.erase(CHANGED);
      outcomes.erase(UNCHANGED);
      EXPECT_EQ(outcomes, (std::map<std::string, int>{}));
    }
  }
}

TEST(AttachToken, LeavesTheMessageAsItWasWhenMemoryRunsOut) {
  const Testing::FixedEnvironment environment;
  const auto token = Testing::SampleToken("tokens/bearer");
  ExpectChangedOrUnchanged<Heap>([&](Tarvel::Xml::Document &document) { AttachToken(document, *token); }, 20);
}

TEST(SignMessage, LeavesTheMessageAsItWasWhenMemoryRunsOut) {
  const auto token = Testing::SampleToken("tokens/holder-of-key");
  const auto key = Testing::SampleKey("holder");
  const Change sign = [&](Tarvel::Xml::Document &document) { SignMessage(document, *token, *key); };
  ExpectChangedOrUnchanged<Heap>(sign, 50);
  ExpectChangedOrUnchanged<ForeignMemory>(sign, 1);
}

} // namespace
