#include "platform/testing/FakeURLSession.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace zelkord {

FakeURLSession::FakeURLSession(WorkQueues& queues, URLSessionConfiguration configuration,
                               FakeFileManager* files)
    : configuration_(std::move(configuration)), shared_(std::make_shared<FakeURLTask::Session>()) {
  shared_->files = files;
  shared_->queue = queues.makeSerialQueue("url." + configuration_.name);
}

std::vector<std::shared_ptr<FakeURLTask>> FakeURLSession::tasks() const {
  const MutexLock lock(mutex_);
  return tasks_;
}

std::vector<std::shared_ptr<FakeURLTask>> FakeURLSession::pending() const {
  std::vector<std::shared_ptr<FakeURLTask>> waiting;
  std::ranges::copy_if(tasks(), std::back_inserter(waiting), &FakeURLTask::isPending,
                       [](const auto& task) -> const FakeURLTask& { return *task; });
  return waiting;
}

void FakeURLSession::forgetTasks() {
  const MutexLock lock(mutex_);
  tasks_.clear();
}

int FakeURLSession::purges() const {
  const MutexLock lock(mutex_);
  return purges_;
}

std::vector<std::string> FakeURLSession::endedIdentities() const {
  const MutexLock lock(mutex_);
  return endedIdentities_;
}

void FakeURLSession::setOnResume(std::function<void(FakeURLTask&)> handler) {
  shared_->onResume = std::move(handler);
}

void FakeURLSession::setProxyError(std::optional<Error> error) {
  shared_->proxyError = std::move(error);
}

std::shared_ptr<URLTask> FakeURLSession::dataTask(URLRequest request, URLCompletion completion) {
  return _makeTask(std::move(request), std::move(completion));
}

std::shared_ptr<URLTask> FakeURLSession::downloadTask(URLRequest request,
                                                      URLCompletion completion) {
  auto task = _makeTask(std::move(request), std::move(completion));
  task->setDownload();
  return task;
}

std::shared_ptr<FakeURLTask> FakeURLSession::_makeTask(URLRequest request,
                                                       URLCompletion completion) {
  auto task = std::make_shared<FakeURLTask>(shared_, std::move(request), std::move(completion));
  const MutexLock lock(mutex_);
  tasks_.push_back(task);
  return task;
}

void FakeURLSession::purgeMemoryCache() {
  const MutexLock lock(mutex_);
  ++purges_;
}

void FakeURLSession::endIdentity(const std::string& identity) {
  const MutexLock lock(mutex_);
  endedIdentities_.push_back(identity);
}

}  // namespace zelkord
