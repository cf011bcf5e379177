/* SPDX-License-Identifier: Apache-2.0 */
#include <qori.h>
#include <stdio.h>

int main(void) {
    const QorLibraryVersion* version = qoriGetLibVersion();
    printf("found %s %s\n", version->libraryName, version->versionText);
    return version->versionMajor != 8;
}
