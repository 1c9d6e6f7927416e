#!/usr/bin/env python3
"""Links the splash picture into a launcher built for a platform without resources: writes a C++
file that defines FindLinkedSplashPicture over the picture's bytes.

Usage: embed_picture.py PICTURE.bmp NAME OUTPUT.cpp
"""
import sys


def main(argv):
    if len(argv) != 4:
        print("usage: embed_picture.py PICTURE.bmp NAME OUTPUT.cpp", file=sys.stderr)
        return 2
    data = open(argv[1], "rb").read()
    rows = ",\n".join(",".join(str(b) for b in data[i:i + 32]) for i in range(0, len(data), 32))
    with open(argv[3], "w") as out:
        out.write('// Generated from %s by embed_picture.py; do not edit.\n' % argv[1].rsplit("/", 1)[-1])
        out.write('#include "splash/splash_platform.h"\n#include <string.h>\n\n')
        out.write("namespace {\nconst uint8_t kPicture[] = {\n%s};\n}  // namespace\n\n" % rows)
        out.write("bool FindLinkedSplashPicture(const char* name, const uint8_t** data, size_t* size) {\n")
        out.write('    if (name == nullptr || strcmp(name, "%s") != 0) return false;\n' % argv[2])
        out.write("    *data = kPicture;\n    *size = sizeof kPicture;\n    return true;\n}\n")
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv))
