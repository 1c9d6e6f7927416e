// Plain driver for the fuzz target, for compilers without libFuzzer and for ctest.
//
//   corpus_driver               generated corpus, run in memory; exit 0 when nothing aborted
//   corpus_driver --write DIR   writes the seed pictures into DIR (libFuzzer's starting corpus)
//
// The corpus: well-formed seeds of every kind the splash knows (24, 8, 4, 1 bit, 16 and 32 bit,
// top-down, run-length, a long info header), each cut at every length, each header byte set to
// edge values, and a fixed series of pseudo-random mutations. Every input is handed over in a heap
// block of exactly its size, so a sanitizer build sees any read past the end.
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

typedef std::vector<uint8_t> Bytes;

void Put(Bytes& b, size_t at, uint32_t value, int bytes) {
    for (int i = 0; i < bytes; ++i) b[at + i] = static_cast<uint8_t>(value >> (8 * i));
}

Bytes Picture(int bits, int32_t width, int32_t height, uint32_t compression = 0, uint32_t infoSize = 40) {
    size_t table = bits == 24 ? 0 : bits == 8 ? 1024 : bits == 4 ? 64 : bits == 1 ? 8 : 0;
    size_t w = static_cast<size_t>(width < 0 ? -width : width);
    size_t h = static_cast<size_t>(height < 0 ? -height : height);
    size_t pixels = compression == 0 ? ((w * bits + 31) / 32) * 4 * h : 64;
    Bytes b(14 + infoSize + table + pixels, 0);
    b[0] = 'B';
    b[1] = 'M';
    Put(b, 2, static_cast<uint32_t>(b.size()), 4);
    Put(b, 10, static_cast<uint32_t>(14 + infoSize + table), 4);
    Put(b, 14, infoSize, 4);
    Put(b, 18, static_cast<uint32_t>(width), 4);
    Put(b, 22, static_cast<uint32_t>(height), 4);
    Put(b, 26, 1, 2);
    Put(b, 28, static_cast<uint32_t>(bits), 2);
    Put(b, 30, compression, 4);
    Put(b, 34, static_cast<uint32_t>(pixels), 4);
    for (size_t i = 14 + infoSize; i < b.size(); ++i) b[i] = static_cast<uint8_t>(i * 37);
    return b;
}

std::vector<Bytes> Seeds() {
    std::vector<Bytes> seeds;
    seeds.push_back(Picture(24, 7, 3));
    seeds.push_back(Picture(8, 5, 4));
    seeds.push_back(Picture(4, 9, 2));
    seeds.push_back(Picture(1, 33, 2));
    seeds.push_back(Picture(16, 4, 4));
    seeds.push_back(Picture(32, 4, 4));
    seeds.push_back(Picture(24, 6, -3));
    seeds.push_back(Picture(8, 16, 16, 1));
    seeds.push_back(Picture(8, 3, 3, 0, 124));
    return seeds;
}

int gRuns = 0;

void RunOne(const uint8_t* data, size_t size) {
    uint8_t* copy = static_cast<uint8_t*>(malloc(size == 0 ? 1 : size));
    if (size != 0) memcpy(copy, data, size);
    LLVMFuzzerTestOneInput(copy, size);
    free(copy);
    ++gRuns;
}

void Run(const Bytes& b) { RunOne(b.data(), b.size()); }

uint32_t gState = 0x9E3779B9u;
uint32_t Next() {  // xorshift32: the same series on every run
    gState ^= gState << 13;
    gState ^= gState >> 17;
    gState ^= gState << 5;
    return gState;
}

void RunCorpus() {
    const uint8_t edges[] = {0x00, 0x01, 0x02, 0x04, 0x08, 0x10, 0x18, 0x20, 0x28, 0x7C, 0x7F, 0x80, 0xFE, 0xFF};
    for (const Bytes& seed : Seeds()) {
        for (size_t size = 0; size <= seed.size(); ++size) RunOne(seed.data(), size);
        for (size_t at = 0; at < 54 && at < seed.size(); ++at) {
            for (uint8_t value : edges) {
                Bytes b = seed;
                b[at] = value;
                Run(b);
                b.resize(b.size() / 2);
                Run(b);
            }
        }
        for (int round = 0; round < 3000; ++round) {
            Bytes b = seed;
            int changes = 1 + static_cast<int>(Next() % 6);
            for (int i = 0; i < changes; ++i) b[Next() % 54] = static_cast<uint8_t>(Next());
            if (Next() % 2) b.resize(Next() % (b.size() + 1));
            Run(b);
        }
    }
}

bool WriteSeeds(const char* dir) {
    std::vector<Bytes> seeds = Seeds();
    for (size_t i = 0; i < seeds.size(); ++i) {
        std::string path = std::string(dir) + "/seed" + std::to_string(i) + ".bmp";
        FILE* f = fopen(path.c_str(), "wb");
        if (f == nullptr) return false;
        bool ok = fwrite(seeds[i].data(), 1, seeds[i].size(), f) == seeds[i].size();
        if (fclose(f) != 0 || !ok) return false;
    }
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc == 3 && strcmp(argv[1], "--write") == 0) {
        if (!WriteSeeds(argv[2])) {
            fprintf(stderr, "cannot write the seeds into %s\n", argv[2]);
            return 1;
        }
        return 0;
    }
    RunCorpus();
    printf("%d inputs, no fault\n", gRuns);
    return 0;
}
