// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Session.h"

#include "quilt/scripting/Accessor.h"
#include "quilt/scripting/bridge/Secret.h"

namespace quilt::scripting {

void Session::Changes::add(Handle handle, const ChangedAccessors& changed) {
  {
    const std::lock_guard guard(mutex);
    Change& change = pending[handle];
    change.handle = handle;
    change.accessors.insert(changed.accessors.begin(), changed.accessors.end());
  }
  arrived.notify_all();
}

std::optional<Session::Handle> Session::handleOf(const std::shared_ptr<platform::Object>& object) {
  const ExposedClass* type = exposedClassOf(*object);
  if (!type) return std::nullopt;
  const std::lock_guard guard(_mutex);
  if (const auto known = _handles.find(object.get()); known != _handles.end()) {
    if (_held[known->second].object.lock() == object) return known->second;
    forgetTheDead();  // another object at the address of a dead one
  }
  if (_held.size() >= _maximumObjects) forgetTheDead();
  if (_held.size() >= _maximumObjects) return std::nullopt;

  const Handle handle = ++_last;
  Held held{object, object.get(), {}};
  for (const ChangedAccessors& changed : changedAccessors())
    if (changed.className == type->name)
      held.observations.push_back(object->observe(
          changed.key,
          [changes = _changes, handle, &changed](const platform::ChangeNotice&) { changes->add(handle, changed); }));
  _handles[object.get()] = handle;
  _held.emplace(handle, std::move(held));
  return handle;
}

std::shared_ptr<platform::Object> Session::object(Handle handle) const {
  const std::lock_guard guard(_mutex);
  const auto found = _held.find(handle);
  return found == _held.end() ? nullptr : found->second.object.lock();
}

void Session::forgetTheDead() {
  std::erase_if(_handles, [this](const auto& entry) { return _held[entry.second].object.expired(); });
  std::erase_if(_held, [](const auto& entry) { return entry.second.object.expired(); });
}

std::optional<std::vector<Session::Change>> Session::takeChanges(std::chrono::milliseconds within) {
  std::unique_lock lock(_changes->mutex);
  _changes->arrived.wait_for(lock, within, [this] { return _changes->isClosed || !_changes->pending.empty(); });
  if (_changes->isClosed) return std::nullopt;
  std::vector<Change> taken;
  for (auto& [handle, change] : _changes->pending) taken.push_back(std::move(change));
  _changes->pending.clear();
  return taken;
}

void Session::close() {
  {
    const std::lock_guard guard(_changes->mutex);
    _changes->isClosed = true;
  }
  _changes->arrived.notify_all();
}

std::optional<std::string> Sessions::open() {
  std::string identity = makeSecret();
  std::shared_ptr<Session> givesWay;  // its observations end after the guard
  {
    const std::lock_guard guard(_mutex);
    if (_sessions.size() >= _maximum) {
      auto oldest = _sessions.end();
      for (auto entry = _sessions.begin(); entry != _sessions.end(); ++entry)
        if (!entry->second->isListening() &&
            (oldest == _sessions.end() || entry->second->lastUse() < oldest->second->lastUse()))
          oldest = entry;
      if (oldest == _sessions.end()) return std::nullopt;
      givesWay = std::move(oldest->second);
      _sessions.erase(oldest);
    }
    _sessions.emplace(identity, std::make_shared<Session>(_maximumObjects));
  }
  if (givesWay) givesWay->close();
  return identity;
}

std::shared_ptr<Session> Sessions::find(std::string_view identity) const {
  const std::lock_guard guard(_mutex);
  const auto found = _sessions.find(identity);
  if (found == _sessions.end()) return nullptr;
  found->second->touch();
  return found->second;
}

void Sessions::close(std::string_view identity) {
  std::shared_ptr<Session> closed;  // its observations end after the guard
  {
    const std::lock_guard guard(_mutex);
    const auto found = _sessions.find(identity);
    if (found == _sessions.end()) return;
    closed = std::move(found->second);
    _sessions.erase(found);
  }
  closed->close();
}

void Sessions::closeAll() {
  std::map<std::string, std::shared_ptr<Session>, std::less<>> closed;
  {
    const std::lock_guard guard(_mutex);
    closed.swap(_sessions);
  }
  for (const auto& [identity, session] : closed) session->close();
}

void Sessions::expire() {
  std::vector<std::string> idle;
  {
    const std::lock_guard guard(_mutex);
    for (const auto& [identity, session] : _sessions)
      if (session->isIdle(_idle)) idle.push_back(identity);
  }
  for (const std::string& identity : idle) close(identity);
}

std::size_t Sessions::count() const {
  const std::lock_guard guard(_mutex);
  return _sessions.size();
}

}  // namespace quilt::scripting
