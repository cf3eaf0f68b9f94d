#pragma once
class CRpfFrameReader {};
