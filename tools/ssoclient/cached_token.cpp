// SPDX-License-Identifier: Apache-2.0

#include "cached_token.h"

#include "interruption.h"
#include "issue_watch.h"
#include "task_queue.h"

#include <tarvel/core/exception.h>
#include <tarvel/io/private_file.h>

#include <future>
#include <utility>

namespace SsoClient::Tool {
namespace {

/// Makes the main thread call `credential`, and waits for the result.
Credential AskMainThread(TaskQueue &tasks, const std::function<Credential()> &credential) {
  auto task = std::make_shared<std::packaged_task<Credential()>>(credential);
  std::future<Credential> result = task->get_future();
  tasks.Post([task = std::move(task)] { (*task)(); });
  return result.get(); // throws if the task was discarded
}

std::shared_ptr<const SamlToken> Get(const TokenSource &source, const std::shared_ptr<TaskQueue> &tasks) {
  const CallOptions callOptions = GetCallOptions();
  GetOptions options;
  options.deadline = callOptions.deadline;
  options.cancelToken = callOptions.cancelToken;
  options.executor = [tasks](std::function<void()> function) { tasks->Post(std::move(function)); };
  boost::optional<TokenOutcome> result;
  bool isDone = false;
  source.GetAsync(options, [&result, &isDone](const TokenOutcome &outcome) {
    result = outcome;
    isDone = true;
  });
  tasks->RunUntil(isDone);
  return result->Get();
}

IssuedToken GetFrom(const TokenSource &source, const CachedTokenCall &call, const std::shared_ptr<TaskQueue> &tasks) {
  std::shared_ptr<const SamlToken> token = Get(source, tasks);
  if (!call.watch->GetAskedAt() && !call.isAccepted(*token)) {
    source.Invalidate(token->GetId());
    token = Get(source, tasks);
  }
  return {token, call.watch->GetAskedAt()};
}

/// Warns if the file does not have the token: the library returns an issued token even if the file cannot be written.
void WarnUnlessKept(const std::string &path, const SamlToken &token) {
  boost::optional<std::string> content;
  try {
    content = Tarvel::PrivateFile(path).Read();
  } catch (const Tarvel::IOException &) { // the content stays empty
  }
  if (!content || content->find(token.GetId()) == std::string::npos) {
    Warn("the token could not be written to " + path + "; -v shows why");
  }
}

} // namespace

IssuedToken GetCachedToken(const CachedTokenCall &call) {
  const auto tasks = std::make_shared<TaskQueue>();
  const auto provider = [tasks, credential = call.credential] { return AskMainThread(*tasks, credential); };
  TokenSourceOptions options;
  options.cache = call.cache;
  AwaitReplacementOf(call.cache.path);
  try {
    const TokenSource source(call.client, provider, call.spec, options);
    IssuedToken issued = GetFrom(source, call, tasks);
    tasks->Close();
    if (issued.askedAt) {
      WarnUnlessKept(call.cache.path, *issued.token);
    }
    return issued;
  } catch (...) {
    tasks->Close();
    throw;
  }
}

} // namespace SsoClient::Tool
