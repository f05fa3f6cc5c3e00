// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cli/Request.h"

namespace quilt::cli {

/// Carries requests out. One operation a command; each throws a Failure when the command did not do all that was asked.
class Delegate {
 public:
  virtual ~Delegate() = default;

  virtual void perform(const ImportRequest& request) = 0;
  virtual void perform(const ListRequest& request) = 0;
  virtual void perform(const ShowRequest& request) = 0;
  virtual void perform(const InfoRequest& request) = 0;
  virtual void perform(const NewCollectionRequest& request) = 0;
  virtual void perform(const NewDocumentRequest& request) = 0;
  virtual void perform(const SetRequest& request) = 0;
  virtual void perform(const AddRequest& request) = 0;
  virtual void perform(const MoveRequest& request) = 0;
  virtual void perform(const ConvertRequest& request) = 0;
  virtual void perform(const RemoveRequest& request) = 0;
  virtual void perform(const ExportRequest& request) = 0;
  virtual void perform(const FinalizeRequest& request) = 0;
  virtual void perform(const BuildRequest& request) = 0;
  virtual void perform(const ThemesRequest& request) = 0;
  virtual void perform(const CheckRequest& request) = 0;
  virtual void perform(const ServeRequest& request) = 0;
  virtual void perform(const DoctorRequest& request) = 0;
  virtual void perform(const HelpRequest& request) = 0;
  virtual void perform(const VersionRequest& request) = 0;
};

inline void dispatch(const Command& command, Delegate& delegate) {
  std::visit([&delegate](const auto& request) { delegate.perform(request); }, command);
}

/// Keeps what it was asked, and does nothing.
class RecordingDelegate final : public Delegate {
 public:
  void perform(const ImportRequest& request) override { commands.emplace_back(request); }
  void perform(const ListRequest& request) override { commands.emplace_back(request); }
  void perform(const ShowRequest& request) override { commands.emplace_back(request); }
  void perform(const InfoRequest& request) override { commands.emplace_back(request); }
  void perform(const NewCollectionRequest& request) override { commands.emplace_back(request); }
  void perform(const NewDocumentRequest& request) override { commands.emplace_back(request); }
  void perform(const SetRequest& request) override { commands.emplace_back(request); }
  void perform(const AddRequest& request) override { commands.emplace_back(request); }
  void perform(const MoveRequest& request) override { commands.emplace_back(request); }
  void perform(const ConvertRequest& request) override { commands.emplace_back(request); }
  void perform(const RemoveRequest& request) override { commands.emplace_back(request); }
  void perform(const ExportRequest& request) override { commands.emplace_back(request); }
  void perform(const FinalizeRequest& request) override { commands.emplace_back(request); }
  void perform(const BuildRequest& request) override { commands.emplace_back(request); }
  void perform(const ThemesRequest& request) override { commands.emplace_back(request); }
  void perform(const CheckRequest& request) override { commands.emplace_back(request); }
  void perform(const ServeRequest& request) override { commands.emplace_back(request); }
  void perform(const DoctorRequest& request) override { commands.emplace_back(request); }
  void perform(const HelpRequest& request) override { commands.emplace_back(request); }
  void perform(const VersionRequest& request) override { commands.emplace_back(request); }

  std::vector<Command> commands;
};

}  // namespace quilt::cli
