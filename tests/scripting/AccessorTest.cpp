// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/Accessor.h"

#include <gmock/gmock.h>

#include <limits>

#include "quilt/collections/QuiltCollection.h"
#include "tests/support/Environment.h"
#include "tests/support/PackageFixture.h"

namespace quilt::scripting {
namespace {

using support::debug;
using support::Lines;
using ::testing::IsEmpty;

const Value kNone;

Value text(const std::string& value) { return value; }
Value number(double value) { return value; }
Value count(std::int64_t value) { return value; }

class AccessorTest : public support::PackageFixture {
 protected:
  AccessorTest() { takeLines(); }

  /// The answer; fails the test when the call is refused.
  static Value call(platform::Object& receiver, const std::string& name, std::vector<Value> arguments = {}) {
    const auto answer = perform(receiver, name, arguments);
    EXPECT_TRUE(answer.hasValue()) << name << ": " << (answer ? "" : answer.error().text);
    return answer ? *answer : Value("refused");
  }
  /// The answer, with the one line that the call logs.
  void expect(platform::Object& receiver, const std::string& name, const Value& answer, const std::string& line,
              std::vector<Value> arguments = {}) {
    takeLines();
    EXPECT_EQ(call(receiver, name, std::move(arguments)), answer) << name;
    EXPECT_EQ(takeLines(), Lines{debug(line)}) << name;
  }
  /// An object as an answer.
  template <class T>
  static Value object(const std::shared_ptr<T>& value) {
    return std::static_pointer_cast<platform::Object>(value);
  }
};

// ---- Collections

class CollectionAccessorTest : public AccessorTest {
 protected:
  CollectionAccessorTest() {
    collection->setUuid("C");
    collection->setIsLoading(true);
  }
  const std::shared_ptr<QuiltCollection> collection = QuiltCollection::init();
};

TEST_F(CollectionAccessorTest, AnswersItsTexts) {
  collection->setTitle("Talks");
  collection->setDescription("All of them");
  collection->setAuthor("Ann");
  collection->setCopyright("2026");
  collection->setKeywords("a, b");
  expect(*collection, "cvUUID", text("C"), "Conveyor is getting collection \"C\" uuid");
  expect(*collection, "cvTitle", text("Talks"), "Conveyor is getting collection \"C\" title \"Talks\"");
  expect(*collection, "cvDescription", text("All of them"),
         "Conveyor is getting collection \"C\" description \"All of them\"");
  expect(*collection, "cvAuthor", text("Ann"), "Conveyor is getting collection \"C\" author \"Ann\"");
  expect(*collection, "cvCopyright", text("2026"), "Conveyor is getting collection \"C\" copyright \"2026\"");
  expect(*collection, "cvKeywords", text("a, b"), "Conveyor is getting collection \"C\" keywords \"a, b\"");
}

TEST_F(CollectionAccessorTest, AnswersNoneForWhatIsNotSet) {
  expect(*collection, "cvAuthor", kNone, "Conveyor is getting collection \"C\" author \"(null)\"");
  collection->setCreationDate(std::nullopt);
  expect(*collection, "cvCreationDate", kNone, "Conveyor is getting collection \"C\" date \"(null)\"");
}

TEST_F(CollectionAccessorTest, TheDateIsInTheUsersLanguage) {
  collection->setCreationDate(support::dateOf("2024-03-05T12:00:00Z"));
  expect(*collection, "cvCreationDate", text("March 5, 2024"),
         "Conveyor is getting collection \"C\" date \"March 5, 2024\"");
}

// ---- Documents

class DocumentAccessorTest : public AccessorTest {
 protected:
  DocumentAccessorTest() { document()->setUuid("D"); }
};

TEST_F(DocumentAccessorTest, AnswersItsTexts) {
  document()->setTitle("A talk");
  document()->setDescription("About it");
  document()->setAuthor("Ann");
  expect(*document(), "cvUUID", text("D"), "Conveyor is getting document \"D\" uuid");
  expect(*document(), "cvTitle", text("A talk"), "Conveyor is getting document \"D\" title \"A talk\"");
  expect(*document(), "cvDescription", text("About it"), "Conveyor is getting document \"D\" description \"About it\"");
  expect(*document(), "cvAuthor", text("Ann"), "Conveyor is getting document \"D\" author \"Ann\"");
}

TEST_F(DocumentAccessorTest, AnEmptyTitleIsAnsweredByAnotherAndStaysEmpty) {
  keepDocumentBusy();
  document()->setTitle("");
  expect(*document(), "cvTitle", text("Untitled Episode"), "Conveyor is getting document \"D\" title \"\"");
  EXPECT_EQ(document()->title(), "");
  document()->setTitle(std::nullopt);
  expect(*document(), "cvTitle", text("Untitled Episode"), "Conveyor is getting document \"D\" title \"(null)\"");
}

TEST_F(DocumentAccessorTest, AMissingDescriptionIsAnsweredByAPlaceholderAndStaysMissing) {
  const std::string placeholder =
      "Lorem ipsum dolor sit amet, consectetur adipiscing elit. In id laoreet arcu. Sed luctus velit ac lorem "
      "tincidunt tincidunt. Pellentesque vitae diam vitae leo cursus sodales. Sed non tortor eget libero malesuada "
      "elementum eu non elit. Quisque malesuada pellentesque porttitor.";
  expect(*document(), "cvDescription", text(placeholder), "Conveyor is getting document \"D\" description \"(null)\"");
  document()->setDescription("");
  expect(*document(), "cvDescription", text(placeholder), "Conveyor is getting document \"D\" description \"\"");
  EXPECT_EQ(document()->description(), "");
}

TEST_F(DocumentAccessorTest, TellsWhetherAnAnswerStandsWhereNothingIsStored) {
  document()->setTitle("");
  EXPECT_TRUE(answersStandIn(*document(), "cvTitle"));
  EXPECT_TRUE(answersStandIn(*document(), "cvDescription"));
  EXPECT_FALSE(answersStandIn(*document(), "cvAuthor"));
  document()->setTitle("Untitled Episode");
  document()->setDescription("Lorem ipsum");
  EXPECT_FALSE(answersStandIn(*document(), "cvTitle"));
  EXPECT_FALSE(answersStandIn(*document(), "cvDescription"));
  EXPECT_FALSE(answersStandIn(*document(), "title"));
}

TEST_F(DocumentAccessorTest, SettersTellAndSet) {
  keepDocumentBusy();
  expect(*document(), "cvSetTitle:", kNone, "Conveyor is setting document \"D\" title to \"New\"", {text("New")});
  expect(*document(), "cvSetDescription:", kNone, "Conveyor is setting document \"D\" description to \"Words\"",
         {text("Words")});
  expect(*document(), "cvSetAuthor:", kNone, "Conveyor is setting document \"D\" author to \"(null)\"", {kNone});
  EXPECT_EQ(document()->title(), "New");
  EXPECT_EQ(document()->description(), "Words");
  EXPECT_EQ(document()->author(), std::nullopt);
}

TEST_F(DocumentAccessorTest, ASetterSavesAsTheModelDoes) {
  std::filesystem::remove(document()->propertiesPath());
  call(*document(), "cvSetTitle:", {text("New")});
  EXPECT_EQ(readRecord(document()->propertiesPath()).string("Title"), "New");
}

TEST_F(DocumentAccessorTest, TheLineAboutItsDateCallsItACollection) {
  document()->setCreationDate(support::dateOf("2024-03-05T12:00:00Z"));
  expect(*document(), "cvCreationDate", text("March 5, 2024"),
         "Conveyor is getting collection \"D\" date \"March 5, 2024\"");
}

TEST_F(DocumentAccessorTest, CountsAndAnswersItsItems) {
  item()->setUuid("M");
  expect(*document(), "cvMediaCount", count(1), "Conveyor is getting document \"D\" media count \"1\"");
  expect(*document(), "cvMediaAtIndex:", object(item()),
         "Conveyor is getting document \"D\" media \"M\" at index \"0\"", {count(0)});
}

TEST_F(DocumentAccessorTest, AnIndexOutsideTheListAnswersNone) {
  for (const std::int64_t index : {std::int64_t{1}, std::int64_t{-1}, std::numeric_limits<std::int64_t>::min()}) {
    takeLines();
    EXPECT_EQ(call(*document(), "cvMediaAtIndex:", {count(index)}), kNone) << index;
    EXPECT_EQ(takeLines().back(),
              debug("Conveyor is getting document \"D\" media \"(null)\" at index \"" + std::to_string(index) + "\""));
  }
}

// ---- Media items

class MediaAccessorTest : public AccessorTest {
 protected:
  MediaAccessorTest() { item()->setUuid("M"); }
};

TEST_F(MediaAccessorTest, AnswersAndSetsItsTexts) {
  item()->setTitle("One");
  item()->setDescription("The first");
  item()->setContentCategory("Montage");
  expect(*item(), "cvUUID", text("M"), "Conveyor is getting media \"M\" uuid");
  expect(*item(), "cvTitle", text("One"), "Conveyor is getting media \"M\" title \"One\"");
  expect(*item(), "cvDescription", text("The first"), "Conveyor is getting media \"M\" descripion \"The first\"");
  expect(*item(), "cvContentCategory", text("Montage"), "Conveyor is getting media \"M\" content category \"Montage\"");
  expect(*item(), "cvSetTitle:", kNone, "Conveyor is setting media \"M\" title to \"Two\"", {text("Two")});
  expect(*item(), "cvSetDescription:", kNone, "Conveyor is setting media \"M\" description to \"Second\"",
         {text("Second")});
  EXPECT_EQ(item()->title(), "Two");
  EXPECT_EQ(item()->description(), "Second");
}

TEST_F(MediaAccessorTest, WithoutAPosterThePathIsEmptyAndTheSizeZero) {
  takeLines();
  EXPECT_EQ(call(*item(), "cvPosterImagePath"), text(""));
  EXPECT_EQ(takeLines().back(), debug("Conveyor is getting media \"M\" poster image path \"\""));
  EXPECT_EQ(call(*item(), "cvPosterImageWidth"), Value(std::int64_t{0}));
  EXPECT_EQ(call(*item(), "cvPosterImageHeight"), Value(std::int64_t{0}));
}

TEST_F(MediaAccessorTest, AnswersItsPoster) {
  item()->setPosterImage(picture(64, 48));
  const std::string path = item()->posterImagePath().native();
  expect(*item(), "cvPosterImagePath", text(path),
         "Conveyor is getting media \"M\" poster image path \"" + path + "\"");
  expect(*item(), "cvPosterImageWidth", number(64), "Conveyor is getting width of poster image for media \"M\"");
  expect(*item(), "cvPosterImageHeight", number(48), "Conveyor is getting height of poster image for media \"M\"");
}

TEST_F(MediaAccessorTest, CountsAndAnswersItsSources) {
  const auto source = addEmptySource();
  source->setUuid("S");
  expect(*item(), "cvSourcesCount", count(1), "Conveyor is getting media \"M\" sources count \"1\"");
  expect(*item(), "cvSourceAtIndex:", object(source), "Conveyor is getting media \"M\" source \"S\" at index \"0\"",
         {count(0)});
  expect(*item(), "cvAudioCommentarySource", kNone,
         "Conveyor is getting media \"M\" audio commentary source \"(null)\"");
  const auto commentary = QuiltMediaSource::init();
  commentary->setUuid("A");
  item()->setAudioCommentarySource(commentary);
  expect(*item(), "cvAudioCommentarySource", object(commentary),
         "Conveyor is getting media \"M\" audio commentary source \"A\"");
}

TEST_F(MediaAccessorTest, CountsAnswersAndRemovesItsExtras) {
  const auto extra = QuiltMediaExtra::init();
  extra->setUuid("E");
  item()->addExtra(extra);
  expect(*item(), "cvExtraCount", count(1), "Conveyor is getting source \"M\" extra count \"1\"");
  expect(*item(), "cvExtraAtIndex:", object(extra), "Conveyor is getting source \"M\" extra at index \"0\": \"E\"",
         {count(0)});
  expect(*item(), "cvRemoveExtraAtIndex:", kNone, "Conveyor is removing source \"M\" extra at index \"0\": \"E\"",
         {count(0)});
  EXPECT_EQ(item()->extraCount(), 0U);
}

TEST_F(MediaAccessorTest, RemovingAnExtraThatIsNotThereTellsSoAndDoesNothing) {
  takeLines();
  EXPECT_EQ(call(*item(), "cvRemoveExtraAtIndex:", {count(4)}), kNone);
  EXPECT_EQ(takeLines().back(), debug("Conveyor is removing source \"M\" extra at index \"4\": \"(null)\""));
}

// ---- Sources

class SourceAccessorTest : public AccessorTest {
 protected:
  SourceAccessorTest() { source->setUuid("S"); }
  const std::shared_ptr<QuiltMediaSource> source = addEmptySource();
};

TEST_F(SourceAccessorTest, AnswersAndSetsItsTexts) {
  source->setTitle("One");
  source->setDescription("The first");
  expect(*source, "cvUUID", text("S"), "Conveyor is getting source \"S\" uuid");
  expect(*source, "cvTitle", text("One"), "Conveyor is getting source \"S\" title \"One\"");
  expect(*source, "cvDescription", text("The first"), "Conveyor is getting source \"S\" description \"The first\"");
  expect(*source, "cvContentCategory", kNone, "Conveyor is getting source \"S\" content category \"(null)\"");
  expect(*source, "cvSetTitle:", kNone, "Conveyor is setting source \"S\" title to \"Two\"", {text("Two")});
  expect(*source, "cvSetDescription:", kNone, "Conveyor is setting source \"S\" description to \"Second\"",
         {text("Second")});
  EXPECT_EQ(source->title(), "Two");
  EXPECT_EQ(source->description(), "Second");
}

TEST_F(SourceAccessorTest, AMissingTimeCodeIsZero) {
  expect(*source, "cvTimeCode", number(0), "Conveyor is getting source \"S\" timecode \"0\"");
  source->setTimecode(4.5);
  expect(*source, "cvTimeCode", number(4.5), "Conveyor is getting source \"S\" timecode \"4.5\"");
}

TEST_F(SourceAccessorTest, CountsAndAnswersItsDerivatives) {
  expect(*source, "cvMainDerivative", kNone, "Conveyor is getting source \"S\" main derivative \"(null)\"");
  const auto derivative = derivativeTagged({"480p"});
  derivative->setUuid("F");
  source->addDerivative(derivative);
  expect(*source, "cvMainDerivative", object(derivative), "Conveyor is getting source \"S\" main derivative \"F\"");
  expect(*source, "cvDerivativeCount", count(1), "Conveyor is getting source \"S\" derivative count \"1\"");
  expect(*source, "cvDerivativeAtIndex:", object(derivative),
         "Conveyor is getting source \"S\" derivative at index \"0\": \"F\"", {count(0)});
  expect(*source, "cvDerivativeAtIndex:", kNone,
         "Conveyor is getting source \"S\" derivative at index \"1\": \"(null)\"", {count(1)});
}

TEST_F(SourceAccessorTest, CountsAndMakesItsPreviews) {
  const auto pictured = addSource(pictureFile(8, 8));
  pictured->setUuid("P");
  expect(*pictured, "cvPreviewCount", count(1), "Conveyor is getting source \"P\" previews count \"1\"");
  takeLines();
  const Value answer = call(*pictured, "cvPreviewAtIndex:", {count(0)});
  const auto preview = pictured->previews().at(0);
  EXPECT_EQ(answer, object(preview));
  EXPECT_EQ(takeLines().back(),
            debug("Conveyor is getting source \"P\" preview at index \"0\": \"" + preview->uuid() + "\""));
}

// ---- Derivatives

TEST_F(AccessorTest, ADerivativeTellsWhatItIsAndWhere) {
  const auto derivative = derivativeTagged({"Desktop", "720p"});
  derivative->setUuid("F");
  derivative->setContentType("public.jpeg");
  derivative->setUrl(Url::fileUrl("/a b/c.jpg"));
  expect(*derivative, "cvUUID", text("F"), "Conveyor is getting source derivative \"F\" uuid");
  expect(*derivative, "cvContentType", text("public.jpeg"),
         "Conveyor is getting source derivative \"F\" type \"public.jpeg\"");
  expect(*derivative, "cvCompatibilityTags", Value(std::vector<std::string>{"Desktop", "720p"}),
         "Conveyor is getting source derivative \"F\" compatibility tags \"Desktop,720p\"");
  expect(*derivative, "cvPath", text("/a b/c.jpg"), "Conveyor is getting source derivative \"F\" path \"/a b/c.jpg\"");
  expect(*derivative, "cvURL", text("file:///a%20b/c.jpg"),
         "Conveyor is getting source derivative \"F\" url \"file:///a%20b/c.jpg\"");
}

TEST_F(AccessorTest, AFreshDerivativeAnswersNone) {
  const auto derivative = QuiltMediaDerivative::init();
  derivative->setUuid("F");
  expect(*derivative, "cvContentType", kNone, "Conveyor is getting source derivative \"F\" type \"(null)\"");
  expect(*derivative, "cvCompatibilityTags", kNone,
         "Conveyor is getting source derivative \"F\" compatibility tags \"(null)\"");
  expect(*derivative, "cvPath", kNone, "Conveyor is getting source derivative \"F\" path \"(null)\"");
  expect(*derivative, "cvURL", kNone, "Conveyor is getting source derivative \"F\" url \"(null)\"");
}

// ---- Previews

class PreviewAccessorTest : public AccessorTest {
 protected:
  PreviewAccessorTest() { preview->setUuid("P"); }
  const std::shared_ptr<QuiltMediaPreview> preview = QuiltMediaPreview::init();
};

TEST_F(PreviewAccessorTest, AnswersItsTextsAndTime) {
  preview->setTitle("Chapter");
  preview->setContent("Words");
  preview->setTimecode(1.25);
  expect(*preview, "cvUUID", text("P"), "Conveyor is getting source preview \"P\" uuid");
  expect(*preview, "cvTitle", text("Chapter"), "Conveyor is getting source preview \"P\" title \"Chapter\"");
  expect(*preview, "cvContent", text("Words"), "Conveyor is getting source preview \"P\" content \"Words\"");
  expect(*preview, "cvTimeCode", number(1.25), "Conveyor is getting source preview \"P\" timecode \"1.250000\"");
}

TEST_F(PreviewAccessorTest, ItsTimeIsAnsweredUnchanged) {
  preview->setTimecode(kNoTimecode);
  EXPECT_EQ(call(*preview, "cvTimeCode"), number(static_cast<double>(std::numeric_limits<float>::max())));
}

TEST_F(PreviewAccessorTest, WithoutAnImageTheSizeIsTheIntegerZero) {
  expect(*preview, "cvWidth", std::int64_t{0}, "Conveyor is getting width of preview \"P\"");
  expect(*preview, "cvHeight", std::int64_t{0}, "Conveyor is getting height of preview \"P\"");
  expect(*preview, "cvPath", kNone, "Conveyor is getting source preview \"P\" path \"(null)\"");
}

TEST_F(PreviewAccessorTest, AnswersTheSizeAndPlaceOfItsImage) {
  preview->setImage(picture(64, 48));
  const auto source = addEmptySource();
  source->addPreview(preview);
  const std::string path = preview->path().native();
  expect(*preview, "cvWidth", number(64), "Conveyor is getting width of preview \"P\"");
  expect(*preview, "cvHeight", number(48), "Conveyor is getting height of preview \"P\"");
  expect(*preview, "cvPath", text(path), "Conveyor is getting source preview \"P\" path \"" + path + "\"");
}

// ---- Exposure

using ExposureTest = support::ModelFixture;

TEST_F(ExposureTest, EachClassHasItsAccessorsAndNoOthers) {
  std::map<std::string_view, std::size_t> counts;
  for (const ExposedClass& type : exposedClasses()) counts[type.name] = type.accessors.size();
  EXPECT_EQ(counts, (std::map<std::string_view, std::size_t>{{"QuiltCollection", 7},
                                                             {"QuiltDocument", 10},
                                                             {"QuiltMedia", 15},
                                                             {"QuiltMediaSource", 12},
                                                             {"QuiltMediaDerivative", 5},
                                                             {"QuiltMediaPreview", 7}}));
}

TEST_F(ExposureTest, OtherMethodsAreExcluded) {
  const auto document = QuiltDocument::init();
  for (const char* name : {"update", "title", "setTitle:", "dictionary", "cvSetTitle", "cvtitle",
                           "cvTitle:", "cvCopyright", "cvSourcesCount", "cv", ""})
    EXPECT_TRUE(isExcludedFromScripts(*document, name)) << name;
  EXPECT_FALSE(isExcludedFromScripts(*document, "cvTitle"));
  EXPECT_FALSE(isExcludedFromScripts(*document, "cvSetTitle:"));
}

TEST_F(ExposureTest, AnExtraAnswersAsASource) {
  const auto extra = QuiltMediaExtra::init();
  ASSERT_NE(exposedClassOf(*extra), nullptr);
  EXPECT_EQ(exposedClassOf(*extra)->name, "QuiltMediaSource");
}

TEST_F(ExposureTest, OtherObjectsHaveNothing) {
  platform::Object object;
  EXPECT_EQ(exposedClassOf(object), nullptr);
  EXPECT_TRUE(isExcludedFromScripts(object, "cvUUID"));
}

TEST_F(DocumentAccessorTest, WhatIsExcludedIsRefusedInSilence) {
  takeLines();
  const auto answer = perform(*document(), "update", {});
  ASSERT_FALSE(answer);
  EXPECT_EQ(answer.error().kind, platform::ErrorKind::Unsupported);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(DocumentAccessorTest, WrongArgumentsAreRefusedInSilence) {
  document()->setTitle("A talk");
  takeLines();
  const auto refuses = [this](const std::string& name, std::vector<Value> arguments) {
    const auto answer = perform(*document(), name, arguments);
    return !answer && answer.error().kind == platform::ErrorKind::Damaged;
  };
  EXPECT_TRUE(refuses("cvTitle", {text("x")}));
  EXPECT_TRUE(refuses("cvSetTitle:", {}));
  EXPECT_TRUE(refuses("cvSetTitle:", {count(1)}));
  EXPECT_TRUE(refuses("cvSetTitle:", {text("x"), text("y")}));
  EXPECT_TRUE(refuses("cvMediaAtIndex:", {text("0")}));
  EXPECT_TRUE(refuses("cvMediaAtIndex:", {number(0)}));
  EXPECT_TRUE(refuses("cvMediaAtIndex:", {}));
  EXPECT_EQ(document()->title(), "A talk");
  EXPECT_THAT(takeLines(), IsEmpty());
}

}  // namespace
}  // namespace quilt::scripting
