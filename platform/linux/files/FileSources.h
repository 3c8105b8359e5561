#pragma once

#include "platform/linux/files/Access.h"
#include "platform/linux/files/AttributeCache.h"
#include "platform/linux/files/AttributeCalls.h"
#include "platform/linux/files/DocumentIndex.h"
#include "platform/linux/files/MimeTypes.h"
#include "platform/linux/files/PackageTypes.h"
#include "platform/linux/files/ServedTrees.h"
#include "platform/linux/files/SharedWork.h"

namespace marrowdale::native {

// What the values of files are made from, besides the files themselves. Everything referred to must
// outlive the file system and the walks made with it.
struct FileSources {
    DocumentIndex& documents;
    const MimeTypes& types;
    const PackageTypes& packages;
    AttributeCache& attributes;
    AttributeCalls& calls;
    const ServedTrees& trees;
    SharedWork& work;
    Credentials credentials = Credentials::ofThisProcess();
};

}  // namespace marrowdale::native
