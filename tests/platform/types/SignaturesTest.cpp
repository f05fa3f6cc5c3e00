// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/types/Signatures.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>

#include "quilt/platform/types/TypeTable.h"

namespace quilt::platform {
namespace {

using namespace std::string_literals;
using namespace types;

std::string typeOf(std::string_view start) {
  const char* type = typeOfContent(start);
  return type ? type : "none";
}

std::string box(const std::string& type, const std::string& brand) { return "\0\0\0\x18"s + type + brand; }
std::string chunk(const std::string& form, const std::string& type) { return form + "\x10\0\0\0"s + type; }
std::string zipOf(const std::string& mimeType) { return "PK\x03\x04" + std::string(26, '\0') + "mimetype" + mimeType; }

struct Sample {
  std::string start;
  const char* type;
};

const Sample kSamples[] = {
    {"\xFF\xD8\xFF\xE0", kJPEG},
    {"\x89PNG\r\n\x1A\n", kPNG},
    {"GIF87a", kGIF},
    {"GIF89a", kGIF},
    {"II*\0"s, kTIFF},
    {"MM\0*"s, kTIFF},
    {"\0\0\0\x0CjP  "s, kJPEG2000},
    {"\xFF\x4F\xFF\x51", kJPEG2000},
    {"icns", kICNS},
    {"%PDF-1.7", kPDF},
    {"\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1", kWordDoc},
    {"\x1A\x45\xDF\xA3", kMatroska},
    {"\0\0\x01\xBA"s, kMPEG},
    {"\0\0\x01\xB3"s, kMPEG},
    {"ID3\x04", kMP3},
    {"\xFF\xFB\x90\x00"s, kMP3},
    {"fLaC", "org.xiph.flac"},
    {"OggS", "org.xiph.ogg-audio"},
    {box("ftyp", "isom"), kMPEG4},
    {box("ftyp", "M4A "), kM4A},
    {box("ftyp", "M4P "), kProtectedMPEG4Audio},
    {box("ftyp", "M4V "), kM4V},
    {box("ftyp", "qt  "), kMovieContainer},
    {box("ftyp", "3gp5"), k3GPP},
    {box("ftyp", "heic"), kHEIC},
    {box("ftyp", ""), kMPEG4},
    {box("moov", ""), kMovieContainer},
    {box("mdat", ""), kMovieContainer},
    {chunk("RIFF", "WAVE"), kWAV},
    {chunk("RIFF", "AVI "), kAVI},
    {chunk("RIFF", "WEBP"), "org.webmproject.webp"},
    {chunk("FORM", "AIFF"), kAIFF},
    {chunk("FORM", "AIFC"), kAIFC},
    {zipOf("application/epub+zip"), kEPUBContainer},
    {zipOf("application/vnd.oasis.opendocument.text"), kTextDocument},
    {zipOf("application/vnd.oasis.opendocument.presentation"), kPresentation},
    {"PK\x03\x04", "public.zip-archive"},
    {"BM" + std::string(12, '\0') + "\x28\0\0\0"s, kBMP},
};

TEST(SignaturesTest, TheFirstBytesShowTheType) {
  for (const Sample& sample : kSamples) EXPECT_EQ(sample.type, typeOf(sample.start));
}

TEST(SignaturesTest, WhatFollowsDoesNotMatter) {
  for (const Sample& sample : kSamples) EXPECT_EQ(sample.type, typeOf(sample.start + std::string(4096, '\0')));
}

TEST(SignaturesTest, EveryTypeShownHasARow) {
  for (const Sample& sample : kSamples)
    EXPECT_TRUE(std::any_of(typeRows().begin(), typeRows().end(), [&](const TypeRow& row) {
      return row.identifier == std::string_view(sample.type);
    })) << sample.type;
}

TEST(SignaturesTest, OtherBytesShowNothing) {
  for (const char* text : {"", "x", "BM", "BMW is a car, not a bitmap", "RIFF", "RIFF....XXXX", "FORM", "\xFF",
                           "\xFF\xFF", "\xFF\xE0\xF0", "PNG", "<svg/>", "....ftyx", "MThd"})
    EXPECT_EQ("none", typeOf(text)) << text;
}

TEST(SignaturesTest, AnyCutOrNoiseIsTakenCalmly) {
  for (const Sample& sample : kSamples)
    for (std::size_t length = 0; length < sample.start.size(); ++length) {
      const std::string start = sample.start.substr(0, length);  // a copy, so that reading past it shows
      typeOfContent(start);
      EXPECT_FALSE(isPlainText(start) && typeOfContent(start));
    }
  std::mt19937 random(1);
  for (int round = 0; round < 20'000; ++round) {
    std::string noise(random() % 64, '\0');
    for (char& c : noise) c = static_cast<char>(static_cast<unsigned char>(random() & 0xFFU));
    const char* type = typeOfContent(noise);
    EXPECT_TRUE(!type || *type);
  }
}

TEST(SignaturesTest, PlainTextHasNoControlCharactersAndNoSignature) {
  for (const char* text : {"x", "a\nb\tc\r\n", "\xC3\xBC", "\xEF\xBB\xBFtext", "<html>", "PKX"})
    EXPECT_TRUE(isPlainText(text)) << text;
  for (const std::string& text : {""s, "\0"s, "a\0b"s, "\x1B[0m"s, "%PDF-"s, "ID3"s, "GIF89a"s})
    EXPECT_FALSE(isPlainText(text));
}

}  // namespace
}  // namespace quilt::platform
