#include "sound/SpeexCFG.h"

namespace Sound {

int SpeexCFG::quality = -1;
float SpeexCFG::vbrQuality = -1.0f;
int SpeexCFG::bitRate = -1;
int SpeexCFG::complexity = 3;
int SpeexCFG::numFramesPerPacket = 1;
bool SpeexCFG::highPassEnabled = true;
bool SpeexCFG::vbrEnabled = false;
int SpeexCFG::vbrMax = 0;
bool SpeexCFG::abrEnabled = false;
bool SpeexCFG::vadEnabled = false;
bool SpeexCFG::dtxEnabled = false;

}  // namespace Sound
