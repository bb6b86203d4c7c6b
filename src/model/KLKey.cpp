#include "model/KLKey.h"

#include <iostream>

#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLStdImp.h"

KLKey::KLKey(float a_frame, const char* a_name, const char* a_imageFile) : frame(a_frame) {
    if (a_name) {
        name = a_name;
    } else {
        std::cerr << "KLKey::KLKey() name is 0" << std::endl;
    }
    if (a_imageFile)
        imageFile = a_imageFile;
}

KLKey::~KLKey() = default;

KLImageSGI* KLKey::GetImage() {
    if (image)
        return image.get();
    if (loadedImage)
        return loadedImage.get();
    if (!imageFile)
        return nullptr;
    const char* pixDir = KLStdImp::Workspace().GetPixDirectory();
    const std::string path = KLFilePath::Join(pixDir, imageFile->c_str());
    loadedImage = KLImageSGI::Load(path.c_str());
    if (!loadedImage) {
        std::cerr << "KLKey::GetImage() failed to get image" << std::endl;
        return nullptr;
    }
    loadedImage->Resize(kImageWidth, kImageHeight);
    return loadedImage.get();
}

void KLKey::SetImage(KLImageSGI* a_image) {
    if (!a_image) {
        std::cerr << "KLKey::SetImage() no image on input" << std::endl;
        return;
    }
    ClearImage();
    image.reset(a_image);
    image->Resize(kImageWidth, kImageHeight);
    GetIcon();
}

void KLKey::ClearImage() {
    image.reset();
    icon.reset();
}

KLImageSGI* KLKey::GetIcon() {
    if (icon)
        return icon.get();
    if (image) {
        icon = image->Copy();
        icon->Resize(kIconWidth, kIconHeight);
        return icon.get();
    }
    if (fileIcon)
        return fileIcon.get();
    if (!imageFile)
        return nullptr;
    KLImageSGI* full = GetImage();
    if (!full)
        return nullptr;
    fileIcon = full->Copy();
    fileIcon->Resize(kIconWidth, kIconHeight);
    return fileIcon.get();
}
