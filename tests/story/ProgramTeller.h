// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>

#include "tests/story/Teller.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::story {

/// Tells a story as a user does: a process for each command. One in a few is killed, or interrupted, on its way.
class ProgramTeller final : public Teller {
 public:
  ProgramTeller(Path library, Path theme) : _library(std::move(library)), _theme(std::move(theme)) {}

  Outcome newDocument(const std::string& title, const Path& theme) override;
  Outcome importFile(const Path& file) override;
  Outcome removeDocument(const Document& document) override;
  Outcome setTitle(const Document& document, const std::string& title) override;
  Outcome setDescription(const Document& document, const std::string& description) override;
  Outcome setPoster(const Document& document, const Path& picture) override;
  Outcome convert(const Document& document, const std::string& format) override;
  Outcome finalize(const Document& document) override;
  Outcome exportTo(const Document& document, const Path& folder, bool zipped, Path& made) override;

  Outcome addItems(const Document& document, const std::vector<std::string>& sources) override;
  Outcome addComposition(const Document& document, const std::string& category, const std::string& title,
                         const std::vector<Path>& files) override;
  Outcome addExtra(const Document& document, const Item& item, const Path& file) override;
  Outcome setCommentary(const Document& document, const Item& item, const Path& file) override;
  Outcome setItemTitle(const Document& document, const Item& item, const std::string& title) override;
  Outcome removeItem(const Document& document, const Item& item) override;
  Outcome moveItem(const Document& document, std::size_t from, std::size_t to) override;

  Outcome bringEverythingIn() override { return {}; }
  Contents look() override;

  std::vector<Operation> ownOperations() override;
  bool stopNext(Dice& dice) override;
  void dontStop() override { _stop.reset(); }
  void goOn(const std::vector<Contents*>& contents) override;

 private:
  struct Stop {
    int signal;
    double moment;  ///< 0 to 1, of what such a command took the last time
  };

  Outcome run(const std::vector<std::string>& arguments, std::string* printed = nullptr);
  /// A command that must not be done, and says why.
  Outcome runRefused(const std::vector<std::string>& arguments);
  [[nodiscard]] Path packageOf(const Document& document) const;
  bool theThemeGoesAwayForAWhile(Story& story);
  bool finalizeBesideOwnNotes(Story& story);
  bool addADamagedFile(Story& story);

  const Path _library;
  const Path _theme;  ///< of the documents that it makes of itself
  std::optional<Stop> _stop;
  std::map<std::string, double> _seconds;  ///< what each command took the last time
  int _stops = 0;
};

}  // namespace quilt::story
