// The self-protection stage: the checksum the build stamps against the platform's own, the
// launcher refusing a changed copy of itself (and accepting a re-stamped or unstamped one), and the
// launcher refusing to run under a debugger, with the flag in its process block set or cleared.
#include <gtest/gtest.h>

#include <cstring>

#include "support/expect.h"
#include "support/testbed.h"

#include <imagehlp.h>
// The launcher's checksum routine, compiled in here to be held against imagehlp's.
#include "launcher/protection/protection.cpp"

namespace {

DWORD PlatformChecksum(std::string& image, DWORD* stamped = nullptr) {
    DWORD header = 0, sum = 0;
    EXPECT_NE(CheckSumMappedFile(&image[0], static_cast<DWORD>(image.size()), &header, &sum), nullptr);
    if (stamped != nullptr) *stamped = header;
    return sum;
}

// The headers of an image held in memory, of this build's architecture (that of the launcher).
IMAGE_NT_HEADERS* Headers(std::string& image) {
    return reinterpret_cast<IMAGE_NT_HEADERS*>(&image[reinterpret_cast<IMAGE_DOS_HEADER*>(&image[0])->e_lfanew]);
}

// Last byte of a section's file padding (raw size beyond its virtual size): never loaded, so a
// copy changed there still runs. .rdata when it has padding.
size_t PaddingByte(std::string& image) {
    IMAGE_NT_HEADERS* nt = Headers(image);
    IMAGE_SECTION_HEADER* sections = IMAGE_FIRST_SECTION(nt);
    size_t found = 0;
    for (int i = nt->FileHeader.NumberOfSections - 1; i >= 0; --i) {
        const IMAGE_SECTION_HEADER& s = sections[i];
        if (s.SizeOfRawData <= s.Misc.VirtualSize) continue;
        if (found == 0 || memcmp(s.Name, ".rdata", 7) == 0) found = s.PointerToRawData + s.SizeOfRawData - 1;
    }
    return found;
}

std::wstring WriteTempExe(const std::string& bytes) {
    static int counter = 0;
    wchar_t temp[MAX_PATH];
    GetTempPathW(MAX_PATH, temp);
    std::wstring path = std::wstring(temp) + L"qzprot-" + std::to_wstring(GetCurrentProcessId()) + L"-" +
                        std::to_wstring(counter++) + L".exe";
    HANDLE h = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
    DWORD done = 0;
    WriteFile(h, bytes.data(), static_cast<DWORD>(bytes.size()), &done, nullptr);
    CloseHandle(h);
    return path;
}

bool LogHas(const std::string& log, const std::string& line) {
    return log.find(bed::Utf16Bytes(line)) != std::string::npos;
}

// ---- The checksum itself.

// Bytes copied so that they end right before an inaccessible page: a read past their end faults.
const uint8_t* BeforeGuardPage(const std::string& bytes) {
    SYSTEM_INFO system;
    GetSystemInfo(&system);
    const size_t page = system.dwPageSize, span = (bytes.size() + page - 1) / page * page;
    uint8_t* base = static_cast<uint8_t*>(VirtualAlloc(nullptr, span + page, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE));
    DWORD old = 0;
    VirtualProtect(base + span, page, PAGE_NOACCESS, &old);
    memcpy(base + span - bytes.size(), bytes.data(), bytes.size());
    return base + span - bytes.size();  // left to the end of the test program
}

TEST(ImageChecksum, BuildStampsThePlatformsChecksum) {
    for (const std::wstring& exe : {bed::LauncherExe(), bed::LauncherNoStringsExe()}) {
        std::string image = bed::ReadFileBytes(exe);
        ASSERT_FALSE(image.empty());
        DWORD stamped = 0;
        DWORD computed = PlatformChecksum(image, &stamped);
        EXPECT_NE(stamped, 0u) << bed::ToUtf8(exe);
        EXPECT_EQ(stamped, computed) << bed::ToUtf8(exe);
    }
}

// Bare images of odd and even lengths, filled so that nearly every word carries (0xFF), not at all
// (0x00) or at random, with garbage in the checksum field that must count as zero.
TEST(ImageChecksum, RoutineAgreesWithThePlatformOnAwkwardFiles) {
    uint32_t seed = 57;
    for (uint32_t length : {512u, 513u, 4096u, 65537u, 200001u}) {
        for (int fill : {0x00, 0xFF, -1}) {
            std::string image(length, static_cast<char>(fill));
            if (fill < 0)
                for (char& c : image) c = static_cast<char>((seed = seed * 1103515245u + 12345u) >> 24);
            memset(&image[0], 0, 0x40 + 4 + sizeof(IMAGE_FILE_HEADER));
            image[0] = 'M';
            image[1] = 'Z';
            reinterpret_cast<IMAGE_DOS_HEADER*>(&image[0])->e_lfanew = 0x40;
            memcpy(&image[0x40], "PE\0\0", 4);
            IMAGE_NT_HEADERS* nt = Headers(image);
            nt->FileHeader.SizeOfOptionalHeader = sizeof(IMAGE_OPTIONAL_HEADER);
            nt->OptionalHeader.Magic = IMAGE_NT_OPTIONAL_HDR_MAGIC;
            nt->OptionalHeader.CheckSum = 0xA5C3E1F7u;
            uint32_t field = 0;
            ASSERT_TRUE(FindImageChecksumField(reinterpret_cast<const uint8_t*>(image.data()), length, &field));
            EXPECT_EQ(field, static_cast<uint32_t>(reinterpret_cast<char*>(&nt->OptionalHeader.CheckSum) - &image[0]));
            EXPECT_EQ(ComputeImageChecksum(BeforeGuardPage(image), length, field), PlatformChecksum(image))
                << "length " << length << " fill " << fill;
        }
    }
}

// Headers that end early or point outside the file are no image: refused, never read past the end.
TEST(ImageChecksum, MalformedHeadersAreUnreadable) {
    std::string good = bed::ReadFileBytes(bed::LauncherExe());
    ASSERT_EQ(VerifyImageChecksum(BeforeGuardPage(good), static_cast<uint32_t>(good.size())), kProtectionPassed);
    const uint32_t pe = reinterpret_cast<IMAGE_DOS_HEADER*>(&good[0])->e_lfanew;
    const uint32_t fieldEnd = pe + 4 + sizeof(IMAGE_FILE_HEADER) + 64 + 4;
    std::string farHeader = good, noSignature = good;
    reinterpret_cast<IMAGE_DOS_HEADER*>(&farHeader[0])->e_lfanew = 0xFFFFFFF0u;  // pe + 92 wraps around
    noSignature[pe + 1] = 'X';
    const std::pair<const char*, std::string> cases[] = {{"short DOS header", good.substr(0, 0x3F)},
                                                         {"field cut off", good.substr(0, fieldEnd - 1)},
                                                         {"header far away", farHeader},
                                                         {"no signature", noSignature}};
    for (const auto& c : cases)
        EXPECT_EQ(VerifyImageChecksum(BeforeGuardPage(c.second), static_cast<uint32_t>(c.second.size())),
                  kProtectionImageUnreadable)
            << c.first;
    uint32_t field = 0;
    EXPECT_TRUE(FindImageChecksumField(BeforeGuardPage(good.substr(0, fieldEnd)), fieldEnd, &field));
}

// ---- The launcher with a changed copy of itself.

enum class Change { None, PaddingByte, PaddingByteRestamped, PaddingByteUnstamped, StampPlusOne };
struct ImageCase {
    const char* name;
    Change change;
    DWORD exitCode;
};

class ChangedImage : public ::testing::TestWithParam<ImageCase> {};

TEST_P(ChangedImage, FirstCheck) {
    const ImageCase& c = GetParam();
    std::string image = bed::ReadFileBytes(bed::LauncherExe());
    ASSERT_FALSE(image.empty());
    DWORD& stamp = Headers(image)->OptionalHeader.CheckSum;
    if (c.change != Change::None && c.change != Change::StampPlusOne) {
        size_t at = PaddingByte(image);
        ASSERT_NE(at, 0u) << "no section with file padding";
        image[at] = static_cast<char>(image[at] ^ 0x5A);
    }
    if (c.change == Change::PaddingByteRestamped) stamp = PlatformChecksum(image);
    if (c.change == Change::PaddingByteUnstamped) stamp = 0;
    if (c.change == Change::StampPlusOne) stamp += 1;

    bed::ResetLog();
    bed::AppOptions options;
    options.exeOverride = WriteTempExe(image);
    std::wstring app = bed::MakeAppDir(options);
    bed::RunResult run = bed::RunLauncher(app);
    ASSERT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, c.exitCode);
    std::string log = bed::ReadFileBytes(bed::LogPath());
    std::vector<std::string> record = bed::ReadRecord(app);
    if (c.exitCode == 0) {
        ASSERT_FALSE(record.empty());
        EXPECT_EQ(record[0].rfind("JNI_CreateJavaVM", 0), 0u);
        EXPECT_FALSE(LogHas(log, expect::Line(expect::kLoadError, 1012)));
        return;
    }
    EXPECT_TRUE(record.empty()) << "the VM was loaded";
    EXPECT_TRUE(LogHas(log, expect::Line(expect::kLoadError, 1012)));
    EXPECT_FALSE(LogHas(log, expect::Line("CL interpretation", -767)));
    ASSERT_EQ(run.boxes.size(), 1u);
    EXPECT_EQ(run.boxes[0].text, expect::kLoadError);
    EXPECT_EQ(run.boxes[0].caption, expect::kCaption);
    EXPECT_TRUE(run.boxes[0].errorIcon);
}

INSTANTIATE_TEST_SUITE_P(
    Launcher, ChangedImage,
    ::testing::Values(ImageCase{"Unchanged", Change::None, 0},
                      ImageCase{"OneByteChanged", Change::PaddingByte, kProtectionImageAltered},
                      ImageCase{"OneByteChangedAndRestamped", Change::PaddingByteRestamped, 0},
                      ImageCase{"OneByteChangedAndUnstamped", Change::PaddingByteUnstamped, 0},
                      ImageCase{"OnlyTheStampChanged", Change::StampPlusOne, kProtectionImageAltered}),
    [](const ::testing::TestParamInfo<ImageCase>& info) { return std::string(info.param.name); });

// ---- The launcher under a debugger.

class UnderDebugger : public ::testing::TestWithParam<bool> {};

TEST_P(UnderDebugger, SecondCheck) {
    const bool hideFlag = GetParam();
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    std::wstring runner = bed::HelperExe(L"debug_runner.exe");
    bed::RunOptions options;
    options.anyProcess = true;  // the boxes are the debuggee's
    std::wstring line = bed::Quote(runner) + (hideFlag ? L" --hide-flag " : L" ") + bed::Quote(bed::AppExe(app));
    bed::RunResult run = bed::Run(runner, line, app, options);
    ASSERT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, static_cast<DWORD>(hideFlag ? kProtectionDebuggerRemote : kProtectionDebuggerLocal));
    EXPECT_TRUE(bed::ReadRecord(app).empty()) << "the VM was loaded";
    std::string log = bed::ReadFileBytes(bed::LogPath());
    EXPECT_TRUE(LogHas(log, expect::Line("CL interpretation", -767)));
    EXPECT_FALSE(LogHas(log, expect::Line(expect::kLoadError, 1012))) << "the first check failed under a debugger";
    ASSERT_EQ(run.boxes.size(), 1u);
    EXPECT_EQ(run.boxes[0].text, expect::kLoadError);
    EXPECT_EQ(run.boxes[0].caption, expect::kCaption);
    EXPECT_TRUE(run.boxes[0].errorIcon);
}

INSTANTIATE_TEST_SUITE_P(Launcher, UnderDebugger, ::testing::Values(false, true),
                         [](const ::testing::TestParamInfo<bool>& info) {
                             return std::string(info.param ? "FlagCleared" : "FlagSet");
                         });

}  // namespace
