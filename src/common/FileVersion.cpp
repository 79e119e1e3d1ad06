#include "common/FileVersion.h"

#include <sstream>

#include "common/StringUtilities.h"
#include "common/TavAssert.h"

namespace {

// Letters that end the variation of a four-part text. "." stands for the
// third dot of "1.2.3.4", which is a final version.
constexpr const char* kReleaseLetters = "abwdfABWDF-.?";

FileVersion::ERELEASE ReleaseFromLetter(char letter_I) {
  switch (letter_I) {
    case '?': return FileVersion::EUnknownVersion;
    case 'a':
    case 'A': return FileVersion::EAlphaVersion;
    case 'b':
    case 'B': return FileVersion::EBetaVersion;
    case 'w':
    case 'W': return FileVersion::EWebVersion;
    case 'd':
    case 'D': return FileVersion::EDevelopmentVersion;
    case 'f':
    case 'F':
    case '-':
    case '.': return FileVersion::EFinalVersion;
    default:
      TAVASSERT_TEXT("\"Search string and case list mismatch\"");
      return FileVersion::EFinalVersion;
  }
}

char LetterOfRelease(uint8_t release_I) {
  constexpr char kLetters[] = "?abwd-";
  return release_I <= FileVersion::EFinalVersion ? kLetters[release_I] : '?';
}

}  // namespace

FileVersion::FileVersion(uint8_t major_I, uint8_t minor_I, uint8_t variation_I, ERELEASE release_I,
                         uint8_t build_I)
    : mMajor(major_I),
      mMinor(minor_I),
      mVariation(variation_I),
      mRelease(release_I),
      mBuild(build_I) {}

FileVersion::FileVersion(const std::string& text_I, bool bIsWeb_I) { ParseText(text_I, bIsWeb_I); }

void FileVersion::ParseText(std::string text_I, bool bIsWeb_I) {
  if (text_I.empty()) return;

  // The dots become blanks so that a stream reads the numbers.
  const size_t firstDot = text_I.find('.');
  if (firstDot != std::string::npos) text_I[firstDot] = ' ';
  const size_t secondDot =
      firstDot == std::string::npos ? std::string::npos : text_I.find('.', firstDot + 1);

  if (secondDot == std::string::npos) {
    // Two-part form: the second number carries minor and variation.
    int major = 0;
    int minorAndVariation = 0;
    std::istringstream numbers(text_I);
    numbers >> major >> minorAndVariation;
    mMajor = static_cast<uint8_t>(major);
    mMinor = static_cast<uint8_t>(minorAndVariation / 10);
    mVariation = static_cast<uint8_t>(minorAndVariation % 10);
    if (bIsWeb_I) TAVASSERT_TEXT("!bIsWeb_I");
    return;
  }

  text_I[secondDot] = ' ';
  const size_t letter = text_I.find_first_of(kReleaseLetters, secondDot + 1);
  if (letter == std::string::npos) {
    mRelease = EFinalVersion;
    text_I += " 0";
  } else {
    mRelease = ReleaseFromLetter(text_I[letter]);
    text_I[letter] = ' ';
  }

  int major = 0;
  int minor = 0;
  int variation = 0;
  int build = 0;
  std::istringstream numbers(text_I);
  numbers >> major >> minor >> variation >> build;
  mMajor = static_cast<uint8_t>(major);
  mMinor = static_cast<uint8_t>(minor);
  mVariation = static_cast<uint8_t>(variation);
  mBuild = static_cast<uint8_t>(build);

  if (bIsWeb_I) mRelease = EWebVersion;
}

FileVersion::FileVersion(uint32_t number_I, EVersionStyle style_I) {
  switch (style_I) {
    case EStyleThreePart:
    case EStyleShortAsThreePart:
      mMajor = static_cast<uint8_t>(number_I >> 16);
      mMinor = static_cast<uint8_t>(number_I >> 8);
      mVariation = static_cast<uint8_t>(number_I);
      mRelease = style_I == EStyleThreePart ? EFinalVersion : EUnknownVersion;
      break;
    case EStyleShort:
      mMajor = static_cast<uint8_t>(number_I >> 16);
      mMinor = static_cast<uint8_t>((number_I & 0xFFFF) / 10);
      // Taken from the whole number and the already narrowed minor; the
      // narrowing to 8 bits leaves the last decimal digit.
      mVariation = static_cast<uint8_t>(number_I - mMinor * 10u);
      break;
    case EStyleMajorMinor:
      mMajor = static_cast<uint8_t>(number_I >> 8);
      mMinor = static_cast<uint8_t>(number_I);
      break;
    default: TAVASSERT_TEXT("\"This style not supported from number\""); break;
  }
}

bool FileVersion::Released() const { return mRelease == EWebVersion || mRelease == EFinalVersion; }

bool FileVersion::IsValid() const {
  return mMajor != 0 || mMinor != 0 || mVariation != 0 || mBuild != 0;
}

bool FileVersion::Equals(const FileVersion& other_I) const {
  return mMajor == other_I.mMajor && mMinor == other_I.mMinor && mVariation == other_I.mVariation &&
         mRelease == other_I.mRelease && mBuild == other_I.mBuild;
}

bool FileVersion::Greater(const FileVersion& other_I) const {
  if (mMajor != other_I.mMajor) return mMajor > other_I.mMajor;
  if (mMinor != other_I.mMinor) return mMinor > other_I.mMinor;
  if (mVariation != other_I.mVariation) return mVariation > other_I.mVariation;
  if (!(Released() && other_I.Released()) && mRelease != other_I.mRelease) {
    return mRelease > other_I.mRelease;
  }
  if (mBuild != other_I.mBuild) return mBuild > other_I.mBuild;
  return mRelease > other_I.mRelease;
}

bool FileVersion::Between(const FileVersion& low_I, const FileVersion& high_I) const {
  return Greater(low_I) && !Greater(high_I);
}

bool FileVersion::WithinRange(const FileVersion& low_I, const FileVersion& high_I) const {
  return (Greater(low_I) || Equals(low_I)) && !Equals(high_I) && !Greater(high_I);
}

long FileVersion::AsLong(EVersionStyle style_I) const {
  switch (style_I) {
    case EStyleThreePart:
      if (mRelease == EUnknownVersion) TAVASSERT_TEXT("mRelease != FileVersion::EUnknownVersion");
      return (long{mMajor} << 16) | (long{mMinor} << 8) | long{mVariation};
    case EStyleShort:
      if (!(mMinor < 25)) TAVASSERT_TEXT("mMinor < 25");
      if (!(mVariation < 10)) TAVASSERT_TEXT("mVariation < 10");
      if (mRelease != EUnknownVersion) TAVASSERT_TEXT("mRelease == FileVersion::EUnknownVersion");
      return (long{mMajor} << 16) + long{mMinor} * 10 + long{mVariation};
    case EStyleMajorMinor: return (long{mMajor} << 8) | long{mMinor};
    case EStyleShortAsThreePart:
      if (mRelease != EUnknownVersion) TAVASSERT_TEXT("mRelease == FileVersion::EUnknownVersion");
      return (long{mMajor} << 16) | (long{mMinor} << 8) | long{mVariation};
    default: TAVASSERT_TEXT("\"This style not supported as number\""); return 0;
  }
}

std::string FileVersion::AsString(EVersionStyle style_I) const {
  using StringUtilities::Format;
  switch (style_I) {
    case EStyleReleaseLetter:
      return Format("%u.%u.%u%c%u", mMajor, mMinor, mVariation, LetterOfRelease(mRelease), mBuild);
    case EStyleFourPart: return Format("%u.%u.%u.%u", mMajor, mMinor, mVariation, mBuild);
    case EStyleThreePart:
      if (mRelease != EFinalVersion) TAVASSERT_TEXT("mRelease == FileVersion::EFinalVersion");
      if (mBuild != 0) TAVASSERT_TEXT("mBuild == 0");
      return Format("%u.%u.%u", mMajor, mMinor, mVariation);
    case EStyleShort:
    case EStyleShortAsThreePart:
      if (mRelease != EUnknownVersion) TAVASSERT_TEXT("mRelease == FileVersion::EUnknownVersion");
      return Format("%u.%u%u", mMajor, mMinor, mVariation);
    case EStyleMajorMinor:
      if (mVariation != 0) TAVASSERT_TEXT("mVariation == 0");
      if (mBuild != 0) TAVASSERT_TEXT("mBuild == 0");
      if (mRelease != EUnknownVersion) TAVASSERT_TEXT("mRelease == FileVersion::EUnknownVersion");
      return Format(mMinor < 10 ? "%u.0%u" : "%u.%u", mMajor, mMinor);
    default: return std::string();
  }
}

void FileVersion::OldStyleToSimpleShort() {
  if (!IsValid() || mRelease != EUnknownVersion || mBuild != 0 || mVariation > 9) return;
  mMinor = static_cast<uint8_t>(mMinor * 10 + mVariation);
  mVariation = 0;
}
