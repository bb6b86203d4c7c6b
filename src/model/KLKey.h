#pragma once

#include <memory>
#include <optional>
#include <string>

class KLImageSGI;

// A key shape: one facial pose of a keyset, standing at a frame of the keyset's scene, with an
// optional picture of itself. Full pictures are always 160 x 121 pixels, icons 80 x 60.
class KLKey {
  public:
    static constexpr int kImageWidth = 160;
    static constexpr int kImageHeight = 121;
    static constexpr int kIconWidth = 80;
    static constexpr int kIconHeight = 60;

    // Copies both strings. A null name prints "KLKey::KLKey() name is 0" and stays null; a
    // null imageFile stays null. `index` is left for the keyset to assign.
    KLKey(float frame, const char* name, const char* imageFile);
    ~KLKey();
    KLKey(const KLKey&) = delete;
    KLKey& operator=(const KLKey&) = delete;

    // The picture set by SetImage, else the one loaded from imageFile (loaded now, relative
    // names joined to the workspace's picture directory); null when there is none or it
    // cannot be loaded. The key keeps ownership.
    KLImageSGI* GetImage();
    // Takes ownership of `image` (null prints a message and changes nothing), scales it to
    // 160 x 121 and makes its icon at once.
    void SetImage(KLImageSGI* image);
    // Destroys the picture set by SetImage and its icon; the file-loaded picture stays.
    void ClearImage();
    // The 80 x 60 icon of GetImage()'s picture, made on first use; null when there is none.
    KLImageSGI* GetIcon();

    // The name, or null when the key was made without one.
    const char* Name() const { return name ? name->c_str() : nullptr; }
    // The image path as written in the keyset block (maybe relative), or null.
    const char* ImageFile() const { return imageFile ? imageFile->c_str() : nullptr; }

    std::optional<std::string> name;
    std::optional<std::string> imageFile;
    std::unique_ptr<KLImageSGI> image;        // set by SetImage
    std::unique_ptr<KLImageSGI> loadedImage;  // loaded from imageFile on demand
    std::unique_ptr<KLImageSGI> icon;         // small copy of image
    std::unique_ptr<KLImageSGI> fileIcon;     // small copy of loadedImage
    float frame = 0.0f;                       // scene frame of the pose
    int index = 0;                            // position in the keyset, assigned by KLKeySet::Read
    int shapeValue = 0;  // value of a track's key-shape channel that shows this pose
};
