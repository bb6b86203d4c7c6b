#pragma once

// The toolkit's view of the one workspace object. The data model reaches the workspace only
// through this base (the workspace's Imp derives from it), so that keysets and tracks need
// no workspace or window headers. Every operation has a plain default for programs and
// tests that run without a workspace.
class KLStdImp {
  public:
    static KLStdImp* theImp;  // the workspace; set by the first KLStdImp constructed
    // theImp, or a plain stand-in with the default behaviour while there is none.
    static KLStdImp& Workspace();

    KLStdImp();
    virtual ~KLStdImp();

    // The picture, scene-file and data directories (null: relative names stand as they are).
    virtual const char* GetPixDirectory();
    virtual const char* GetWireDirectory();
    virtual const char* GetDataDirectory();
    // The scene frame that holds the rest pose (the number after the scene file name in the
    // keyset description).
    virtual float DefaultKeyFrame() { return 0.0f; }
    // Marks the key tracks as changed since they were last saved.
    virtual void SetTrackModified() {}
    // Whether the 3D preview's key frames are prepared for kind-1 keysets (scene geometry
    // is loaded).
    virtual int KeyFramePreparation() { return 0; }
    // A message with one button, and a question with two (nonzero: the first was chosen).
    // The defaults write to the error stream; Confirm then says "Assuming OK" and answers yes.
    virtual void Inform(const char* message, const char* button);
    virtual int Confirm(const char* message, const char* yes, const char* no);
};
