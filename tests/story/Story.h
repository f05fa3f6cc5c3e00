// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <set>

#include "tests/story/Teller.h"

namespace quilt::story {

/// One story: what happens, drawn from a seed, is done by a teller, and after each step what is there is compared with
/// what must be there. Ends at the first step that falls short; the test has failed then, with the seed and the steps.
///
///     LibraryTeller teller(folder);
///     Story(7, teller, folder).tell(25);
class Story {
 public:
  Story(std::uint64_t seed, Teller& teller, Path folder);

  void tell(std::size_t steps);

  // For operations
  Dice dice;
  Contents contents;  ///< what must be there; an operation changes it, and has the teller do the same

  /// Has the teller do it; the operation is over when that fails. `what` is told in a failure.
  void step(const std::string& what, const std::function<Outcome()>& action);
  /// What must be there may also be this, when the step is stopped on its way.
  void mayAlsoBe(const Contents& other) { _acceptable.push_back(other); }
  [[nodiscard]] bool wasStopped() const { return _outcome.wasStopped; }
  /// Something is not as it must be.
  void complain(const std::string& fault) { contents.faults.push_back(fault); }

  /// Null when there is none of which the condition holds.
  Document* anyDocument(const std::function<bool(const Document&)>& condition = {});
  const Material& anyMaterial(const std::function<bool(const Material&)>& condition);
  /// A fresh file outside of the library with the material in it, under a name of its own.
  Path outside(const Material& material);
  /// A folder that is not there yet.
  Path freshFolder();
  std::string freshTitle(const std::string& kind);
  /// The theme bundle that all stories use.
  [[nodiscard]] Path theme() const { return themeIn(_folder); }
  static Path themeIn(const Path& folder) { return folder / "plain.qth"; }
  /// Deletes, replaces, moves or locks away every file outside.
  void loseTheOriginals();
  /// A finished package, or its archive, must hold the document.
  void expectPackage(const Path& made, const Document& document);

 private:
  void judge(const Contents& before);
  [[nodiscard]] std::string toldSoFar() const;

  const std::uint64_t _seed;
  Teller& _teller;
  const Path _folder;
  std::vector<Path> _outside;
  std::size_t _count = 0;
  std::vector<std::string> _steps;
  std::vector<Contents> _acceptable;
  Outcome _outcome;
};

}  // namespace quilt::story
