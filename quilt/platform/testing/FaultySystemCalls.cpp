// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/testing/FaultySystemCalls.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>

namespace quilt::platform {

void FaultySystemCalls::failNth(std::size_t n, int error, Repeat repeat) {
  const std::lock_guard guard(_mutex);
  _failAt = _calls.size() + n;
  _failure = error;
  _repeat = repeat;
}

void FaultySystemCalls::failEvery(Call call, int error) {
  const std::lock_guard guard(_mutex);
  _failing[call] = error;
}

void FaultySystemCalls::dieAtNth(std::size_t n) {
  const std::lock_guard guard(_mutex);
  _dieAt = _calls.size() + n;
}

void FaultySystemCalls::transferAtMost(std::size_t count) {
  const std::lock_guard guard(_mutex);
  _transferAtMost = count;
}

std::vector<FaultySystemCalls::Call> FaultySystemCalls::calls() const {
  const std::lock_guard guard(_mutex);
  return _calls;
}

bool FaultySystemCalls::admit(Call call) {
  const std::lock_guard guard(_mutex);
  _calls.push_back(call);
  const std::size_t n = _calls.size();
  if (n == _dieAt) ::_exit(kExitStatusWhenKilled);
  const auto failing = _failing.find(call);
  const bool isNth = _failAt != 0 && (n == _failAt || (n > _failAt && _repeat == Repeat::ForEver));
  if (isNth) errno = _failure;
  if (failing != _failing.end()) errno = failing->second;
  return !isNth && failing == _failing.end();
}

std::size_t FaultySystemCalls::shortened(std::size_t count) const {
  const std::lock_guard guard(_mutex);
  return _transferAtMost == 0 ? count : std::min(count, _transferAtMost);
}

int FaultySystemCalls::openAt(int folder, const char* name, int flags, mode_t mode) {
  return admit(Call::Open) ? SystemCalls::openAt(folder, name, flags, mode) : -1;
}

int FaultySystemCalls::openBeneath(int folder, const char* path, int flags) {
  return admit(Call::OpenBeneath) ? SystemCalls::openBeneath(folder, path, flags) : -1;
}

// A close that fails closes nevertheless.
int FaultySystemCalls::close(int file) {
  const int answer = SystemCalls::close(file);
  return admit(Call::Close) ? answer : -1;
}

ssize_t FaultySystemCalls::read(int file, void* bytes, std::size_t count) {
  return admit(Call::Read) ? SystemCalls::read(file, bytes, shortened(count)) : -1;
}

ssize_t FaultySystemCalls::write(int file, const void* bytes, std::size_t count) {
  return admit(Call::Write) ? SystemCalls::write(file, bytes, shortened(count)) : -1;
}

ssize_t FaultySystemCalls::copyFileRange(int from, int to, std::size_t count) {
  return admit(Call::CopyFileRange) ? SystemCalls::copyFileRange(from, to, shortened(count)) : -1;
}

int FaultySystemCalls::cloneFile(int from, int to) {
  return admit(Call::CloneFile) ? SystemCalls::cloneFile(from, to) : -1;
}

int FaultySystemCalls::truncate(int file, off_t size) {
  return admit(Call::Truncate) ? SystemCalls::truncate(file, size) : -1;
}

int FaultySystemCalls::sync(int file) { return admit(Call::Sync) ? SystemCalls::sync(file) : -1; }

int FaultySystemCalls::setLock(int file, short kind) {
  return admit(Call::Lock) ? SystemCalls::setLock(file, kind) : -1;
}

int FaultySystemCalls::setWholeLock(int file, int operation) {
  return admit(Call::WholeLock) ? SystemCalls::setWholeLock(file, operation) : -1;
}

int FaultySystemCalls::changeMode(int file, mode_t mode) {
  return admit(Call::ChangeMode) ? SystemCalls::changeMode(file, mode) : -1;
}

int FaultySystemCalls::setTimes(int file, const timespec times[2]) {
  return admit(Call::SetTimes) ? SystemCalls::setTimes(file, times) : -1;
}

int FaultySystemCalls::setExtendedAttribute(int file, const char* name, const void* value, std::size_t size) {
  return admit(Call::SetExtendedAttribute) ? SystemCalls::setExtendedAttribute(file, name, value, size) : -1;
}

int FaultySystemCalls::makeFolderAt(int folder, const char* name, mode_t mode) {
  return admit(Call::MakeFolder) ? SystemCalls::makeFolderAt(folder, name, mode) : -1;
}

int FaultySystemCalls::makeLinkAt(const char* target, int folder, const char* name) {
  return admit(Call::MakeLink) ? SystemCalls::makeLinkAt(target, folder, name) : -1;
}

int FaultySystemCalls::renameAt(int fromFolder, const char* from, int toFolder, const char* to, unsigned flags) {
  const Call call = flags == 0 ? Call::Rename : Call::RenameIfFree;
  return admit(call) ? SystemCalls::renameAt(fromFolder, from, toFolder, to, flags) : -1;
}

int FaultySystemCalls::unlinkAt(int folder, const char* name, int flags) {
  return admit(Call::Unlink) ? SystemCalls::unlinkAt(folder, name, flags) : -1;
}

}  // namespace quilt::platform
