import './styles.css';
import './pages/devices.css';
import './pages/map.css';

import { render } from 'preact';

import { App } from './app';
import { followRoute } from './route';
import { followSettings } from './settings';

followSettings();
followRoute();
const place = document.getElementById('app');
if (place) render(<App />, place);
