#pragma once
// A firmware or software version: major, minor, variation, release stage and
// build, each one byte. Parsing never fails: text that does not read leaves
// zeroes, and misuse is reported through assertions only.

#include <cstdint>
#include <string>

class FileVersion {
 public:
  // Maturity of a version, in rising order. The letter is what the text
  // form of style EStyleReleaseLetter shows.
  enum ERELEASE : uint8_t {
    EUnknownVersion = 0,      // "?"
    EAlphaVersion = 1,        // "a"
    EBetaVersion = 2,         // "b"
    EWebVersion = 3,          // "w"
    EDevelopmentVersion = 4,  // "d"
    EFinalVersion = 5,        // "-"
  };

  // Text and number forms. Styles 2 to 5 have a number form.
  enum EVersionStyle : int {
    EStyleReleaseLetter = 0,     // "1.2.3-4"
    EStyleFourPart = 1,          // "1.2.3.4"
    EStyleThreePart = 2,         // "1.2.3"; number 0xMMmmvv
    EStyleShort = 3,             // "1.23"; number major << 16 | minor * 10 + variation
    EStyleMajorMinor = 4,        // "1.05"; number major << 8 | minor
    EStyleShortAsThreePart = 5,  // text as style 3, number as style 2
  };

  FileVersion() = default;
  FileVersion(uint8_t major_I, uint8_t minor_I, uint8_t variation_I, ERELEASE release_I,
              uint8_t build_I);
  // "1.2.3-4", "1.2.3a4", "1.2.3.4", "1.2.3" (final, build 0) or the
  // two-part "3.21" (3.2.1, release unknown). A web version is forced to
  // EWebVersion; the two-part form cannot be one and asserts.
  explicit FileVersion(const std::string& text_I, bool bIsWeb_I = false);
  FileVersion(uint32_t number_I, EVersionStyle style_I);

  uint8_t Major() const { return mMajor; }
  uint8_t Minor() const { return mMinor; }
  uint8_t Variation() const { return mVariation; }
  ERELEASE Release() const { return static_cast<ERELEASE>(mRelease); }
  uint8_t Build() const { return mBuild; }
  // Web and final versions are the released stages.
  bool Released() const;
  // Any number other than the release is not 0.
  bool IsValid() const;

  bool Equals(const FileVersion& other_I) const;
  // Major, minor and variation decide first. Between two released versions
  // the stage is then passed over, so a web build 3 is above a final build 2;
  // otherwise the higher stage wins. Then the build, and last the stage.
  bool Greater(const FileVersion& other_I) const;
  // Above `low_I` and not above `high_I`.
  bool Between(const FileVersion& low_I, const FileVersion& high_I) const;
  // From `low_I` included up to `high_I` excluded.
  bool WithinRange(const FileVersion& low_I, const FileVersion& high_I) const;

  bool operator==(const FileVersion& other_I) const { return Equals(other_I); }
  bool operator!=(const FileVersion& other_I) const { return !Equals(other_I); }
  bool operator>(const FileVersion& other_I) const { return Greater(other_I); }
  bool operator>=(const FileVersion& other_I) const { return Equals(other_I) || Greater(other_I); }
  bool operator<(const FileVersion& other_I) const { return !Equals(other_I) && !Greater(other_I); }
  bool operator<=(const FileVersion& other_I) const { return !Greater(other_I); }

  // 0 for a style without a number form.
  long AsLong(EVersionStyle style_I) const;
  // The empty string for a style above 5.
  std::string AsString(EVersionStyle style_I) const;

  // Folds the variation into the minor of a short-style version in place:
  // 3.2.1 becomes 3.21.0. Only a valid version with release unknown, build 0
  // and a one-digit variation changes.
  void OldStyleToSimpleShort();

 private:
  void ParseText(std::string text_I, bool bIsWeb_I);

  uint8_t mMajor = 0;
  uint8_t mMinor = 0;
  uint8_t mVariation = 0;
  uint8_t mRelease = EUnknownVersion;
  uint8_t mBuild = 0;
};
