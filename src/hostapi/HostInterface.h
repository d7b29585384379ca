// Our own declaration of the Photoshop filter plug-in interface, limited to what the module and our
// host use. Field order, fixed-width types and packing follow the public SDK's binary layout, so the
// same source builds a module that real hosts can load (Win64 and LP64 share every offset).
#pragma once

#include <cstddef>
#include <cstdint>

namespace pi {

using int16 = std::int16_t;
using int32 = std::int32_t;
using int64 = std::int64_t;
using uint8 = std::uint8_t;
using uint16 = std::uint16_t;
using uint32 = std::uint32_t;
using Boolean = std::uint8_t;
using OSErr = std::int16_t;
using OSType = std::uint32_t;
using Fixed = std::int32_t;
using Ptr = char*;
using Handle = char**;
using BufferID = struct BufferOpaque*;
using PIReadDescriptor = struct ReadDescriptorOpaque*;
using PIWriteDescriptor = struct WriteDescriptorOpaque*;

// Four-character codes are native-endian integers with the first character in the top byte.
constexpr uint32 fourCC(const char (&s)[5]) {
    return (uint32(uint8(s[0])) << 24) | (uint32(uint8(s[1])) << 16) | (uint32(uint8(s[2])) << 8) |
           uint32(uint8(s[3]));
}

struct Rect16 {
    int16 top, left, bottom, right;
};
struct Point16 {
    int16 v, h;
};
struct PSRGBColor {
    uint16 red, green, blue;
};
struct PlugInMonitor {
    Fixed gamma, redX, redY, greenX, greenY, blueX, blueY, whiteX, whiteY, ambient;
};

// Selectors.
enum : int16 {
    filterSelectorAbout = 0,
    filterSelectorParameters = 1,
    filterSelectorPrepare = 2,
    filterSelectorStart = 3,
    filterSelectorContinue = 4,
    filterSelectorFinish = 5,
};

// Result codes.
enum : OSErr {
    noErr = 0,
    readErr = -19,
    writErr = -20,
    paramErr = -50,
    memFullErr = -108,
    nilHandleErr = -109,
    userCanceledErr = -128,
    errMissingParameter = -1715,
    filterBadParameters = -30100,
    filterBadMode = -30101,
    errPlugInHostInsufficient = -30900,
    errReportString = -30904,
};

// Image modes.
enum : int16 {
    plugInModeBitmap = 0,
    plugInModeGrayScale = 1,
    plugInModeIndexedColor = 2,
    plugInModeRGBColor = 3,
    plugInModeCMYKColor = 4,
    plugInModeHSLColor = 5,
    plugInModeHSBColor = 6,
    plugInModeMultichannel = 7,
    plugInModeDuotone = 8,
    plugInModeLabColor = 9,
    plugInModeGray16 = 10,
    plugInModeRGB48 = 11,
    plugInModeLab48 = 12,
    plugInModeCMYK64 = 13,
    plugInModeDeepMultichannel = 14,
    plugInModeDuotone16 = 15,
    plugInModeRGB96 = 16,
    plugInModeGray32 = 17,
};

// Colour services.
enum : int16 {
    plugIncolorServicesChooseColor = 0,
    plugIncolorServicesConvertColor = 1,
    plugIncolorServicesSamplePoint = 2,
    plugIncolorServicesGetSpecialColor = 3,
};
enum : int16 {
    plugIncolorServicesRGBSpace = 0,
    plugIncolorServicesHSBSpace = 1,
    plugIncolorServicesCMYKSpace = 2,
    plugIncolorServicesLabSpace = 3,
    plugIncolorServicesGraySpace = 4,
    plugIncolorServicesHSLSpace = 5,
    plugIncolorServicesXYZSpace = 6,
    plugIncolorServicesChosenSpace = -1,
};

// Descriptor keys and types.
constexpr uint32 keyPar1 = fourCC("par1");
constexpr uint32 keyDRes = fourCC("dRes");
constexpr uint32 typeInteger = fourCC("long");
constexpr uint32 typeText = fourCC("TEXT");
constexpr uint32 typeNull = fourCC("null");
constexpr uint32 typeImageReference = fourCC("#ImR");

extern "C" {
using TestAbortProc = Boolean (*)();
using ProgressProc = void (*)(int32 done, int32 total);
using HostProc = void (*)(int16 selector, intptr_t* data);
using ProcessEventProc = void (*)(void* event);
using DisplayPixelsProc = OSErr (*)(const void* source, const void* srcRect, int32 dstRow, int32 dstCol,
                                    void* platformContext);
using AdvanceStateProc = OSErr (*)();
using GetPropertyProc = OSErr (*)(uint32 signature, uint32 key, int32 index, intptr_t* simpleProperty,
                                  Handle* complexProperty);

using NewPIHandleProc = Handle (*)(int32 size);
using DisposePIHandleProc = void (*)(Handle h);
using GetPIHandleSizeProc = int32 (*)(Handle h);
using SetPIHandleSizeProc = OSErr (*)(Handle h, int32 newSize);
using LockPIHandleProc = Ptr (*)(Handle h, Boolean moveHigh);
using UnlockPIHandleProc = void (*)(Handle h);
using RecoverSpaceProc = void (*)(int32 size);
using DisposeRegularHandleProc = void (*)(Handle h);

using AllocateBufferProc = OSErr (*)(int32 size, BufferID* bufferID);
using LockBufferProc = Ptr (*)(BufferID bufferID, Boolean moveHigh);
using UnlockBufferProc = void (*)(BufferID bufferID);
using FreeBufferProc = void (*)(BufferID bufferID);
using BufferSpaceProc = int32 (*)();
using ReserveBufferSpaceProc = OSErr (*)(int32 size);
using AllocateBuffer64Proc = OSErr (*)(int64 size, BufferID* bufferID);
using BufferSpace64Proc = int64 (*)();
}

struct ColorServicesInfo;
extern "C" {
using ColorServicesProc = OSErr (*)(ColorServicesInfo* info);
}

struct HandleProcs {
    int16 handleProcsVersion;
    int16 numHandleProcs;
    NewPIHandleProc newProc;
    DisposePIHandleProc disposeProc;
    GetPIHandleSizeProc getSizeProc;
    SetPIHandleSizeProc setSizeProc;
    LockPIHandleProc lockProc;
    UnlockPIHandleProc unlockProc;
    RecoverSpaceProc recoverSpaceProc;
    DisposeRegularHandleProc disposeRegularHandleProc;
};

struct BufferProcs {
    int16 bufferProcsVersion;
    int16 numBufferProcs;
    AllocateBufferProc allocateProc;
    LockBufferProc lockProc;
    UnlockBufferProc unlockProc;
    FreeBufferProc freeProc;
    BufferSpaceProc spaceProc;
    ReserveBufferSpaceProc reserveProc;
    AllocateBuffer64Proc allocateProc64;
    BufferSpace64Proc spaceProc64;
};

union ColorServicesSelectorParameter {
    uint8 (*pickerPrompt)[256];
    Point16* globalSamplePoint;
    int32 specialColorID;
};

struct ColorServicesInfo {
    int32 infoSize;
    int16 selector;
    int16 sourceSpace;
    int16 resultSpace;
    Boolean resultGamutInfoValid;
    Boolean resultInGamut;
    void* reservedSourceSpaceInfo;
    void* reservedResultSpaceInfo;
    int16 colorComponents[4];
    void* reserved;
    ColorServicesSelectorParameter selectorParameter;
};

struct PlatformData {
    intptr_t hwnd;
};

// What About receives instead of a FilterRecord.
struct AboutRecord {
    void* platformData;
    void* sSPBasic;
    void* plugInRef;
    char reserved[244];
};

extern "C" {
using OpenReadDescriptorProc = PIReadDescriptor (*)(Handle descriptor, uint32* keyArray);
using CloseReadDescriptorProc = OSErr (*)(PIReadDescriptor token);
using GetKeyProc = Boolean (*)(PIReadDescriptor token, uint32* key, uint32* type, int32* flags);
using GetIntegerProc = OSErr (*)(PIReadDescriptor token, int32* value);
using GetFloatProc = OSErr (*)(PIReadDescriptor token, double* value);
using GetUnitFloatProc = OSErr (*)(PIReadDescriptor token, uint32* unit, double* value);
using GetBooleanProc = OSErr (*)(PIReadDescriptor token, Boolean* value);
using GetTextProc = OSErr (*)(PIReadDescriptor token, Handle* value);
using GetAliasProc = OSErr (*)(PIReadDescriptor token, Handle* value);
using GetEnumeratedProc = OSErr (*)(PIReadDescriptor token, uint32* value);
using GetClassProc = OSErr (*)(PIReadDescriptor token, uint32* value);
using GetSimpleReferenceProc = OSErr (*)(PIReadDescriptor token, void* value);
using GetObjectProc = OSErr (*)(PIReadDescriptor token, uint32* type, Handle* value);
using GetCountProc = OSErr (*)(PIReadDescriptor token, uint32* value);
using GetStringProc = OSErr (*)(PIReadDescriptor token, uint8 (*value)[256]);
using GetPinnedIntegerProc = OSErr (*)(PIReadDescriptor token, int32 min, int32 max, int32* value);
using GetPinnedFloatProc = OSErr (*)(PIReadDescriptor token, const double* min, const double* max, double* value);
using GetPinnedUnitFloatProc = OSErr (*)(PIReadDescriptor token, const double* min, const double* max, uint32* unit,
                                         double* value);

using OpenWriteDescriptorProc = PIWriteDescriptor (*)();
using CloseWriteDescriptorProc = OSErr (*)(PIWriteDescriptor token, Handle* descriptor);
using PutIntegerProc = OSErr (*)(PIWriteDescriptor token, uint32 key, int32 value);
using PutFloatProc = OSErr (*)(PIWriteDescriptor token, uint32 key, const double* value);
using PutUnitFloatProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 unit, const double* value);
using PutBooleanProc = OSErr (*)(PIWriteDescriptor token, uint32 key, Boolean value);
using PutTextProc = OSErr (*)(PIWriteDescriptor token, uint32 key, Handle value);
using PutAliasProc = OSErr (*)(PIWriteDescriptor token, uint32 key, Handle value);
using PutEnumeratedProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 type, uint32 value);
using PutClassProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 value);
using PutSimpleReferenceProc = OSErr (*)(PIWriteDescriptor token, uint32 key, const void* value);
using PutObjectProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 type, Handle value);
using PutCountProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 count);
using PutStringProc = OSErr (*)(PIWriteDescriptor token, uint32 key, const uint8* value);
using PutScopedClassProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 value);
using PutScopedObjectProc = OSErr (*)(PIWriteDescriptor token, uint32 key, uint32 type, Handle value);
}

struct ReadDescriptorProcs {
    int16 readDescriptorProcsVersion;
    int16 numReadDescriptorProcs;
    OpenReadDescriptorProc openReadDescriptorProc;
    CloseReadDescriptorProc closeReadDescriptorProc;
    GetKeyProc getKeyProc;
    GetIntegerProc getIntegerProc;
    GetFloatProc getFloatProc;
    GetUnitFloatProc getUnitFloatProc;
    GetBooleanProc getBooleanProc;
    GetTextProc getTextProc;
    GetAliasProc getAliasProc;
    GetEnumeratedProc getEnumeratedProc;
    GetClassProc getClassProc;
    GetSimpleReferenceProc getSimpleReferenceProc;
    GetObjectProc getObjectProc;
    GetCountProc getCountProc;
    GetStringProc getStringProc;
    GetPinnedIntegerProc getPinnedIntegerProc;
    GetPinnedFloatProc getPinnedFloatProc;
    GetPinnedUnitFloatProc getPinnedUnitFloatProc;
};

struct WriteDescriptorProcs {
    int16 writeDescriptorProcsVersion;
    int16 numWriteDescriptorProcs;
    OpenWriteDescriptorProc openWriteDescriptorProc;
    CloseWriteDescriptorProc closeWriteDescriptorProc;
    PutIntegerProc putIntegerProc;
    PutFloatProc putFloatProc;
    PutUnitFloatProc putUnitFloatProc;
    PutBooleanProc putBooleanProc;
    PutTextProc putTextProc;
    PutAliasProc putAliasProc;
    PutEnumeratedProc putEnumeratedProc;
    PutClassProc putClassProc;
    PutSimpleReferenceProc putSimpleReferenceProc;
    PutObjectProc putObjectProc;
    PutCountProc putCountProc;
    PutStringProc putStringProc;
    PutScopedClassProc putScopedClassProc;
    PutScopedObjectProc putScopedObjectProc;
};

struct PIDescriptorParameters {
    int16 descriptorParametersVersion;
    int16 playInfo;
    int16 recordInfo;
    Handle descriptor;
    WriteDescriptorProcs* writeDescriptorProcs;
    ReadDescriptorProcs* readDescriptorProcs;
};

struct BigDocumentStruct {
    int32 PluginUsing32BitCoordinates;
    int32 imageSize32v, imageSize32h;
    int32 filterRect32[4];
    int32 inRect32[4];
    int32 outRect32[4];
    int32 maskRect32[4];
    int32 floatCoord32v, floatCoord32h;
    int32 wholeSize32v, wholeSize32h;
};

#pragma pack(push, 4)
struct FilterRecord {
    int32 serialNumber;
    TestAbortProc abortProc;
    ProgressProc progressProc;
    Handle parameters;
    Point16 imageSize;
    int16 planes;
    Rect16 filterRect;
    PSRGBColor background;
    PSRGBColor foreground;
    int32 maxSpace;
    int32 bufferSpace;
    Rect16 inRect;
    int16 inLoPlane;
    int16 inHiPlane;
    Rect16 outRect;
    int16 outLoPlane;
    int16 outHiPlane;
    void* inData;
    int32 inRowBytes;
    void* outData;
    int32 outRowBytes;
    Boolean isFloating;
    Boolean haveMask;
    Boolean autoMask;
    Rect16 maskRect;
    void* maskData;
    int32 maskRowBytes;
    uint8 backColor[4];
    uint8 foreColor[4];
    OSType hostSig;
    HostProc hostProc;
    int16 imageMode;
    Fixed imageHRes;
    Fixed imageVRes;
    Point16 floatCoord;
    Point16 wholeSize;
    PlugInMonitor monitor;
    PlatformData* platformData;
    BufferProcs* bufferProcs;
    void* resourceProcs;
    ProcessEventProc processEvent;
    DisplayPixelsProc displayPixels;
    HandleProcs* handleProcs;
    Boolean supportsDummyChannels;
    Boolean supportsAlternateLayouts;
    int16 wantLayout;
    int16 filterCase;
    int16 dummyPlaneValue;
    void* premiereHook;
    AdvanceStateProc advanceState;
    Boolean supportsAbsolute;
    Boolean wantsAbsolute;
    GetPropertyProc getPropertyObsolete;
    Boolean cannotUndo;
    Boolean supportsPadding;
    int16 inputPadding;
    int16 outputPadding;
    int16 maskPadding;
    char samplingSupport;
    char reservedByte;
    Fixed inputRate;
    Fixed maskRate;
    ColorServicesProc colorServices;
    int16 inLayerPlanes, inTransparencyMask, inLayerMasks, inInvertedLayerMasks, inNonLayerPlanes;
    int16 outLayerPlanes, outTransparencyMask, outLayerMasks, outInvertedLayerMasks, outNonLayerPlanes;
    int16 absLayerPlanes, absTransparencyMask, absLayerMasks, absInvertedLayerMasks, absNonLayerPlanes;
    int16 inPreDummyPlanes, inPostDummyPlanes, outPreDummyPlanes, outPostDummyPlanes;
    int32 inColumnBytes;
    int32 inPlaneBytes;
    int32 outColumnBytes;
    int32 outPlaneBytes;
    void* imageServicesProcs;
    void* propertyProcs;
    int16 inTileHeight, inTileWidth;
    Point16 inTileOrigin;
    int16 absTileHeight, absTileWidth;
    Point16 absTileOrigin;
    int16 outTileHeight, outTileWidth;
    Point16 outTileOrigin;
    int16 maskTileHeight, maskTileWidth;
    Point16 maskTileOrigin;
    PIDescriptorParameters* descriptorParameters;
    uint8 (*errorString)[256];
    void* channelPortProcs;
    void* documentInfo;
    void* sSPBasic;
    void* plugInRef;
    int32 depth;
    Handle iCCprofileData;
    int32 iCCprofileSize;
    int32 canUseICCProfiles;
    int32 hasImageScrap;
    BigDocumentStruct* bigDocumentData;
    void* input3DScene;
    void* output3DScene;
    Boolean createNewLayer;
    Handle iCCWorkingProfileData;
    int32 iCCWorkingProfileSize;
    int64 bufferSpace64;
    int64 maxSpace64;
    char reserved[46];
};
#pragma pack(pop)

// The layout facts every host relies on (identical on Win64 and LP64).
static_assert(sizeof(void*) == 8, "the host interface is laid out for 64-bit targets");
static_assert(sizeof(Rect16) == 8 && sizeof(Point16) == 4 && sizeof(PSRGBColor) == 6);
static_assert(sizeof(PlugInMonitor) == 40);
static_assert(offsetof(FilterRecord, abortProc) == 4);
static_assert(offsetof(FilterRecord, progressProc) == 12);
static_assert(offsetof(FilterRecord, parameters) == 20);
static_assert(offsetof(FilterRecord, imageSize) == 28);
static_assert(offsetof(FilterRecord, planes) == 32);
static_assert(offsetof(FilterRecord, filterRect) == 34);
static_assert(offsetof(FilterRecord, background) == 42);
static_assert(offsetof(FilterRecord, foreground) == 48);
static_assert(offsetof(FilterRecord, maxSpace) == 56);
static_assert(offsetof(FilterRecord, bufferSpace) == 60);
static_assert(offsetof(FilterRecord, inRect) == 64);
static_assert(offsetof(FilterRecord, inLoPlane) == 72);
static_assert(offsetof(FilterRecord, inHiPlane) == 74);
static_assert(offsetof(FilterRecord, outRect) == 76);
static_assert(offsetof(FilterRecord, outLoPlane) == 84);
static_assert(offsetof(FilterRecord, outHiPlane) == 86);
static_assert(offsetof(FilterRecord, inData) == 88);
static_assert(offsetof(FilterRecord, inRowBytes) == 96);
static_assert(offsetof(FilterRecord, outData) == 100);
static_assert(offsetof(FilterRecord, outRowBytes) == 108);
static_assert(offsetof(FilterRecord, isFloating) == 112);
static_assert(offsetof(FilterRecord, haveMask) == 113);
static_assert(offsetof(FilterRecord, autoMask) == 114);
static_assert(offsetof(FilterRecord, maskRect) == 116);
static_assert(offsetof(FilterRecord, maskData) == 124);
static_assert(offsetof(FilterRecord, maskRowBytes) == 132);
static_assert(offsetof(FilterRecord, backColor) == 136);
static_assert(offsetof(FilterRecord, foreColor) == 140);
static_assert(offsetof(FilterRecord, hostSig) == 144);
static_assert(offsetof(FilterRecord, hostProc) == 148);
static_assert(offsetof(FilterRecord, imageMode) == 156);
static_assert(offsetof(FilterRecord, imageHRes) == 160);
static_assert(offsetof(FilterRecord, imageVRes) == 164);
static_assert(offsetof(FilterRecord, floatCoord) == 168);
static_assert(offsetof(FilterRecord, wholeSize) == 172);
static_assert(offsetof(FilterRecord, monitor) == 176);
static_assert(offsetof(FilterRecord, platformData) == 216);
static_assert(offsetof(FilterRecord, bufferProcs) == 224);
static_assert(offsetof(FilterRecord, resourceProcs) == 232);
static_assert(offsetof(FilterRecord, processEvent) == 240);
static_assert(offsetof(FilterRecord, displayPixels) == 248);
static_assert(offsetof(FilterRecord, handleProcs) == 256);
static_assert(offsetof(FilterRecord, supportsDummyChannels) == 264);
static_assert(offsetof(FilterRecord, wantLayout) == 266);
static_assert(offsetof(FilterRecord, filterCase) == 268);
static_assert(offsetof(FilterRecord, dummyPlaneValue) == 270);
static_assert(offsetof(FilterRecord, premiereHook) == 272);
static_assert(offsetof(FilterRecord, advanceState) == 280);
static_assert(offsetof(FilterRecord, supportsAbsolute) == 288);
static_assert(offsetof(FilterRecord, wantsAbsolute) == 289);
static_assert(offsetof(FilterRecord, getPropertyObsolete) == 292);
static_assert(offsetof(FilterRecord, cannotUndo) == 300);
static_assert(offsetof(FilterRecord, supportsPadding) == 301);
static_assert(offsetof(FilterRecord, inputPadding) == 302);
static_assert(offsetof(FilterRecord, outputPadding) == 304);
static_assert(offsetof(FilterRecord, maskPadding) == 306);
static_assert(offsetof(FilterRecord, samplingSupport) == 308);
static_assert(offsetof(FilterRecord, inputRate) == 312);
static_assert(offsetof(FilterRecord, maskRate) == 316);
static_assert(offsetof(FilterRecord, colorServices) == 320);
static_assert(offsetof(FilterRecord, inLayerPlanes) == 328);
static_assert(offsetof(FilterRecord, outLayerPlanes) == 338);
static_assert(offsetof(FilterRecord, absLayerPlanes) == 348);
static_assert(offsetof(FilterRecord, inPreDummyPlanes) == 358);
static_assert(offsetof(FilterRecord, outPostDummyPlanes) == 364);
static_assert(offsetof(FilterRecord, inColumnBytes) == 368);
static_assert(offsetof(FilterRecord, inPlaneBytes) == 372);
static_assert(offsetof(FilterRecord, outColumnBytes) == 376);
static_assert(offsetof(FilterRecord, outPlaneBytes) == 380);
static_assert(offsetof(FilterRecord, imageServicesProcs) == 384);
static_assert(offsetof(FilterRecord, propertyProcs) == 392);
static_assert(offsetof(FilterRecord, inTileHeight) == 400);
static_assert(offsetof(FilterRecord, absTileHeight) == 408);
static_assert(offsetof(FilterRecord, outTileHeight) == 416);
static_assert(offsetof(FilterRecord, maskTileHeight) == 424);
static_assert(offsetof(FilterRecord, descriptorParameters) == 432);
static_assert(offsetof(FilterRecord, errorString) == 440);
static_assert(offsetof(FilterRecord, channelPortProcs) == 448);
static_assert(offsetof(FilterRecord, documentInfo) == 456);
static_assert(offsetof(FilterRecord, sSPBasic) == 464);
static_assert(offsetof(FilterRecord, plugInRef) == 472);
static_assert(offsetof(FilterRecord, depth) == 480);
static_assert(offsetof(FilterRecord, iCCprofileData) == 484);
static_assert(offsetof(FilterRecord, iCCprofileSize) == 492);
static_assert(offsetof(FilterRecord, canUseICCProfiles) == 496);
static_assert(offsetof(FilterRecord, hasImageScrap) == 500);
static_assert(offsetof(FilterRecord, bigDocumentData) == 504);
static_assert(offsetof(FilterRecord, input3DScene) == 512);
static_assert(offsetof(FilterRecord, output3DScene) == 520);
static_assert(offsetof(FilterRecord, createNewLayer) == 528);
static_assert(offsetof(FilterRecord, iCCWorkingProfileData) == 532);
static_assert(offsetof(FilterRecord, iCCWorkingProfileSize) == 540);
static_assert(offsetof(FilterRecord, bufferSpace64) == 544);
static_assert(offsetof(FilterRecord, maxSpace64) == 552);
static_assert(offsetof(FilterRecord, reserved) == 560);
static_assert(sizeof(FilterRecord) == 608);

static_assert(sizeof(HandleProcs) == 72 && offsetof(HandleProcs, newProc) == 8 &&
              offsetof(HandleProcs, lockProc) == 40 && offsetof(HandleProcs, unlockProc) == 48);
static_assert(sizeof(BufferProcs) == 72 && offsetof(BufferProcs, allocateProc) == 8 &&
              offsetof(BufferProcs, freeProc) == 32 && offsetof(BufferProcs, spaceProc) == 40);
static_assert(sizeof(ColorServicesInfo) == 56 && offsetof(ColorServicesInfo, selector) == 4 &&
              offsetof(ColorServicesInfo, resultGamutInfoValid) == 10 &&
              offsetof(ColorServicesInfo, reservedSourceSpaceInfo) == 16 &&
              offsetof(ColorServicesInfo, colorComponents) == 32 && offsetof(ColorServicesInfo, reserved) == 40 &&
              offsetof(ColorServicesInfo, selectorParameter) == 48);
static_assert(sizeof(PIDescriptorParameters) == 32 && offsetof(PIDescriptorParameters, descriptor) == 8 &&
              offsetof(PIDescriptorParameters, readDescriptorProcs) == 24);
static_assert(sizeof(ReadDescriptorProcs) == 152 && offsetof(ReadDescriptorProcs, getTextProc) == 64 &&
              offsetof(ReadDescriptorProcs, getPinnedUnitFloatProc) == 144);
static_assert(sizeof(WriteDescriptorProcs) == 136 && offsetof(WriteDescriptorProcs, putTextProc) == 56 &&
              offsetof(WriteDescriptorProcs, putScopedObjectProc) == 128);
static_assert(sizeof(BigDocumentStruct) == 92);
static_assert(sizeof(AboutRecord) == 272 && offsetof(AboutRecord, reserved) == 24);

// Suite versions and sizes our host advertises and the module checks.
constexpr int16 kCurrentHandleProcsVersion = 1;
constexpr int16 kCurrentHandleProcsCount = 8;
constexpr int16 kCurrentBufferProcsVersion = 2;
constexpr int16 kCurrentBufferProcsCount = 5;
constexpr int16 kCurrentReadDescriptorProcsVersion = 0;
constexpr int16 kCurrentReadDescriptorProcsCount = 18;
constexpr int16 kCurrentWriteDescriptorProcsVersion = 0;
constexpr int16 kCurrentWriteDescriptorProcsCount = 16;

}  // namespace pi

// The one function a filter module exports.
extern "C" using PluginEntryProc = void (*)(pi::int16 selector, pi::FilterRecord* filterRecord, intptr_t* data,
                                            pi::int16* result);
