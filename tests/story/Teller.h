// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "tests/story/Contents.h"

namespace quilt::story {

class Story;

/// How something ended that a teller did.
struct Outcome {
  bool isDone = true;
  bool wasStopped = false;  ///< killed or interrupted on the way
  std::string complaint{};  ///< why it is not done
};

/// Something that can happen in a story.
struct Operation {
  const char* name;
  std::size_t weight;  ///< how often it happens, beside the others
  /// Changes what must be there, and has the teller do it. False when there is nothing to do it with; nothing has
  /// changed then.
  std::function<bool(Story&)> tell;
};

/// Who does what a story tells: the library in this process, or the program.
class Teller {
 public:
  virtual ~Teller() = default;

  virtual Outcome newDocument(const std::string& title, const Path& theme) = 0;
  virtual Outcome importFile(const Path& file) = 0;
  virtual Outcome removeDocument(const Document& document) = 0;
  virtual Outcome setTitle(const Document& document, const std::string& title) = 0;
  virtual Outcome setDescription(const Document& document, const std::string& description) = 0;
  virtual Outcome setPoster(const Document& document, const Path& picture) = 0;
  virtual Outcome convert(const Document& document, const std::string& format) = 0;
  virtual Outcome finalize(const Document& document) = 0;
  /// Into a folder that is there; `made` becomes what was made.
  virtual Outcome exportTo(const Document& document, const Path& folder, bool zipped, Path& made) = 0;

  /// An item of each file or address.
  virtual Outcome addItems(const Document& document, const std::vector<std::string>& sources) = 0;
  /// One item of all of them.
  virtual Outcome addComposition(const Document& document, const std::string& category, const std::string& title,
                                 const std::vector<Path>& files) = 0;
  virtual Outcome addExtra(const Document& document, const Item& item, const Path& file) = 0;
  virtual Outcome setCommentary(const Document& document, const Item& item, const Path& file) = 0;
  virtual Outcome setItemTitle(const Document& document, const Item& item, const std::string& title) = 0;
  virtual Outcome removeItem(const Document& document, const Item& item) = 0;
  /// So that it stands at the place afterwards.
  virtual Outcome moveItem(const Document& document, std::size_t from, std::size_t to) = 0;

  /// Copies into the packages what still lies outside.
  virtual Outcome bringEverythingIn() = 0;
  /// What is there now, as this teller sees it, with every fault that it sees.
  virtual Contents look() = 0;

  /// What can happen to this teller alone.
  virtual std::vector<Operation> ownOperations() = 0;
  /// Stops what is done next on its way, once, until `dontStop()`; false when this teller cannot be stopped.
  virtual bool stopNext(Dice&) { return false; }
  virtual void dontStop() {}
  /// What people do after a stop: they go on. Changes what may be there alike.
  virtual void goOn(const std::vector<Contents*>&) {}
};

/// What can happen to any teller.
std::vector<Operation> commonOperations(Teller& teller);

}  // namespace quilt::story
