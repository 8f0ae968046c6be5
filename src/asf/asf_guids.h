// ASF object and stream-type identifiers, as their 16 bytes stand in a file.
#pragma once

#include <cstdint>

namespace metainfo {

// Top-level objects of the Header Object.
extern const uint8_t ASF_Header_Object[16];
extern const uint8_t ASF_File_Properties_Object[16];
extern const uint8_t ASF_Stream_Properties_Object[16];
extern const uint8_t ASF_Header_Extension_Object[16];
extern const uint8_t ASF_Content_Description_Object[16];
extern const uint8_t ASF_Extended_Content_Description_Object[16];
extern const uint8_t ASF_Content_Branding_Object[16];
extern const uint8_t ASF_Stream_Bitrate_Properties_Object[16];

// Objects inside the Header Extension Object.
extern const uint8_t ASF_Extended_Stream_Properties_Object[16];
extern const uint8_t ASF_Metadata_Object[16];
extern const uint8_t ASF_Metadata_Library_Object[16];

// Stream types of a Stream Properties Object.
extern const uint8_t ASF_Audio_Media[16];
extern const uint8_t ASF_Video_Media[16];
extern const uint8_t ASF_Command_Media[16];
extern const uint8_t ASF_JFIF_Media[16];
extern const uint8_t ASF_Degradable_JPEG_Media[16];
extern const uint8_t ASF_File_Transfer_Media[16];
extern const uint8_t ASF_Binary_Media[16];

}  // namespace metainfo
