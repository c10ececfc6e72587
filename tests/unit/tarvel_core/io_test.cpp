// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/file_reader.h>
#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <cstdio>
#include <fcntl.h>
#include <limits>
#include <unistd.h>

namespace Tarvel {
namespace {

constexpr std::size_t NO_LIMIT = std::numeric_limits<std::size_t>::max();

std::string ReadSome(Reader &reader, std::size_t length) {
  std::string text(length, '?');
  text.resize(reader.Read(text.data(), length));
  return text;
}

template <typename T>
std::string IOErrorOf(const T &action) {
  try {
    action();
  } catch (const IOException &error) {
    return error.what();
  }
  return "nothing was raised";
}

/// A reader that returns `length` bytes, one at a time. `NO_LIMIT` makes it practically endless.
class DripReader final : public Reader {
public:
  explicit DripReader(std::size_t length) : m_left(length) {}
  std::size_t Read(char *buffer, std::size_t length) override {
    if (length == 0 || m_left == 0) {
      return 0;
    }
    --m_left;
    *buffer = 'x';
    return 1;
  }

private:
  std::size_t m_left;
};

/// A temporary file. The destructor removes it.
class TemporaryFile {
public:
  explicit TemporaryFile(std::string_view content) {
    const int descriptor = ::mkstemp(m_path.data());
    EXPECT_EQ(::write(descriptor, content.data(), content.size()), static_cast<ssize_t>(content.size()));
    ::close(descriptor);
  }
  ~TemporaryFile() { std::remove(m_path.c_str()); }
  const std::string &Path() const { return m_path; }

private:
  std::string m_path = testing::TempDir() + "/reader-XXXXXX";
};

TEST(StringReader, ReadsInPiecesToTheEnd) {
  const Ref<Reader> reader = CreateStringReader("abcdef");
  EXPECT_EQ(ReadSome(*reader, 4), "abcd");
  EXPECT_EQ(ReadSome(*reader, 4), "ef");
  EXPECT_EQ(ReadSome(*reader, 4), "");
  EXPECT_EQ(ReadSome(*reader, 4), "");
}

TEST(StringReader, ReadToEndReturnsTheRestOnce) {
  const Ref<Reader> reader = CreateStringReader(std::string("ab\0cd", 5));
  EXPECT_EQ(ReadSome(*reader, 1), "a");
  EXPECT_EQ(reader->ReadToEnd(NO_LIMIT), std::string("b\0cd", 4));
  EXPECT_EQ(reader->ReadToEnd(NO_LIMIT), "");
  EXPECT_EQ(ReadSome(*reader, 1), "");
}

TEST(StringReader, KeepsItsBytesWhenTheSourceIsGone) {
  Ref<Reader> reader;
  {
    std::string text(1000, 'a');
    reader = CreateStringReader(text);
    text.assign(1000, 'b');
  }
  EXPECT_EQ(reader->ReadToEnd(NO_LIMIT), std::string(1000, 'a'));
}

TEST(ReaderReadToEnd, StopsOneByteAfterTheLimit) {
  const Ref<Reader> reader = MakeRef<DripReader>(NO_LIMIT);
  EXPECT_EQ(reader->ReadToEnd(100).size(), 101U);
}

TEST(ReaderReadToEnd, ReturnsTextOfExactlyTheLimit) {
  const Ref<Reader> reader = MakeRef<DripReader>(std::size_t{100});
  EXPECT_EQ(reader->ReadToEnd(100), std::string(100, 'x'));
}

TEST(StringWriter, KeepsWhatIsWrittenInOrder) {
  const Ref<StringWriter> writer = CreateStringWriter();
  EXPECT_EQ(writer->GetText(), "");
  writer->Write("ab");
  writer->Write("");
  writer->Write(std::string_view("\0c", 2));
  EXPECT_EQ(writer->GetText(), std::string("ab\0c", 4));
}

TEST(StringWriter, IsEmptyAndReusableAfterTakeText) {
  const Ref<StringWriter> writer = CreateStringWriter();
  writer->Write("first");
  EXPECT_EQ(writer->TakeText(), "first");
  EXPECT_EQ(writer->GetText(), "");
  writer->Write("second");
  EXPECT_EQ(writer->TakeText(), "second");
}

TEST(OpenFile, ReadsTheWholeFile) {
  const std::string content(100'000, 'z');
  const TemporaryFile file(content);
  const Ref<Reader> reader = OpenFile(file.Path());
  EXPECT_EQ(ReadSome(*reader, 1), "z");
  EXPECT_EQ(reader->ReadToEnd(NO_LIMIT).size(), content.size() - 1);
}

TEST(OpenFile, ClosesTheFileWithTheReader) {
  const TemporaryFile file("x");
  const int lowestFree = ::dup(STDERR_FILENO);
  ::close(lowestFree);
  OpenFile(file.Path());
  const int again = ::dup(STDERR_FILENO);
  ::close(again);
  EXPECT_EQ(again, lowestFree);
}

TEST(OpenFile, ReportsPathAndReasonOfAMissingFile) {
  EXPECT_EQ(IOErrorOf([] { OpenFile("/nonexistent/file"); }),
            "Cannot open /nonexistent/file: No such file or directory");
}

TEST(OpenFile, RefusesAPathWithAZeroByte) {
  const TemporaryFile file("x");
  const std::string path = file.Path() + std::string("\0.pem", 5);
  EXPECT_EQ(IOErrorOf([&] { OpenFile(path); }), "Cannot open " + file.Path() + ": Invalid argument");
}

TEST(OpenFile, FailsToReadADirectory) {
  const Ref<Reader> reader = OpenFile("/");
  EXPECT_EQ(IOErrorOf([&] { ReadSome(*reader, 1); }), "Cannot read /: Is a directory");
}

TEST(DescriptorReader, ReadsAPipeToItsEndAndLeavesItOpen) {
  int ends[2];
  ASSERT_EQ(::pipe(ends), 0);
  ASSERT_EQ(::write(ends[1], "token", 5), 5);
  ::close(ends[1]);
  {
    const Ref<Reader> reader = CreateDescriptorReader(ends[0]);
    EXPECT_EQ(reader->ReadToEnd(NO_LIMIT), "token");
  }
  EXPECT_NE(::fcntl(ends[0], F_GETFD), -1);
  ::close(ends[0]);
}

TEST(DescriptorReader, ReportsDescriptorAndReason) {
  EXPECT_EQ(IOErrorOf([] { CreateDescriptorReader(-1)->ReadToEnd(NO_LIMIT); }),
            "Cannot read file descriptor -1: Bad file descriptor");
}

} // namespace
} // namespace Tarvel
