#include <gtest/gtest.h>
#include <stdlib.h>

#include <filesystem>
#include <fstream>
#include <sstream>

#include "zelkorctl/ImageDescriptors.h"
#include "zelkorctl/ImageFiles.h"
#include "zelkorctl/InlineImage.h"

namespace zelkorctl {
namespace {

constexpr std::string_view kPng = "\x89PNG\r\n\x1a\n...";

class SavingTest : public testing::Test {
 protected:
  SavingTest() {
    char folder[] = "/tmp/images.XXXXXX";
    root_ = ::mkdtemp(folder);
  }
  ~SavingTest() override { std::filesystem::remove_all(root_); }

  static std::string content(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
  }

  std::string root_;
};

TEST(ImageDescriptorsTest, AreFoundOnceAtAnyDepthUnderTheirKeysOnly) {
  const auto images = imagesIn(R"([{"results":[
      {"icon":{"url":"u","id":"i","icon":{"id":"inside"}},"url":"no","text":{"image":[{"id":"a"},7]}},
      {"thumbnail":{"id":"a"},"posters":[{"url":"p"},{}],"glyph":"no","more":[[{"badge_image":{"id":3}}]]}
      ]}])");
  std::string found;
  for (const auto& image : images) found += image.url + "|" + image.id + " ";
  EXPECT_EQ(found, "u|i |a p| ");
  EXPECT_TRUE(imagesIn("<html>").empty());
  EXPECT_TRUE(imagesIn(std::string(100'000, '[')).empty());
}

TEST_F(SavingTest, NoNameLeavesTheFolder) {
  const struct {
    const char* key;
    const char* name;
  } cases[] = {
      {"https://a/flags/fr.png?x=/../y#z", "fr.png"},
      {"https://b/flags/fr.png", "fr-2.png"},
      {"word", "word.png"},
      {"../../etc/passwd", "passwd.png"},
      {"https://a/..", "image.png"},
      {"..", "image-2.png"},
      {"/", "image-3.png"},
      {"https://a/.bashrc", "bashrc.png"},
      {"https://a/-rf", "rf.png"},
      {"a\\b c\n\xc3\xa9\x1b", "a_b_c____.png"},
      {"https://a/fr.gif", "fr.gif.png"},
  };
  ImageFiles files(root_ + "/deep/er");
  for (const auto& [key, name] : cases) {
    const auto saved = files.save(key, kPng);
    EXPECT_FALSE(saved.error);
    EXPECT_EQ(saved.path, root_ + "/deep/er/" + name);
    EXPECT_EQ(content(saved.path), kPng);
  }
  EXPECT_LT(files.save(std::string(10'000, 'n'), kPng).path.size(), root_.size() + 200);
}

TEST_F(SavingTest, AnOldFileIsReplacedAndALinkNotFollowed) {
  ASSERT_FALSE(ImageFiles(root_).save("a", "GIF89a, longer than the next").error);
  ASSERT_FALSE(ImageFiles(root_).save("a", "GIF89a").error);
  EXPECT_EQ(content(root_ + "/a.gif"), "GIF89a");
  std::filesystem::create_symlink(root_ + "/a.gif", root_ + "/b.png");
  EXPECT_TRUE(ImageFiles(root_).save("b", kPng).error);
  EXPECT_EQ(content(root_ + "/a.gif"), "GIF89a");
  EXPECT_TRUE(ImageFiles(root_ + "/a.gif").save("c", kPng).error);
}

TEST(ImageTypeTest, IsReadFromTheBytes) {
  const std::pair<std::string, std::string_view> cases[] = {
      {std::string(kPng), "image/png"},
      {"\xff\xd8\xff\xe0", "image/jpeg"},
      {"GIF87a", "image/gif"},
      {"RIFF1234WEBPVP8", "image/webp"},
      {"RIFF1234WAVE", "application/octet-stream"},
      {"<?xml version='1.0'?><svg/>", "image/svg+xml"},
      {"<html>", "application/octet-stream"},
      {"", "application/octet-stream"},
  };
  for (const auto& [bytes, type] : cases) EXPECT_EQ(imageType(bytes).name, type);
}

TEST(InlineImageTest, SendsBase64InPieces) {
  EXPECT_EQ(inlineImage("M"), "\x1b_Ga=T,f=100,q=2,m=0;TQ==\x1b\\");
  EXPECT_EQ(inlineImage("Ma\xff"), "\x1b_Ga=T,f=100,q=2,m=0;TWH/\x1b\\");
  const auto large = inlineImage(std::string(3072 + 2, '\0'));
  EXPECT_EQ(large.find("m=1;"), 17u);
  EXPECT_TRUE(large.ends_with("\x1b\\\x1b_Gm=0;AAA=\x1b\\"));
  EXPECT_TRUE(showsInlineImages("xterm-kitty", ""));
  EXPECT_FALSE(showsInlineImages("xterm-256color", ""));
}

}  // namespace
}  // namespace zelkorctl
